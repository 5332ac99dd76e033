#pragma once

#include <array>
#include <poll.h>
#include <pty.h>
#include <signal.h>
#include <string>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utmp.h>
#include <vector>

#include "integration/program_runner.h"

namespace mirevo::testing {

/// A program on a terminal of its own, which shows what it draws and types its keys. Hung up at the end of the test.
class TerminalProgram {
 public:
  TerminalProgram(const std::vector<std::string>& command, const RunningProgram::Environment& environment = {}) {
    winsize size{24, 80, 0, 0};
    process_ = ::forkpty(&terminal_, nullptr, nullptr, &size);
    if (process_ != 0) return;
    for (const char* name : {"LC_ALL", "LC_CTYPE", "LANG"}) ::unsetenv(name);
    ::setenv("TERM", "xterm", 1);
    ::setenv("NO_COLOR", "1", 1);
    RunningProgram::become(command[0].c_str(), {command.begin() + 1, command.end()}, environment);
  }
  ~TerminalProgram() {
    hangUp();
    if (process_ > 0) {
      ::kill(process_, SIGKILL);
      ::waitpid(process_, nullptr, 0);
    }
  }
  TerminalProgram(const TerminalProgram&) = delete;
  TerminalProgram& operator=(const TerminalProgram&) = delete;

  int process() const { return process_; }
  /// Everything drawn so far.
  const std::string& output() const { return output_; }

  /// Waits until `text` is drawn anew, behind what an earlier call has found.
  bool shows(const std::string& text) {
    return waitUntil([&] {
      readOutput();
      const std::size_t at = output_.find(text, seen_);
      if (at != std::string::npos) seen_ = at + text.size();
      return at != std::string::npos;
    });
  }
  void type(const std::string& keys) const {
    EXPECT_EQ(::write(terminal_, keys.data(), keys.size()), std::ssize(keys));
  }
  void resize(unsigned short columns, unsigned short rows) const {
    const winsize size{rows, columns, 0, 0};
    ::ioctl(terminal_, TIOCSWINSZ, &size);
  }
  void hangUp() {
    if (terminal_ >= 0) ::close(terminal_);
    terminal_ = -1;
  }
  /// The exit code, 128 and the number of a signal that ended it, -1 when it does not end in time.
  int wait() {
    int status = 0;
    const bool hasEnded = waitUntil([&] {
      readOutput();
      return ::waitpid(process_, &status, WNOHANG) == process_;
    });
    if (!hasEnded) return -1;
    process_ = 0;
    readOutput();
    return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
  }

 private:
  void readOutput() {
    std::array<char, 4096> piece{};
    pollfd ready{terminal_, POLLIN, 0};
    while (terminal_ >= 0 && ::poll(&ready, 1, 0) == 1) {
      const ssize_t count = ::read(terminal_, piece.data(), piece.size());
      if (count <= 0) return;
      output_.append(piece.data(), static_cast<std::size_t>(count));
    }
  }

  int terminal_ = -1;
  pid_t process_ = 0;
  std::string output_;
  std::size_t seen_ = 0;
};

}  // namespace mirevo::testing
