#include "common/file_copy.h"

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/sendfile.h>
#include <sys/stat.h>
#include <unistd.h>

#include "common/descriptor.h"

namespace mirevo {
namespace {

constexpr std::size_t kCopyChunk = std::size_t{1} << 30;

/// Whether `from` is a regular file, with its `status`; if not, the reason is in errno.
bool isFile(int from, struct stat& status) {
  if (from < 0 || ::fstat(from, &status) != 0) return false;
  if (S_ISREG(status.st_mode)) return true;
  errno = S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
  return false;
}

/// Writes the copy. False, with the reason in errno, when that fails.
bool copyTo(const std::string& target, int from, const struct stat& status) {
  ::unlink(target.c_str());
  Descriptor to(::open(target.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, S_IRUSR | S_IWUSR));
  if (to.get() < 0) return false;
  if (status.st_size > 0 && !copyContent(from, to.get())) return false;
  const std::array<timespec, 2> times = {status.st_atim, status.st_mtim};
  ::futimens(to.get(), times.data());  // a copy with other times is still a copy
  return ::fchmod(to.get(), status.st_mode & 07777) == 0 && to.close();
}

}  // namespace

bool copyContent(int from, int to) {
  if (::ioctl(to, FICLONE, from) == 0) return true;
  ssize_t copied = 0;
  while ((copied = ::copy_file_range(from, nullptr, to, nullptr, kCopyChunk, 0)) > 0) {
  }
  if (copied == 0) return true;
  // Both calls advance the offsets only by what was copied, so the next method continues where this one stopped.
  while ((copied = ::sendfile(to, from, nullptr, kCopyChunk)) > 0) {
  }
  return copied == 0;
}

bool putBackIfRemoved(int descriptor, const std::string& path) {
  struct stat status {};
  if (::fstat(descriptor, &status) != 0 || status.st_nlink > 0 || !S_ISREG(status.st_mode)) return true;
  const Descriptor file(::open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, status.st_mode & 07777));
  if (file.get() < 0) return false;
  ::lseek(descriptor, 0, SEEK_SET);
  const bool isCopied = status.st_size == 0 || copyContent(descriptor, file.get());
  if (isCopied && ::fcntl(file.get(), F_SETFL, ::fcntl(descriptor, F_GETFL)) == 0 &&
      ::dup3(file.get(), descriptor, O_CLOEXEC) >= 0) {
    return true;
  }
  const int reason = errno;
  ::unlink(path.c_str());
  errno = reason;
  return false;
}

bool copyWhole(const std::string& source, const std::string& target, std::string& reason) {
  const std::string part = target + ".part";
  // Without O_NONBLOCK opening a pipe would wait for a writer.
  const Descriptor from(::open(source.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status {};
  if (!isFile(from.get(), status)) {
    reason = std::strerror(errno);
    return false;
  }
  if (copyTo(part, from.get(), status) && ::rename(part.c_str(), target.c_str()) == 0) return true;
  reason = target + ": " + std::strerror(errno);
  ::unlink(part.c_str());
  return false;
}

}  // namespace mirevo
