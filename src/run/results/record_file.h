#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <sys/stat.h>
#include <vector>

namespace mirevo {

/// A file that grows record by record: each record has been passed to the system when the call returns, and a record
/// that does not fit on the disk leaves no part of itself behind. A file that another program has shortened takes no
/// more records; what another program has appended stays.
class RecordFile final {
 public:
  RecordFile() = default;
  ~RecordFile();
  RecordFile(const RecordFile&) = delete;
  RecordFile& operator=(const RecordFile&) = delete;

  /// Creates the file, replacing an existing one. Throws FatalError with the system's reason.
  void open(const std::string& path);

  /// Opens the file to append to its content. Throws FatalError with the system's reason.
  void openToContinue(const std::string& path);

  /// The same after making `content` the file's, as a whole, unless it is already. Throws FatalError.
  void openToContinue(const std::string& path, const std::string& content);

  /// Opens the file to read from it alone. Throws FatalError with the system's reason.
  void openToRead(const std::string& path);

  /// Appends `record` unchanged, line ends included. Throws FatalError with the system's reason, once: after a failure
  /// further records are dropped. False for one that is.
  bool append(std::string_view record);

  /// Like append(), for the end of a run that has failed already: returns false, with the system's reason, instead of
  /// throwing.
  bool tryAppend(std::string_view record, std::string& reason);

  /// Throws FatalError with the reason if not everything written has reached the disk and is still there.
  void close();
  /// Reads bytes written before, `size` of them from `offset` on. False, with the reason, if that fails.
  bool tryRead(std::int64_t offset, char* bytes, std::size_t size, std::string& reason) const;
  /// Cuts off what is behind the first `size` bytes. Throws FatalError with the system's reason.
  void cutTo(std::int64_t size);
  /// Like close(), but returns false, with the system's reason, instead of throwing.
  bool tryClose(std::string& reason);

  /// Whether it has taken every record and is still what is at its path, so that it may be replaced by path. False with
  /// the reason.
  bool isAtItsPath(std::string& reason) const;

  bool isOpen() const { return descriptor_ >= 0; }
  /// Whether an append has failed, after which further records are dropped.
  bool hasFailed() const { return failed_; }
  const std::string& path() const { return path_; }
  int descriptor() const { return descriptor_; }
  /// Bytes up to the end of the last record; it begins its own length before.
  std::int64_t size() const { return size_; }

 private:
  /// Takes up what other programs have appended, by what fstat() has just told of the file. False, with the reason, if
  /// one of them has shortened it.
  bool takeUpSize(struct stat status, std::string& reason);
  bool endsLine() const;
  void openWith(const std::string& path, int flags);
  void takeSize();

  std::string path_;
  int descriptor_ = -1;
  std::int64_t size_ = 0;
  bool failed_ = false;
};

/// That another program has replaced a file, and what to do.
std::string replacedText();
/// That another program has shortened a file, and what to do.
std::string shortenedText(std::int64_t from, std::int64_t to);

/// Something whose name is `prefix`, digits and `extension`.
struct NumberedEntry {
  std::string path;
  std::string digits;
};
/// All of them, in the system's order.
std::vector<NumberedEntry> numberedEntries(const std::string& prefix, std::string_view extension);

/// Keeps an earlier run's file or folder from being overwritten: renames `path` to the first free of
/// `<stem>.1<ending>`, `<stem>.2<ending>` ..., or of `<name>.1` ... for a folder, and returns that name; empty if there
/// is nothing to keep, or neither a file nor a folder (a device). Throws FatalError when `path` cannot be examined or
/// renamed.
std::string keepEarlierFile(const std::string& path);

}  // namespace mirevo
