#include "viewer/run_process.h"

#include <array>
#include <cerrno>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

namespace mirevo {

namespace {

constexpr int kUnknownExitCode = 1;

}  // namespace

RunProcess::~RunProcess() {
  if (output_ >= 0) ::close(output_);
}

std::string RunProcess::takeOutput() {
  constexpr std::size_t kMostBytes = 65536;  // at a time
  std::string text;
  std::array<char, 4096> piece{};
  while (output_ >= 0 && text.size() < kMostBytes) {
    const ssize_t count = ::read(output_, piece.data(), piece.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) break;
    if (count == 0) {
      ::close(output_);
      output_ = -1;
      break;
    }
    text.append(piece.data(), static_cast<std::size_t>(count));
  }
  return text;
}

std::optional<int> RunProcess::exitCode() {
  if (exitCode_) return exitCode_;
  int status = 0;
  const pid_t ended = ::waitpid(process_, &status, WNOHANG);
  if (ended == process_) {
    exitCode_ = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
  } else if (ended < 0 && errno == ECHILD) {
    exitCode_ = kUnknownExitCode;  // it has ended and was reaped elsewhere
  }
  return exitCode_;
}

void RunProcess::send(int signal) {
  if (!exitCode()) ::kill(process_, signal);
}

}  // namespace mirevo
