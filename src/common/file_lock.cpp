#include "common/file_lock.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <string_view>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/checksum.h"
#include "common/clock.h"
#include "common/descriptor.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// The locks held, for signal handlers. A program holds few; one that is not in here only leaves its file behind.
std::array<std::atomic<const FileLock*>, 8> heldLocks;

struct flock lockOf(short type, FileLock::Range range) {
  struct flock lock {};
  lock.l_type = type;
  lock.l_whence = SEEK_SET;
  lock.l_start = range.first;
  lock.l_len = range.count;  // 0: to the end, however long the file becomes
  return lock;
}
constexpr FileLock::Range kWhole{0, 0};

/// Whether `descriptor` is still what the path names.
bool isAt(const std::string& path, int descriptor) noexcept {
  struct stat opened {};
  struct stat named {};
  return ::fstat(descriptor, &opened) == 0 && ::stat(path.c_str(), &named) == 0 && opened.st_dev == named.st_dev &&
         opened.st_ino == named.st_ino;
}

/// Binds a socket that has no file and that only one program of the machine can have at a time. Returns its descriptor,
/// or -1 with errno.
int bindSocket(const std::string& path, int number) {
  const std::size_t nameStart = path.rfind('/') + 1;
  struct stat folder {};
  if (::stat(path.substr(0, nameStart).c_str(), &folder) != 0) return -1;
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  // The leading zero byte means "without a file".
  const auto end = fmt::format_to_n(address.sun_path + 1, sizeof address.sun_path - 1, "mirevo-{:x}-{:x}-{:x}-{}",
                                    folder.st_dev, folder.st_ino, checksumOf(path.substr(nameStart)), number);
  Descriptor made(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  if (made.get() < 0) return -1;
  const auto length = static_cast<socklen_t>(end.out - reinterpret_cast<const char*>(&address));
  if (::bind(made.get(), reinterpret_cast<const sockaddr*>(&address), length) != 0) return -1;
  return made.giveAway();
}

}  // namespace

bool FileLock::take(const std::string& path, Range range, double patienceSeconds) {
  release();
  path_ = path;
  holder_.clear();
  warning_.clear();
  const double deadline = runTimeClock() + patienceSeconds;
  int file = -1;
  while (true) {
    int error = 0;
    const Attempt attempt = lockFile(file, range, error);
    const bool isLast = attempt != Attempt::held || runTimeClock() >= deadline;
    if (isLast && file >= 0) ::close(std::exchange(file, -1));
    if (attempt == Attempt::impossible) return takeSocket(range, error, deadline);
    if (attempt == Attempt::taken) {
      leaveName();
      registerForSignals();
      return true;
    }
    if (isLast) break;
    ::usleep(kLockPauseMicroseconds);
  }
  holder_ = holderOf(path_);
  path_.clear();
  return false;
}

/// `file` is the path's, open, or -1; it stays open for the next attempt.
FileLock::Attempt FileLock::lockFile(int& file, Range range, int& error) {
  while (true) {
    if (file >= 0 && !isAt(path_, file)) ::close(std::exchange(file, -1));  // its holder has removed it
    if (file < 0) file = ::open(path_.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW, 0666);
    error = errno;
    // That of another user, who may hold it, cannot be written to.
    if (file < 0) return error == EACCES && isHeld(path_) ? Attempt::held : Attempt::impossible;
    struct flock lock = lockOf(F_WRLCK, range);
    if (::fcntl(file, F_OFD_SETLK, &lock) != 0) {
      error = errno;
      return error == EAGAIN || error == EACCES ? Attempt::held : Attempt::impossible;
    }
    errno = 0;
    if (!isAt(path_, file)) {
      error = errno;
      if (error == 0 || error == ENOENT) continue;  // removed in between
      return Attempt::impossible;                   // it cannot be looked at
    }
    descriptor_ = std::exchange(file, -1);
    return Attempt::taken;
  }
}

bool FileLock::takeSocket(Range range, int error, double deadline) {
  while (true) {
    socket_ = bindSocket(path_, range.first);
    if (socket_ >= 0 || errno != EADDRINUSE) break;
    if (runTimeClock() >= deadline) {
      path_.clear();
      return false;
    }
    ::usleep(kLockPauseMicroseconds);
  }
  warning_ = fmt::format("{} cannot be locked: {}. Another run that works on the same files {}", path_,
                         std::strerror(error), socket_ < 0 ? "is not noticed" : "is noticed on this machine only");
  registerForSignals();
  return true;
}

/// Says in the file who holds the lock, for the message to another.
void FileLock::leaveName() const {
  const std::string name = fmt::format("process {} on {}\n", ::getpid(), hostName());
  if (::ftruncate(descriptor_, 0) != 0) return;
  static_cast<void>(::pwrite(descriptor_, name.data(), name.size(), 0) == 0);  // without it the message says less
}

void FileLock::registerForSignals() const {
  for (auto& entry : heldLocks) {
    const FileLock* none = nullptr;
    if (entry.compare_exchange_strong(none, this)) return;
  }
}

void FileLock::removeFilesFromSignal() noexcept {
  for (const auto& entry : heldLocks) {
    if (const FileLock* lock = entry; lock != nullptr) lock->removeFile();
  }
}

/// Unless others share the file: the last of them removes it.
void FileLock::removeFile() const noexcept {
  if (descriptor_ >= 0) {
    // First without its own part, so that of several that end at once one finds the file free.
    struct flock lock = lockOf(F_UNLCK, kWhole);
    ::fcntl(descriptor_, F_OFD_SETLK, &lock);
    lock = lockOf(F_WRLCK, kWhole);
    if (::fcntl(descriptor_, F_OFD_SETLK, &lock) != 0 || !isAt(path_, descriptor_)) return;
  }
  struct stat status {};
  const bool isOwn = ::lstat(path_.c_str(), &status) == 0 && S_ISREG(status.st_mode);  // and no link of the user's
  if (isOwn && (descriptor_ >= 0 || socket_ >= 0)) ::unlink(path_.c_str());
}

void FileLock::release() {
  for (auto& entry : heldLocks) {
    const FileLock* own = this;
    entry.compare_exchange_strong(own, nullptr);
  }
  removeFile();
  for (int* descriptor : {&descriptor_, &socket_}) {
    if (*descriptor >= 0) ::close(std::exchange(*descriptor, -1));
  }
  path_.clear();
}

std::string FileLock::holderOf(const std::string& path) {
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  std::array<char, 200> text{};
  const ssize_t length = file.get() < 0 ? 0 : ::pread(file.get(), text.data(), text.size(), 0);
  if (length <= 0) return {};
  const std::string_view read(text.data(), static_cast<std::size_t>(length));
  const std::size_t end = read.find('\n');
  return end == std::string_view::npos ? std::string() : fmt::format(" ({})", read.substr(0, end));
}

bool FileLock::isHeld(const std::string& path) {
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  if (file.get() < 0 && errno == ENOENT) return false;
  struct flock lock = lockOf(F_WRLCK, kWhole);
  if (file.get() >= 0 && ::fcntl(file.get(), F_OFD_GETLK, &lock) == 0) return lock.l_type != F_UNLCK;
  const Descriptor probe(bindSocket(path, 0));
  return probe.get() < 0 && errno == EADDRINUSE;
}

}  // namespace mirevo
