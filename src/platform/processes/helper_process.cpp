#include "platform/processes/helper_process.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <csignal>
#include <cstring>
#include <ctime>
#include <exception>
#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>
#include <vector>

#include "common/files.h"
#include "common/reading_watch.h"
#include "platform/processes/child_process.h"
#include "platform/processes/close_descriptors.h"

namespace mirevo {
namespace {

constexpr int kLookMilliseconds = 100;

/// Helpers that have not been reaped.
std::vector<pid_t>& unreapedHelpers() {
  static std::vector<pid_t> helpers;
  return helpers;
}

[[noreturn]] void runHelper(pid_t parent, int socket, const std::function<void(int)>& serve) {
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (::getppid() != parent) ::_exit(0);
  unreapedHelpers().clear();
  ::prctl(PR_SET_NAME, "mirevo_helper");
  // Without the terminal's signals, and yet in the program's session, with which it shares the processors.
  ::setpgid(0, 0);
  for (int signal = 1; signal < NSIG; ++signal) ::signal(signal, SIG_DFL);
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGPIPE, SIGUSR1, SIGUSR2}) ::signal(signal, SIG_IGN);
  sigset_t none;
  ::sigemptyset(&none);
  ::sigprocmask(SIG_SETMASK, &none, nullptr);
  constexpr rlimit kNoCore{0, 0};  // a crash is nothing to keep
  ::setrlimit(RLIMIT_CORE, &kNoCore);
  constexpr int kSocket = STDERR_FILENO + 1;
  if (socket != kSocket && ::dup2(socket, kSocket) < 0) ::_exit(1);
  // What a library prints of a damaged file is for nobody.
  const int nowhere = ::open("/dev/null", O_RDWR);
  for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) ::dup2(nowhere, standard);
  closeDescriptors(kSocket + 1);
  try {
    serve(kSocket);
  } catch (const std::exception&) {
    ::_exit(1);
  }
  ::_exit(0);
}

/// Waits for the end of a process that is about to end; its status, or -1. One that waits for a lost network drive may
/// never end, and is left alone.
int reap(pid_t process) {
  constexpr int kMostNaps = 2000;
  constexpr timespec kNap{0, 1'000'000};
  int status = -1;
  for (int nap = 0; nap < kMostNaps; ++nap) {
    const pid_t ended = ::waitpid(process, &status, WNOHANG);
    if (ended == process || (ended < 0 && errno != EINTR)) {  // in the second case something else has reaped it
      std::erase(unreapedHelpers(), process);
      return ended == process ? status : -1;
    }
    ::nanosleep(&kNap, nullptr);
  }
  return -1;
}

}  // namespace

// Without exec: the helper is there at once and needs no file. The threads of searches side by side wait
// meanwhile; those of an MPI library hold no lock that the helper needs, as the C library's are in order after a fork.
bool HelperProcess::start(const std::function<void(int)>& serve, std::string& reason) {
  end();
  wasKilled_ = false;
  int sockets[2] = {-1, -1};
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets) != 0) {
    reason = std::strerror(errno);
    return false;
  }
  const pid_t parent = ::getpid();
  process_ = forkWithSignalsBlocked();
  if (process_ == 0) runHelper(parent, sockets[1], serve);
  const int error = errno;
  ::close(sockets[1]);
  if (process_ > 0) {
    unreapedHelpers().push_back(process_);
    owner_ = parent;
    socket_ = sockets[0];
    ::fcntl(socket_, F_SETFL, O_NONBLOCK);
    return true;
  }
  ::close(sockets[0]);
  process_ = 0;
  reason = std::strerror(error);
  return false;
}

bool isHelperProcess(pid_t process) {
  return std::find(unreapedHelpers().begin(), unreapedHelpers().end(), process) != unreapedHelpers().end();
}

/// Otherwise a copy made by a fork, whose socket is closed.
bool HelperProcess::isOwn() const {
  return process_ > 0 && owner_ == ::getpid();
}

bool HelperProcess::isRunning() const {
  char next = 0;
  return isOwn() && ::recv(socket_, &next, 1, MSG_PEEK | MSG_DONTWAIT) != 0;
}

void HelperProcess::end() {
  if (process_ <= 0) return;  // and how it ended is still asked for
  if (isOwn()) {
    ::kill(process_, SIGKILL);
    endAndDescribe();
  }
  process_ = 0;
  socket_ = -1;
  wasKilled_ = false;
}

void HelperProcess::leave() {
  if (isOwn() && socket_ >= 0) ::close(socket_);
  process_ = 0;
  socket_ = -1;
  wasKilled_ = false;
}

std::string HelperProcess::endAndDescribe() {
  if (socket_ >= 0) ::close(std::exchange(socket_, -1));
  const int status = reap(std::exchange(process_, 0));
  wasKilled_ = status != -1 && WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL;
  return status != -1 && WIFSIGNALED(status) ? endedBySignal(WTERMSIG(status)) : "has ended";
}

HelperProcess::Outcome HelperProcess::send(const void* bytes, std::size_t size, ReadingWatch& watch) {
  return transfer(static_cast<char*>(const_cast<void*>(bytes)), size, true, watch);  // which is not written to
}

HelperProcess::Outcome HelperProcess::receive(void* bytes, std::size_t size, ReadingWatch& watch) {
  return transfer(static_cast<char*>(bytes), size, false, watch);
}

HelperProcess::Outcome HelperProcess::receiveArrived(std::string& bytes) const {
  std::array<char, 65536> part;
  while (true) {
    const ssize_t count = ::recv(socket_, part.data(), part.size(), MSG_DONTWAIT);
    if (count > 0) {
      bytes.append(part.data(), static_cast<std::size_t>(count));
    } else if (count == 0 || (errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR)) {
      return Outcome::ended;
    } else if (errno != EINTR) {
      return Outcome::done;
    }
  }
}

bool HelperProcess::hasAnswer() const {
  pollfd ready{socket_, POLLIN, 0};
  return socket_ >= 0 && ::poll(&ready, 1, 0) == 1;
}

HelperProcess::Outcome HelperProcess::transfer(char* bytes, std::size_t size, bool isSending, ReadingWatch& watch) {
  while (size > 0) {
    const ssize_t moved = isSending ? ::send(socket_, bytes, size, MSG_NOSIGNAL) : ::recv(socket_, bytes, size, 0);
    if (moved > 0) {
      bytes += moved;
      size -= static_cast<std::size_t>(moved);
      continue;
    }
    if (moved == 0 || (errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR)) return Outcome::ended;
    pollfd poll{socket_, static_cast<short>(isSending ? POLLOUT : POLLIN), 0};
    const int ready = ::poll(&poll, 1, kLookMilliseconds);
    if (ready <= 0 && watch.isOver()) return Outcome::over;
  }
  return Outcome::done;
}

bool sendFromHelper(int socket, const void* bytes, std::size_t size) {
  const char* at = static_cast<const char*>(bytes);
  while (size > 0) {
    const ssize_t moved = ::send(socket, at, size, MSG_NOSIGNAL);
    if (moved < 0 && errno == EINTR) continue;
    if (moved <= 0) return false;
    at += moved;
    size -= static_cast<std::size_t>(moved);
  }
  return true;
}

bool receiveInHelper(int socket, void* bytes, std::size_t size) {
  char* at = static_cast<char*>(bytes);
  while (size > 0) {
    const ssize_t moved = ::recv(socket, at, size, 0);
    if (moved < 0 && errno == EINTR) continue;
    if (moved <= 0) return false;
    at += moved;
    size -= static_cast<std::size_t>(moved);
  }
  return true;
}

void limitOwnMemory(std::uintmax_t bytes) {
  if constexpr (!kLimitsMemory) return;
  std::string ignored;
  const std::string sizes = readTextFile("/proc/self/statm", ignored).value_or("");
  rlim_t pages = 0;
  const bool isRead = std::from_chars(sizes.data(), sizes.data() + sizes.size(), pages).ec == std::errc{};
  rlimit limit{};
  if (!isRead || ::getrlimit(RLIMIT_AS, &limit) != 0) return;
  const rlim_t wanted = pages * static_cast<rlim_t>(::sysconf(_SC_PAGESIZE)) + bytes;
  limit.rlim_cur = std::min(wanted, limit.rlim_max);
  ::setrlimit(RLIMIT_AS, &limit);
}

void limitOwnTime(double seconds) {
  rusage used{};
  rlimit limit{};
  if (!std::isfinite(seconds) || ::getrusage(RUSAGE_SELF, &used) != 0 || ::getrlimit(RLIMIT_CPU, &limit) != 0) return;
  const double sofar = static_cast<double>(used.ru_utime.tv_sec + used.ru_stime.tv_sec);
  limit.rlim_cur = std::min(static_cast<rlim_t>(std::max(sofar + seconds, 0.0)) + 3, limit.rlim_max);
  ::setrlimit(RLIMIT_CPU, &limit);
}

}  // namespace mirevo
