#include "platform/processes/child_guard.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/descriptor.h"
#include "platform/processes/child_process.h"
#include "platform/processes/close_descriptors.h"

namespace mirevo {
namespace {

/// Between two looks of a guard that cannot wait for the program's end.
constexpr int kLookMilliseconds = 200;
/// Guards are not ended by chance: something that ends this many ends the next one, too. From then on they are renewed
/// rarely.
constexpr int kMostRenewals = 5;
constexpr double kRareSeconds = 60.0;

/// Returns when the program has ended. `watched` is a pidfd of the program, or -1.
void awaitEnd(pid_t program, int watched) {
  while (::getppid() == program) {
    pollfd poll{watched, POLLIN, 0};  // one with a negative descriptor is a mere pause
    if (::poll(&poll, 1, watched < 0 ? kLookMilliseconds : -1) > 0) return;
  }
}

/// The guard's process. Makes only async-signal-safe calls: threads of the program (of its MPI library) may have held a
/// lock at the fork.
[[noreturn]] void guard(pid_t program, int watched, const ProcessGroupTable& table, const ProcessMark& mark) {
  // A session of its own keeps the terminal's signals away; signals sent to all processes of the user are ignored.
  ::setsid();
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGPIPE, SIGUSR1, SIGUSR2}) ::signal(signal, SIG_IGN);
  for (const int signal : {SIGABRT, SIGSEGV, SIGILL, SIGFPE, SIGBUS}) ::signal(signal, SIG_DFL);
  ::prctl(PR_SET_NAME, "mirevo_guard");
  // An open descriptor would keep a pipe open whose reader waits for the program's end; a current folder would keep its
  // file system busy.
  closeDescriptors(0, watched - 1);
  closeDescriptors(std::max(watched + 1, 0));
  if (::chdir("/") != 0) ::_exit(1);

  awaitEnd(program, watched);
  table.signalAll(SIGKILL);
  mark.endBearers();
  ::_exit(0);
}

std::atomic<const ChildGuard*> currentGuard{nullptr};
static_assert(std::atomic<const ChildGuard*>::is_always_lock_free);

std::string howEnded(int status) {
  if (WIFSIGNALED(status)) return endedBySignal(WTERMSIG(status));
  return fmt::format("has ended with code {}", WEXITSTATUS(status));
}

}  // namespace

ChildGuard::ChildGuard(const ProcessGroupTable& table, const ProcessMark& mark) : table_(table), mark_(mark) {
  currentGuard = this;
}

ChildGuard::~ChildGuard() {
  const ChildGuard* self = this;
  currentGuard.compare_exchange_strong(self, nullptr);
  if (process_ <= 0) return;
  ::kill(process_, SIGKILL);
  while (::waitpid(process_, nullptr, 0) < 0 && errno == EINTR) {
  }
}

bool ChildGuard::start(std::string& reason) {
  const pid_t program = ::getpid();
  // Opened here, as the program is certain to be there, and to know whether it can be.
  const Descriptor watched(static_cast<int>(::syscall(SYS_pidfd_open, program, 0U)));
  limitation_.clear();
  if (watched.get() < 0) {
    limitation_ = fmt::format(
        "The guard that ends the model's processes if this program is killed looks every {:g} seconds whether it was, "
        "as it cannot be told so (pidfd_open: {})",
        kLookMilliseconds / 1000.0, std::strerror(errno));
  }
  process_ = forkWithSignalsBlocked();
  if (process_ == 0) guard(program, watched.get(), table_, mark_);
  if (process_ > 0) return true;
  process_ = 0;
  reason = std::strerror(errno);
  return false;
}

std::optional<std::string> ChildGuard::renewIfEnded() {
  const bool isRare = renewals_ == kMostRenewals;
  if (isRare && runTimeClock() < nextLook_) return std::nullopt;
  int status = 0;
  const pid_t ended = process_ > 0 ? ::waitpid(process_, &status, WNOHANG) : 0;
  if (process_ > 0 && (ended == 0 || (ended < 0 && errno != ECHILD))) return std::nullopt;
  std::string text = "The guard that ends the model's processes if this program is killed ";
  text += ended > 0 ? howEnded(status) : process_ > 0 ? "has ended" : "is missing";
  std::string reason;
  text += start(reason) ? "; another one was started" : "; another one could not be started: " + reason;
  nextLook_ = runTimeClock() + kRareSeconds;
  if (isRare) return std::nullopt;
  if (++renewals_ == kMostRenewals) {
    text +=
        ". From now on this is looked at once a minute and not told any more; in between, processes that have left "
        "their group would outlive a program that is killed";
  }
  return text;
}

bool ChildGuard::isThere() const noexcept {
  siginfo_t ended{};
  const auto id = static_cast<id_t>(process_);
  return process_ > 0 && ::waitid(P_PID, id, &ended, WEXITED | WNOHANG | WNOWAIT) == 0 && ended.si_pid == 0;
}

void ChildGuard::relieve() const noexcept {
  // What killed it may have sent this program its signal at once, before the guard is gone.
  constexpr int kLooks = 50;
  constexpr timespec kPause{0, 2'000'000};
  const int saved = errno;
  bool isThereStill = true;
  for (int look = 0; look < kLooks && (isThereStill = isThere()); ++look) {
    ::kill(process_, SIGCONT);
    ::nanosleep(&kPause, nullptr);
  }
  errno = saved;
  if (!isThereStill) mark_.endBearers();
}

void haltProcessesFromSignal() noexcept {
  haltGroupsFromSignal();
  if (const ChildGuard* guard = currentGuard.load()) guard->relieve();
}

}  // namespace mirevo
