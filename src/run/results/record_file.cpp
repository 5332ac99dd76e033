#include "run/results/record_file.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/descriptor_output.h"
#include "common/fatal_error.h"
#include "common/file_copy.h"
#include "common/files.h"
#include "common/take_text.h"
#include "platform/signals/signal_state.h"

namespace mirevo {
namespace {

[[noreturn]] void failToKeep(const std::string& path, const std::string& reason) {
  fatalError("Error: Unable to keep the earlier file " + path, reason);
}

/// A dot in the name of a folder belongs to the setup's name and does not begin an ending.
std::string firstFreeName(const std::string& path, bool isFolder) {
  const std::size_t nameStart = path.rfind('/') == std::string::npos ? 0 : path.rfind('/') + 1;
  const std::size_t dot = path.rfind('.');
  const std::size_t stemEnd = isFolder || dot == std::string::npos || dot <= nameStart ? path.size() : dot;
  for (int number = 1;; ++number) {
    std::string name = fmt::format("{}.{}{}", path.substr(0, stemEnd), number, path.substr(stemEnd));
    struct stat status {};
    if (::lstat(name.c_str(), &status) == 0) continue;
    if (errno == ENOENT) return name;
    const char* reason = std::strerror(errno);  // a file may be there, which would be lost
    failToKeep(path, fmt::format("{}: {}", name, reason));
  }
}

}  // namespace

RecordFile::~RecordFile() {
  std::string reason;
  tryClose(reason);
}

void RecordFile::open(const std::string& path) {
  openWith(path, O_RDWR | O_NOFOLLOW | O_CREAT | O_TRUNC | O_APPEND);
}

void RecordFile::openToContinue(const std::string& path) {
  openWith(path, O_RDWR | O_NOFOLLOW | O_APPEND);
  takeSize();
}

void RecordFile::openToRead(const std::string& path) {
  openWith(path, O_RDONLY);
  takeSize();
}

void RecordFile::takeSize() {
  struct stat status {};
  if (::fstat(descriptor_, &status) != 0) fatalError("Error: Unable to open " + path_, std::strerror(errno));
  size_ = status.st_size;
}

void RecordFile::openToContinue(const std::string& path, const std::string& content) {
  std::string reason;
  if (readFileIfThere(path) != content && !replaceFile(path, content, reason)) {
    fatalError("Error: Unable to write to " + path, reason);
  }
  openToContinue(path);
}

void RecordFile::openWith(const std::string& path, int flags) {
  close();
  path_ = path;
  size_ = 0;
  failed_ = false;
  descriptor_ = ::open(path.c_str(), O_CLOEXEC | flags, 0666);
  if (descriptor_ < 0) fatalError("Error: Unable to open " + path, std::strerror(errno));
}

bool RecordFile::append(std::string_view record) {
  if (failed_) return false;
  std::string reason;
  if (!tryAppend(record, reason)) fatalError("Error: Unable to write to " + path_, reason);
  return true;
}

bool RecordFile::tryAppend(std::string_view record, std::string& reason) {
  if (descriptor_ < 0 || failed_) {
    reason = "the file is closed";
    return false;
  }
  const EndingSignalsHeld held;  // so that a signal's closing line follows a whole record
  struct stat status {};
  const bool isKnown = ::fstat(descriptor_, &status) == 0;
  if (isKnown && !putBackIfRemoved(descriptor_, path_, status)) {
    reason = errno == EEXIST ? replacedText()
                             : std::string("it was removed and cannot be put back: ") + std::strerror(errno);
    failed_ = true;
    return false;
  }
  const std::int64_t before = size_;
  if (isKnown && !takeUpSize(status, reason)) {
    failed_ = true;
    return false;
  }
  // Behind half a line of another program the record would be lost to readers.
  const bool needsLineEnd = size_ > before && record.ends_with('\n') && !endsLine();
  int error = needsLineEnd ? writeWhole(descriptor_, "\n").error : 0;
  if (error == 0) error = writeWhole(descriptor_, record).error;
  if (error != 0) {
    reason = std::strerror(error);
    failed_ = true;
    // Removes the part that was written: readers of the file would take it for a record.
    if (::ftruncate(descriptor_, size_) != 0 && errno != EINVAL) reason += ", and its last line is cut off";
    return false;
  }
  size_ += static_cast<std::int64_t>(record.size()) + (needsLineEnd ? 1 : 0);
  return true;
}

bool RecordFile::takeUpSize(struct stat status, std::string& reason) {
  if (!S_ISREG(status.st_mode)) return true;
  // A network file system may show an earlier size for a while, until the file is opened anew. Afterwards any size but
  // the old one is of a program that has written the file again.
  constexpr int kMoreLooks = 10;
  constexpr timespec kPause{0, 100'000'000};
  std::int64_t shortest = size_;
  for (int look = 0; look < kMoreLooks && status.st_size < size_; ++look) {
    shortest = std::min<std::int64_t>(shortest, status.st_size);
    ::nanosleep(&kPause, nullptr);
    const Descriptor again(::open(path_.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    if (::fstat(descriptor_, &status) != 0) return true;
  }
  if (shortest < size_ && status.st_size != size_) {
    reason = shortenedText(size_, shortest);
    return false;
  }
  size_ = status.st_size;
  return true;
}

bool RecordFile::isAtItsPath(std::string& reason) const {
  if (failed_) {
    reason = "it takes no more records";
    return false;
  }
  struct stat open {};
  struct stat named {};
  if (::fstat(descriptor_, &open) != 0 || ::lstat(path_.c_str(), &named) != 0) {
    reason = std::strerror(errno);
    return false;
  }
  const bool isSame = open.st_dev == named.st_dev && open.st_ino == named.st_ino;
  if (!isSame) reason = replacedText();
  return isSame;
}

bool RecordFile::endsLine() const {
  char last = '\n';
  std::string ignored;
  return size_ == 0 || !tryRead(size_ - 1, &last, 1, ignored) || last == '\n';
}

bool RecordFile::tryRead(std::int64_t offset, char* bytes, std::size_t size, std::string& reason) const {
  while (size > 0) {
    const ssize_t count = ::pread(descriptor_, bytes, size, offset);
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) {
      reason = count < 0 ? std::strerror(errno) : "it ends too early";
      return false;
    }
    offset += count;
    bytes += count;
    size -= static_cast<std::size_t>(count);
  }
  return true;
}

void RecordFile::cutTo(std::int64_t size) {
  if (::ftruncate(descriptor_, size) != 0) fatalError("Error: Unable to write to " + path_, std::strerror(errno));
  size_ = size;
}

void RecordFile::close() {
  std::string reason;
  if (!tryClose(reason)) fatalError("Error: Unable to write to " + path_, reason);
}

bool RecordFile::tryClose(std::string& reason) {
  if (descriptor_ < 0) return true;
  struct stat status {};
  const bool isKnown = ::fstat(descriptor_, &status) == 0;
  const bool isWhole = failed_ || !isKnown || takeUpSize(status, reason);  // a failure has been told
  const int descriptor = std::exchange(descriptor_, -1);
  // What the system has taken may still fail on its way to the disk, and only this call tells of it.
  const int lost = ::fsync(descriptor) == 0 || errno == EINVAL || errno == EINTR ? 0 : errno;
  const int error = ::close(descriptor) == 0 || errno == EINTR ? lost : errno;
  if (error != 0 && isWhole) reason = std::strerror(error);
  return error == 0 && isWhole;
}

std::string replacedText() {
  return "another program has replaced it with another file. Move that away, unless it is a copy of this one, before "
         "the setup is run again";
}

std::string shortenedText(std::int64_t from, std::int64_t to) {
  return fmt::format(
      "another program has shortened it, from {} to {} bytes. With Restart = 1 the setup goes on from what is left and "
      "makes lost evaluations again",
      from, to);
}

std::vector<NumberedEntry> numberedEntries(const std::string& prefix, std::string_view extension) {
  const std::filesystem::path beginning(prefix);
  const std::string stem = beginning.filename().string();
  std::vector<NumberedEntry> entries;
  std::error_code failed;
  std::filesystem::directory_iterator entry(beginning.parent_path(), failed);
  for (; !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    const std::string name = entry->path().filename().string();
    std::string_view digits = name;
    if (!takeText(digits, stem) || !digits.ends_with(extension)) continue;
    digits.remove_suffix(extension.size());
    if (isDigits(digits)) entries.push_back({entry->path().string(), std::string(digits)});
  }
  return entries;
}

std::string keepEarlierFile(const std::string& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) return {};
    failToKeep(path, std::strerror(errno));
  }
  if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) return {};
  std::string kept = firstFreeName(path, S_ISDIR(status.st_mode));
  if (::rename(path.c_str(), kept.c_str()) != 0) {
    const char* reason = std::strerror(errno);
    failToKeep(path, fmt::format("It cannot be renamed to {}: {}", kept, reason));
  }
  return kept;
}

}  // namespace mirevo
