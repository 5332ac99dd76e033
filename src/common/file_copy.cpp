#include "common/file_copy.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <fcntl.h>
#include <limits>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/sendfile.h>
#include <sys/stat.h>
#include <unistd.h>

#include "common/descriptor.h"

namespace mirevo {
namespace {

constexpr std::uint64_t kCopyChunk = std::uint64_t{1} << 24;  // a sixth of a second on a disk of 100 MB/s
constexpr off_t kStatBlock = 512;
constexpr off_t kHolesOfNoMatter = 1'000'000;

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

/// Copies so many bytes from the offsets on, fewer if the file ends before.
bool copyBytes(int from, int to, std::uint64_t count, const std::function<void(std::uint64_t)>& told) {
  ssize_t copied = 1;
  const auto take = [&count, &copied, &told] {
    count -= static_cast<std::uint64_t>(copied);
    if (told) told(static_cast<std::uint64_t>(copied));
  };
  while (count > 0 && (copied = ::copy_file_range(from, nullptr, to, nullptr, std::min(count, kCopyChunk), 0)) > 0) {
    take();
  }
  if (count == 0 || copied == 0) return true;
  // Both calls advance the offsets only by what was copied, so the next method continues where this one stopped.
  while (count > 0 && (copied = ::sendfile(to, from, nullptr, std::min(count, kCopyChunk))) > 0) take();
  return count == 0 || copied == 0;
}

/// Copies what is between the holes of a file: a model may have left one of many gigabytes that is a single hole.
bool copyAroundHoles(int from, int to, off_t size, const std::function<void(std::uint64_t)>& told) {
  off_t end = 0;
  off_t begin = 0;
  while ((begin = ::lseek(from, end, SEEK_DATA)) >= 0) {
    end = ::lseek(from, begin, SEEK_HOLE);
    if (end < begin || ::lseek(from, begin, SEEK_SET) < 0 || ::lseek(to, begin, SEEK_SET) < 0) return false;
    if (!copyBytes(from, to, static_cast<std::uint64_t>(end - begin), told)) return false;
  }
  return errno == ENXIO && ::ftruncate(to, size) == 0;
}

}  // namespace

bool copyContent(int from, int to) {
  BlockSharing unknown = BlockSharing::unknown;
  return copyContent(from, to, {}, unknown);
}

bool copyContent(int from, int to, const std::function<void(std::uint64_t)>& copied, BlockSharing& sharing) {
  struct stat status {};
  const bool isKnown = ::fstat(from, &status) == 0;
  if (sharing != BlockSharing::impossible) {
    if (::ioctl(to, FICLONE, from) == 0) {
      sharing = BlockSharing::possible;
      if (copied) copied(isKnown ? static_cast<std::uint64_t>(status.st_size) : 0);
      return true;
    }
    if (errno == EOPNOTSUPP || errno == ENOTTY) sharing = BlockSharing::impossible;
  }
  const bool hasHoles = isKnown && status.st_blocks * kStatBlock < status.st_size - kHolesOfNoMatter;
  if (hasHoles && (::lseek(from, 0, SEEK_DATA) >= 0 || errno == ENXIO))
    return copyAroundHoles(from, to, status.st_size, copied);
  return copyBytes(from, to, std::numeric_limits<std::uint64_t>::max(), copied);
}

bool putBackIfRemoved(int descriptor, const std::string& path) {
  struct stat status {};
  return ::fstat(descriptor, &status) != 0 || putBackIfRemoved(descriptor, path, status);
}

bool putBackIfRemoved(int descriptor, const std::string& path, const struct stat& status) {
  if (status.st_nlink > 0 || !S_ISREG(status.st_mode)) return true;
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
