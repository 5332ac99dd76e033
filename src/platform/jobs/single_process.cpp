#include "platform/jobs/single_process.h"

#include <cassert>
#include <unistd.h>

namespace mirevo {

void SingleProcess::send(int, int, std::string) {
  assert(false);
}

std::optional<Message> SingleProcess::receive(double) {
  return std::nullopt;
}

bool SingleProcess::finalise(const std::function<bool()>&) {
  return true;
}

void SingleProcess::abort(int exitCode) {
  ::_exit(exitCode);
}

}  // namespace mirevo
