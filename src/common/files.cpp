#include "common/files.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <limits>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/descriptor_output.h"
#include "common/fatal_error.h"
#include "common/large_pages.h"
#include "common/reading_watch.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Why something on disk is not a regular file: reading a device or a pipe may never end. Empty for a file.
std::string faultOfKind(const struct stat& status) {
  if (S_ISREG(status.st_mode)) return {};
  return S_ISDIR(status.st_mode) ? std::strerror(EISDIR) : "Not a regular file";
}

/// One part, the whole.
TextParts asParts(std::string_view content) {
  return [content]() mutable { return std::exchange(content, {}); };
}

/// Removes `path` and creates it again with `content`, and with `mode` or, if there is none, according to the umask.
bool createAnew(const std::string& path, const TextParts& content, std::optional<unsigned> mode, bool isFlushed,
                std::string& reason) {
  if (::unlink(path.c_str()) != 0 && errno != ENOENT) {
    reason = std::strerror(errno);
    return false;
  }
  Descriptor file(::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode.value_or(0666) & 07777));
  if (file.get() < 0 || (mode && ::fchmod(file.get(), *mode & 07777) != 0)) {
    reason = std::strerror(errno);
    return false;
  }
  int error = 0;
  for (std::string_view part = content(); error == 0 && !part.empty(); part = content()) {
    error = writeWhole(file.get(), part).error;
  }
  if (error == 0 && isFlushed && ::fsync(file.get()) != 0) error = errno;
  if (error == 0 && !file.close()) error = errno;
  if (error != 0) reason = std::strerror(error);
  return error == 0;
}

std::string sizeText(std::uintmax_t bytes) {
  return bytes < 1'000'000 ? fmt::format("{} bytes", bytes)
                           : fmt::format("{:.1f} MB", static_cast<double>(bytes) / 1e6);
}

/// Why the content of a file of this size is too much for the memory that is free; empty if it is not.
std::string whyNoMemory(std::uintmax_t size) {
  constexpr std::uintmax_t kAlwaysThere = 64'000'000;
  constexpr std::uintmax_t kShare = 2;  // the values take about as much as the text
  constexpr std::string_view kKey = "MemAvailable:";
  if (size <= kAlwaysThere) return {};
  std::string ignored;
  const std::string table = readTextFile("/proc/meminfo", ignored).value_or("");
  const std::size_t line = table.find(kKey);
  if (line == std::string::npos) return {};
  const std::size_t begin = line + kKey.size();
  const auto kilobytes = parseReal(std::string_view(table).substr(begin, table.find("kB", begin) - begin));
  if (!kilobytes) return {};
  const auto free = static_cast<std::uintmax_t>(*kilobytes * 1024.0);
  if (kShare * size <= free) return {};
  return fmt::format("its {} are too many to read with {} of free memory", sizeText(size), sizeText(free));
}

/// The first `length` bytes of a file. `watch` may be null.
std::optional<std::string> readBytes(const std::string& path, std::size_t length, std::string& reason,
                                     ReadingWatch* watch = nullptr) {
  // Without O_NONBLOCK the opening of a pipe would wait for its writer.
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status {};
  if (file.get() < 0 || ::fstat(file.get(), &status) != 0) {
    reason = std::strerror(errno);
    return std::nullopt;
  }
  reason = faultOfKind(status);
  if (reason.empty() && watch != nullptr) reason = whyNoMemory(static_cast<std::uintmax_t>(status.st_size));
  if (!reason.empty()) return std::nullopt;
  constexpr std::size_t kMostAtOnce = std::size_t{1} << 18;  // in the processor's cache from its zeroes to its bytes
  const std::size_t expected = std::min(static_cast<std::size_t>(status.st_size), length);
  std::string content;
  reserveToFill(content, expected + 1);  // the last byte is for finding the end without moving the rest
  std::size_t size = 0;
  while (size < length) {
    if (size == content.size()) {
      const std::size_t more = size == expected && size > 0 ? 1 : 65536;
      content.resize(size < expected ? std::min(size + kMostAtOnce, expected) : std::min(size + more, length));
    }
    if (watch != nullptr && watch->isOver()) {
      reason = watch->reason();
      return std::nullopt;
    }
    const ssize_t got = ::read(file.get(), content.data() + size, content.size() - size);
    if (got < 0) {
      if (errno == EINTR) continue;
      reason = std::strerror(errno);
      return std::nullopt;
    }
    if (got == 0) break;
    size += static_cast<std::size_t>(got);
  }
  content.resize(size);
  return content;
}

}  // namespace

std::string faultOfFile(const std::string& path) {
  struct stat status {};
  return ::stat(path.c_str(), &status) == 0 ? faultOfKind(status) : std::strerror(errno);
}

std::optional<std::string> readTextFile(const std::string& path, std::string& reason) {
  return readBytes(path, std::numeric_limits<std::size_t>::max(), reason);
}

std::optional<std::string> readTextFile(const std::string& path, std::string& reason, ReadingWatch& watch) {
  return readBytes(path, std::numeric_limits<std::size_t>::max(), reason, &watch);
}

std::string faultOfSize(const std::string& path, std::uintmax_t usualBytes) {
  constexpr std::uintmax_t kAlwaysRead = 4'000'000'000;
  constexpr std::uintmax_t kTimesUsual = 100;
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return {};  // opening it tells more
  const auto size = static_cast<std::uintmax_t>(status.st_size);
  if (size <= kAlwaysRead || size / kTimesUsual <= usualBytes) return {};
  return fmt::format(
      "its {} are too many: more than {}, and more than {} times the {} of the file in the model's folder",
      sizeText(size), sizeText(kAlwaysRead), kTimesUsual, sizeText(usualBytes));
}

std::optional<std::string> readFileHead(const std::string& path, std::string& reason) {
  return readBytes(path, kFileHeadLength, reason);
}

std::optional<std::string> readFileIfThere(const std::string& path, std::size_t length) {
  std::string reason;
  errno = 0;
  auto content = readBytes(path, length, reason);
  if (!content && errno != ENOENT && errno != ENOTDIR) fatalError("Error: Unable to read " + path, reason);
  return content;
}

bool writeByUnlinkAndCreate(const std::string& path, std::string_view content, unsigned mode, std::string& reason) {
  return createAnew(path, asParts(content), mode, false, reason);
}

bool replaceFile(const std::string& path, std::string_view content, std::string& reason,
                 std::string_view temporaryEnding) {
  return replaceFile(path, asParts(content), reason, temporaryEnding);
}

bool hasContent(const std::string& path, const TextParts& content) {
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status {};
  if (file.get() < 0 || ::fstat(file.get(), &status) != 0 || !S_ISREG(status.st_mode)) return false;
  std::string found;
  for (std::string_view part = content(); !part.empty(); part = content()) {
    found.resize(part.size());
    for (std::size_t size = 0; size < part.size();) {
      const ssize_t got = ::read(file.get(), found.data() + size, part.size() - size);
      if (got < 0 && errno == EINTR) continue;
      if (got <= 0) return false;
      size += static_cast<std::size_t>(got);
    }
    if (found != part) return false;
  }
  char more = 0;
  return ::read(file.get(), &more, 1) == 0;
}

bool replaceFile(const std::string& path, const TextParts& content, std::string& reason,
                 std::string_view temporaryEnding) {
  const std::string temporary = path + std::string(temporaryEnding);
  struct stat status {};
  std::optional<unsigned> mode;
  if (::stat(path.c_str(), &status) == 0) mode = status.st_mode;
  bool replaced = createAnew(temporary, content, mode, true, reason);
  if (replaced && ::rename(temporary.c_str(), path.c_str()) != 0) {
    reason = std::strerror(errno);
    replaced = false;
  }
  if (!replaced) ::unlink(temporary.c_str());
  return replaced;
}

}  // namespace mirevo
