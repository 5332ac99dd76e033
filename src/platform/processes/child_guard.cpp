#include "platform/processes/child_guard.h"

#include <cerrno>
#include <climits>
#include <csignal>
#include <cstring>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

namespace mirevo {
namespace {

/// The guard's process. Makes only async-signal-safe calls: threads of the program (of its MPI library) may have held a
/// lock at the fork.
[[noreturn]] void guard(pid_t parent, const ProcessGroupTable& table, const ProcessMark& mark) {
  // A session of its own keeps the terminal's signals away; signals sent to all processes of the user are ignored.
  ::setsid();
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGPIPE, SIGUSR1, SIGUSR2}) ::signal(signal, SIG_IGN);
  for (const int signal : {SIGABRT, SIGSEGV, SIGILL, SIGFPE, SIGBUS}) ::signal(signal, SIG_DFL);
  ::prctl(PR_SET_NAME, "mirevo_guard");
  // An open descriptor would keep a pipe open whose reader waits for the program's end; a current folder would keep its
  // file system busy.
  ::syscall(SYS_close_range, 0U, UINT_MAX, 0U);
  if (::chdir("/") != 0) ::_exit(1);

  const int watched = static_cast<int>(::syscall(SYS_pidfd_open, parent, 0U));
  if (watched >= 0 && ::getppid() == parent) {
    pollfd poll{watched, POLLIN, 0};
    while (::poll(&poll, 1, -1) < 0 && errno == EINTR) {
    }
  }
  table.signalAll(SIGKILL);
  mark.endBearers();
  ::_exit(0);
}

}  // namespace

ChildGuard::~ChildGuard() {
  if (process_ <= 0) return;
  ::kill(process_, SIGKILL);
  while (::waitpid(process_, nullptr, 0) < 0 && errno == EINTR) {
  }
}

bool ChildGuard::start(const ProcessGroupTable& table, const ProcessMark& mark, std::string& reason) {
  const pid_t parent = ::getpid();
  // Blocked during the fork, so that no handler of the program ever runs in the guard.
  sigset_t all;
  sigset_t before;
  ::sigfillset(&all);
  ::sigprocmask(SIG_SETMASK, &all, &before);
  process_ = ::fork();
  if (process_ == 0) guard(parent, table, mark);
  const int error = errno;
  ::sigprocmask(SIG_SETMASK, &before, nullptr);
  if (process_ > 0) return true;
  reason = std::strerror(error);
  return false;
}

}  // namespace mirevo
