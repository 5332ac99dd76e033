#include "viewer/qmon_start.h"

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <memory>
#include <signal.h>
#include <unistd.h>

#include <fmt/core.h>

#include "platform/terminal/front_end.h"
#include "platform/terminal/terminal.h"
#include "viewer/run_process.h"
#include "viewer/viewer.h"

namespace mirevo {
namespace {

/// Discards signals that came while the signal was blocked.
void dropPending(int signalNumber) {
  struct sigaction before {};
  ::sigaction(signalNumber, nullptr, &before);
  ::signal(signalNumber, SIG_IGN);
  ::sigaction(signalNumber, &before, nullptr);
}

/// The run's side of the fork: leaves the terminal, prints to the pipe, and writes its records to the message file.
void becomeRun(int output, const sigset_t& blockedBefore, const std::function<void()>& prepare) {
  ::setsid();
  // Signals that the terminal sent before the fork are for the viewer.
  for (const int signalNumber : {SIGINT, SIGQUIT, SIGHUP}) dropPending(signalNumber);
  ::signal(SIGPIPE, SIG_IGN);
  if (const int nothing = ::open("/dev/null", O_RDONLY | O_CLOEXEC); nothing >= 0) {
    ::dup2(nothing, STDIN_FILENO);
    ::close(nothing);
  }
  ::dup2(output, STDOUT_FILENO);
  ::dup2(output, STDERR_FILENO);
  ::unsetenv("VOLK_PROGRESS");
  prepare();
  ::sigprocmask(SIG_SETMASK, &blockedBefore, nullptr);
}

}  // namespace

int qmonStart(const std::string& setupFile, const std::function<void()>& prepare, const std::function<void()>& run) {
  std::array<int, 2> pipe{-1, -1};
  // If the caller of the program ignores it, the end of the run would not be reported.
  ::signal(SIGCHLD, SIG_DFL);
  // Early signals wait until the viewer can pass them on: they must not end the viewer alone.
  const sigset_t blockedBefore = SignalQueue::block();
  const pid_t process = ::pipe2(pipe.data(), O_CLOEXEC | O_NONBLOCK) == 0 ? ::fork() : -1;
  if (process > 0) {
    ::close(pipe[1]);
    return Viewer(setupFile, std::make_unique<RunProcess>(process, pipe[0])).watch();
  }
  if (process < 0) {
    showMessage(fmt::format("Unable to start the progress viewer: {}", std::strerror(errno)), {}, MessageType::warning);
    ::sigprocmask(SIG_SETMASK, &blockedBefore, nullptr);
  }
  if (process == 0) becomeRun(pipe[1], blockedBefore, prepare);
  for (const int end : pipe) {
    if (end >= 0) ::close(end);
  }
  run();
  return 1;
}

}  // namespace mirevo
