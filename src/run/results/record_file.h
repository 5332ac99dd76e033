#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace mirevo {

/// A text file that grows record by record: each record is on its way to disk when the call returns, and a record that
/// does not fit on the disk leaves no torn half behind.
class RecordFile final {
 public:
  RecordFile() = default;
  ~RecordFile();
  RecordFile(const RecordFile&) = delete;
  RecordFile& operator=(const RecordFile&) = delete;

  /// Creates the file anew. Throws FatalError with the system's reason.
  void open(const std::string& path);

  /// Goes on behind what the file holds. Throws FatalError with the system's reason.
  void openToContinue(const std::string& path);

  /// Appends `record` as it stands, line ends included. Throws FatalError with the system's reason, once: a file that
  /// could not be written takes no further records.
  void append(std::string_view record);

  /// Like append(), for the end of a run that fails already: false, with the system's reason, instead of an error.
  bool tryAppend(std::string_view record, std::string& reason);

  /// Throws FatalError with the system's reason when what was written did not all arrive.
  void close();
  /// Like close(): false, with the system's reason, instead of an error.
  bool tryClose(std::string& reason);

  bool isOpen() const { return descriptor_ >= 0; }
  const std::string& path() const { return path_; }
  int descriptor() const { return descriptor_; }
  /// Bytes written so far.
  std::int64_t size() const { return size_; }

 private:
  void openWith(const std::string& path, int flags);

  std::string path_;
  int descriptor_ = -1;
  std::int64_t size_ = 0;
  bool failed_ = false;
};

/// Keeps an earlier run's file or folder from being overwritten: renames `path` to the first free of
/// `<stem>.1<ending>`, `<stem>.2<ending>` ..., a folder `<name>.1`, and returns that name; empty when there is nothing
/// to keep, or something that is neither (a device). Throws FatalError when it cannot be looked at or renamed.
std::string keepEarlierFile(const std::string& path);

/// Writes a text beside the results, whole. A file that holds it already, of a run that is walked through again, stays
/// as it is; another one is kept under a numbered name. Throws FatalError.
void writeBesideResults(const std::string& path, const std::string& text);

}  // namespace mirevo
