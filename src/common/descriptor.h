#pragma once

#include <cerrno>
#include <unistd.h>
#include <utility>

namespace mirevo {

/// Closes a file descriptor at the end of its scope and leaves errno as it is. A negative number means no file.
class Descriptor final {
 public:
  explicit Descriptor(int fd) : fd_(fd) {}
  ~Descriptor() {
    const int saved = errno;
    if (fd_ >= 0) ::close(fd_);
    errno = saved;
  }
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  int get() const { return fd_; }
  /// Leaves it open, for the caller to close.
  int giveAway() { return std::exchange(fd_, -1); }
  /// Closes it now. False, with the reason in errno, when something that was written has not reached the file: a
  /// network file system may report only here that its disk is full.
  bool close() {
    const int fd = std::exchange(fd_, -1);
    return fd < 0 || ::close(fd) == 0 || errno == EINTR;  // after an interruption the file is closed all the same
  }

 private:
  int fd_;
};

}  // namespace mirevo
