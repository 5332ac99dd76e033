#pragma once

#include <cstdlib>
#include <fcntl.h>
#include <map>
#include <poll.h>
#include <signal.h>
#include <string>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

#include "processes.h"
#include "temporary_folder.h"

namespace mirevo::testing {

/// How the program ended and what it printed.
struct ProgramResult {
  int exitCode = -1;  ///< -1 when a signal ended it
  int signal = 0;
  bool timedOut = false;
  std::string output;
  std::string error;
};

/// The built program, or what starts it, as its user starts it. It is killed when it outlives its time or the test.
class RunningProgram {
 public:
  using Environment = std::map<std::string, std::string>;

  explicit RunningProgram(const std::vector<std::string>& arguments, const Environment& environment = {},
                          const char* program = MIREVO_PROGRAM) {
    process_ = ::fork();
    if (process_ != 0) return;
    ::setpgid(0, 0);  // what mpirun signals to its group is not for the test
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    ::dup2(::open((outputs_ / "out").c_str(), O_WRONLY | O_CREAT, 0666), STDOUT_FILENO);
    ::dup2(::open((outputs_ / "err").c_str(), O_WRONLY | O_CREAT, 0666), STDERR_FILENO);
    become(program, arguments, environment);
  }
  /// Lets this process, a child of the test, run the program instead.
  [[noreturn]] static void become(const char* program, const std::vector<std::string>& arguments,
                                  const Environment& environment) {
    ::signal(SIGHUP, SIG_DFL);  // where the tests run under nohup
    for (const char* name : {"G48", "BUILDMODE", "VOLK_PROGRESS"}) ::unsetenv(name);
    for (const auto& [name, value] : environment) ::setenv(name.c_str(), value.c_str(), 1);
    std::vector<char*> argv{const_cast<char*>(program)};
    for (const std::string& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    ::execvp(program, argv.data());
    ::_exit(127);
  }
  ~RunningProgram() {
    if (process_ > 0) wait(0.0);
  }
  RunningProgram(const RunningProgram&) = delete;
  RunningProgram& operator=(const RunningProgram&) = delete;

  void send(int signal) const { ::kill(process_, signal); }

  ProgramResult wait(double seconds = 250.0) {
    ProgramResult result;
    const int watched = static_cast<int>(::syscall(SYS_pidfd_open, process_, 0));
    pollfd ended{watched, POLLIN, 0};
    if (::poll(&ended, 1, static_cast<int>(seconds * 1000.0)) == 0) {
      result.timedOut = true;
      ::kill(process_, SIGKILL);
    }
    int status = 0;
    ::waitpid(process_, &status, 0);
    ::close(watched);
    process_ = 0;
    if (WIFEXITED(status)) result.exitCode = WEXITSTATUS(status);
    if (WIFSIGNALED(status)) result.signal = WTERMSIG(status);
    result.output = outputs_.read("out");
    result.error = outputs_.read("err");
    return result;
  }

 private:
  TemporaryFolder outputs_;
  pid_t process_ = 0;
};

inline ProgramResult runProgram(const std::vector<std::string>& arguments,
                                const RunningProgram::Environment& environment = {}) {
  return RunningProgram(arguments, environment).wait();
}

}  // namespace mirevo::testing
