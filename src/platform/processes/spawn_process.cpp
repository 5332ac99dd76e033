#include "platform/processes/spawn_process.h"

#include <array>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdint>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

namespace mirevo {
namespace {

constexpr char kShell[] = "/bin/sh";

/// Shared with the child, which runs in this program's memory: its task, and the step that failed.
struct ChildTask {
  const SpawnCommand* command = nullptr;
  const SpawnSurroundings* surroundings = nullptr;
  pid_t parent = 0;
  bool hasHandlers = true;  ///< the child has this program's signal handlers
  const char* failedStep = nullptr;
  int error = 0;
};

/// On a stack that the sanitizers do not know, like runChild().
[[noreturn]] __attribute__((no_sanitize("address", "undefined"))) void giveUp(ChildTask& task, const char* step) {
  task.error = errno;
  task.failedStep = step;
  ::_exit(127);
}

bool hasRunBit(const char* file) {
  struct stat status {};
  return ::stat(file, &status) != 0 || (status.st_mode & (S_IXUSR | S_IXGRP | S_IXOTH)) != 0;
}

/// Runs in the child. The parent is suspended and all signals are blocked until the command has replaced this program,
/// so only system calls may be made here, and nothing in the parent's memory except `task` may be changed.
__attribute__((no_sanitize("address", "undefined"))) int runChild(void* argument) {
  ChildTask& task = *static_cast<ChildTask*>(argument);
  const SpawnSurroundings& surroundings = *task.surroundings;
  const char* file = task.command->argv()[0];

  ::setpgid(0, 0);
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (::getppid() != task.parent) ::_exit(127);  // the parent died before the call above
  surroundings.groupEntry->store(::getpid());

  if (task.hasHandlers) {
    for (int signal = 1; signal < NSIG; ++signal) ::signal(signal, SIG_DFL);
  } else {
    for (const int signal : surroundings.ignoredSignals) ::signal(signal, SIG_DFL);
  }
  if (::chdir(task.command->folder().c_str()) != 0) giveUp(task, "entered its folder");
  if (::dup2(surroundings.standardInput, STDIN_FILENO) < 0 || ::dup2(surroundings.standardOutput, STDOUT_FILENO) < 0 ||
      ::dup2(surroundings.standardOutput, STDERR_FILENO) < 0) {
    giveUp(task, "given its output");
  }
  ::syscall(SYS_close_range, 3U, UINT_MAX, 0U);
  sigset_t none;
  ::sigemptyset(&none);
  ::sigprocmask(SIG_SETMASK, &none, nullptr);

  ::execve(file, task.command->argv(), surroundings.environment);
  if (errno == ENOEXEC || (errno == EACCES && !hasRunBit(file))) {
    ::execve(kShell, task.command->shellArgv(), surroundings.environment);
  }
  giveUp(task, "started");
}

constexpr std::uint64_t kCloneFlags = CLONE_VM | CLONE_VFORK | CLONE_PIDFD;
constexpr std::size_t kStackSize = 32768;

/// What clone3(2) takes, as its first version defined it.
struct CloneArguments {
  std::uint64_t flags = 0;
  std::uint64_t pidfd = 0;
  std::uint64_t childId = 0;
  std::uint64_t parentId = 0;
  std::uint64_t exitSignal = 0;
  std::uint64_t stack = 0;
  std::uint64_t stackSize = 0;
  std::uint64_t threadStorage = 0;
};

/// Starts runChild() by clone3, which clears the handlers of signals in the child; else that takes a call for each
/// signal. The child's number, or an errno below 0: ENOSYS where there is no such call.
long cloneWithoutHandlers(const char* stack, ChildTask& task, int& pidfd) {
#ifdef __x86_64__
  constexpr std::uint64_t kClearHandlers = std::uint64_t{1} << 32;
  CloneArguments arguments;
  arguments.flags = kCloneFlags | kClearHandlers;
  arguments.pidfd = reinterpret_cast<std::uint64_t>(&pidfd);
  arguments.exitSignal = SIGCHLD;
  arguments.stack = reinterpret_cast<std::uint64_t>(stack);
  arguments.stackSize = kStackSize;
  task.hasHandlers = false;
  long result = SYS_clone3;
  // The C library has no function for this call, and none of its others can return on another stack.
  asm volatile(
      "syscall\n\t"
      "test %%rax, %%rax\n\t"
      "jnz 1f\n\t"
      "xor %%ebp, %%ebp\n\t"
      "mov %[argument], %%rdi\n\t"
      "call *%[function]\n\t"
      "hlt\n"
      "1:"
      : "+a"(result)
      : "D"(&arguments), "S"(sizeof arguments), [argument] "d"(&task), [function] "b"(&runChild)
      : "rcx", "r11", "memory", "cc");
  return result == -EINVAL ? -ENOSYS : result;  // Linux 5.3 and 5.4 know the call and not the flag
#else
  static_cast<void>(stack);
  static_cast<void>(task);
  static_cast<void>(pidfd);
  return -ENOSYS;
#endif
}

/// Whether the kernel, or what stands in for it (a container's filter of calls, an emulator), takes the call.
bool isClone3There() {
  return ::syscall(SYS_clone3, nullptr, 0UL) < 0 && errno == EINVAL;
}

/// Starts runChild() in this program's memory; its number, or an errno below 0.
long cloneChild(ChildTask& task, int& pidfd) {
  alignas(16) static std::array<char, kStackSize> stack;
  static bool hasClone3 = isClone3There();
  if (hasClone3) {
    const long result = cloneWithoutHandlers(stack.data(), task, pidfd);
    if (result != -ENOSYS) return result;
    hasClone3 = false;
  }
  task.hasHandlers = true;
  const int id =
      ::clone(&runChild, stack.data() + stack.size(), static_cast<int>(kCloneFlags) | SIGCHLD, &task, &pidfd);
  return id < 0 ? -errno : id;
}

}  // namespace

std::vector<int> ignoredSignals() {
  std::vector<int> signals;
  for (int signal = 1; signal < NSIG; ++signal) {
    struct sigaction action {};
    if (::sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN) signals.push_back(signal);
  }
  return signals;
}

SpawnCommand::SpawnCommand(std::string file, std::string folder, std::vector<std::string> arguments)
    : file_(std::make_unique<std::string>(std::move(file))),
      folder_(std::make_unique<std::string>(std::move(folder))),
      arguments_(std::make_unique<std::vector<std::string>>(std::move(arguments))) {
  shellArgv_ = {const_cast<char*>(kShell), file_->data()};  // execve does not write to its arguments
  for (std::string& word : *arguments_) shellArgv_.push_back(word.data());
  shellArgv_.push_back(nullptr);
}

// posix_spawn offers no parent-death signal, and fork copies the page tables of a program that may be large. The child
// is therefore cloned as posix_spawn does it: it uses this program's memory, on a stack of its own, while the parent is
// suspended (CLONE_VM | CLONE_VFORK). That costs the same whatever the size of the program, and lets the child report
// an error in memory. With vfork the child would share the caller's stack frame, which is not safe with optimising
// compilers. CLONE_PIDFD returns the descriptor to wait on in the same call.
SpawnedProcess spawnProcess(const SpawnCommand& command, const SpawnSurroundings& surroundings) {
  ChildTask task{&command, &surroundings, ::getpid()};

  // No handler of this program may run in the child, whose memory is this program's.
  sigset_t all;
  sigset_t before;
  ::sigfillset(&all);
  ::sigprocmask(SIG_SETMASK, &all, &before);
  SpawnedProcess process;
  const long result = cloneChild(task, process.pidfd);
  ::sigprocmask(SIG_SETMASK, &before, nullptr);

  if (result < 0) {
    process.error = static_cast<int>(-result);
    process.failedStep = "started";
    return process;
  }
  process.id = static_cast<pid_t>(result);
  if (task.failedStep != nullptr) {
    surroundings.groupEntry->store(0);
    siginfo_t ignored{};
    while (::waitid(P_PID, static_cast<id_t>(process.id), &ignored, WEXITED) < 0 && errno == EINTR) {
    }
    if (process.pidfd >= 0) ::close(process.pidfd);
    process.error = task.error;
    process.failedStep = task.failedStep;
    process.pidfd = -1;
    process.id = -1;
  }
  return process;
}

}  // namespace mirevo
