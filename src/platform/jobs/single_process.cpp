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

void SingleProcess::finalise(double) {}

void SingleProcess::abort(int exitCode) {
  ::_exit(exitCode);
}

}  // namespace mirevo
