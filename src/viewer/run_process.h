#pragma once

#include <optional>
#include <string>
#include <sys/types.h>

namespace mirevo {

/// The process of a run that was started together with its viewer: a child in a session of its own, which the viewer's
/// terminal cannot affect. Its output comes through a pipe on which it never waits: when nobody reads, the text is lost
/// and the run goes on.
class RunProcess final {
 public:
  /// For the viewer's side of the fork. Owns `output`, the reading end of the pipe.
  RunProcess(pid_t process, int output) : process_(process), output_(output) {}
  ~RunProcess();
  RunProcess(const RunProcess&) = delete;
  RunProcess& operator=(const RunProcess&) = delete;

  pid_t process() const { return process_; }
  /// For poll(2); -1 at the end of the output.
  int output() const { return output_; }

  /// What it has printed since the last call. Does not wait for the end of the pipe.
  std::string takeOutput();
  /// Its exit code once it has ended, 128 + the signal's number if a signal ended it, 1 if it is not known.
  std::optional<int> exitCode();
  void send(int signal);

 private:
  pid_t process_;
  int output_;
  std::optional<int> exitCode_;
};

}  // namespace mirevo
