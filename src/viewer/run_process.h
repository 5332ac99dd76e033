#pragma once

#include <optional>
#include <string>
#include <sys/types.h>

namespace mirevo {

/// The process of a run that was started together with its viewer: a child in a session of its own, so that nothing
/// that befalls the viewer's terminal reaches it. What it prints comes through a pipe that it never waits for: once
/// nobody reads, the text is lost and the run goes on.
class RunProcess final {
 public:
  /// Of the viewer's side of the fork. Owns `output`, the reading end of the pipe.
  RunProcess(pid_t process, int output) : process_(process), output_(output) {}
  ~RunProcess();
  RunProcess(const RunProcess&) = delete;
  RunProcess& operator=(const RunProcess&) = delete;

  pid_t process() const { return process_; }
  /// For poll(2): -1 once there is nothing more to come.
  int output() const { return output_; }

  /// What it has printed since the last time. The pipe's end is not waited for.
  std::string takeOutput();
  /// Its exit code once it has ended, 128 and the signal's number when a signal ended it, 1 when nobody can tell.
  std::optional<int> exitCode();
  void send(int signal);

 private:
  pid_t process_;
  int output_;
  std::optional<int> exitCode_;
};

}  // namespace mirevo
