#include "platform/series/binary_file.h"

#include <algorithm>
#include <bit>
#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/files.h"
#include "platform/series/series_reading.h"

namespace mirevo {
namespace {

static_assert(std::endian::native == std::endian::little);

/// Records that are no longer than this are read many at a time.
constexpr std::uint64_t kLongestTogether = 4096;
constexpr std::size_t kAtATime = std::size_t{1} << 20;

}  // namespace

bool BinaryFile::open(const std::string& path) {
  close();
  path_ = path;
  fault_ = faultOfFile(path);
  if (!fault_.empty()) return false;
  file_ = std::make_unique<Descriptor>(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
  struct stat status {};
  if (file_->get() < 0 || ::fstat(file_->get(), &status) != 0) {
    fault_ = std::strerror(errno);
    return false;
  }
  size_ = static_cast<std::uint64_t>(status.st_size);
  return true;
}

void BinaryFile::close() {
  file_.reset();
  size_ = 0;
  fault_.clear();
}

void BinaryFile::refuseEnd() {
  fault_ = fmt::format("it ends after {} bytes, before what it should have", size_);
}

bool BinaryFile::read(std::uint64_t place, void* bytes, std::size_t length) {
  if (reading_ && reading_->watch.isOver()) {
    fault_ = reading_->watch.reason();
    return false;
  }
  char* to = static_cast<char*>(bytes);
  while (length > 0) {
    if (place > size_ || length > size_ - place) break;
    const ssize_t got = ::pread(file_->get(), to, length, static_cast<off_t>(place));
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) {
      fault_ = std::strerror(errno);
      return false;
    }
    if (got == 0) break;
    to += got;
    place += static_cast<std::uint64_t>(got);
    length -= static_cast<std::size_t>(got);
  }
  if (length > 0) refuseEnd();
  return length == 0;
}

std::optional<std::string> BinaryFile::text(std::uint64_t place, std::size_t length) {
  if (length > size_) return endsAt<std::string>();
  std::string text(length, '\0');
  if (!read(place, text.data(), length)) return std::nullopt;
  return text;
}

bool BinaryFile::readColumn(std::uint64_t place, std::uint64_t stride, std::size_t count, std::size_t width,
                            char* values) {
  if (stride > kLongestTogether) {
    for (std::size_t i = 0; i < count; ++i) {
      if (!read(place + i * stride, values + i * width, width)) return false;
    }
    return true;
  }
  const std::size_t together =
      std::max<std::size_t>(1, kAtATime / static_cast<std::size_t>(std::max<std::uint64_t>(stride, 1)));
  std::vector<char> part;
  for (std::size_t first = 0; first < count; first += together) {
    const std::size_t records = std::min(together, count - first);
    part.resize(static_cast<std::size_t>(stride) * (records - 1) + width);
    if (!read(place + first * stride, part.data(), part.size())) return false;
    for (std::size_t i = 0; i < records; ++i) {
      std::memcpy(values + (first + i) * width, part.data() + i * stride, width);
    }
  }
  return true;
}

}  // namespace mirevo
