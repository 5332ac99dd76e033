#include "platform/processes/child_process.h"

#include <cerrno>
#include <csignal>
#include <cstring>
#include <unistd.h>

#include <fmt/core.h>

namespace mirevo {

pid_t forkWithSignalsBlocked() {
  sigset_t all;
  sigset_t before;
  ::sigfillset(&all);
  ::sigprocmask(SIG_SETMASK, &all, &before);
  const pid_t process = ::fork();
  if (process == 0) return 0;
  const int error = errno;
  ::sigprocmask(SIG_SETMASK, &before, nullptr);
  errno = error;
  return process;
}

std::string endedBySignal(int signal) {
  const char* description = ::sigdescr_np(signal);
  return fmt::format("was ended by signal {}{}", signal,
                     description == nullptr ? "" : fmt::format(" ({})", description));
}

}  // namespace mirevo
