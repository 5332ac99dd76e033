#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// The run log, `<setup>.log`: written record by record, each on disk when the call returns.
class RunLog final {
 public:
  RunLog() = default;
  ~RunLog();
  RunLog(const RunLog&) = delete;
  RunLog& operator=(const RunLog&) = delete;

  /// Creates the file anew; false with the system's reason when that fails. Lines written before are kept and come
  /// first, so that what was said before the log could be opened is in it.
  bool open(const std::string& path, std::string& reason);
  void close();

  /// One record; several lines where `text` has line ends.
  void line(std::string_view text);
  void warning(std::string_view text);

  /// For signal handlers: -1 while no file is open.
  int descriptor() const { return descriptor_; }
  const std::string& path() const { return path_; }
  /// What the system said when a record could first not be written ("No space left on device"); empty when all were.
  const std::string& writeError() const { return writeError_; }

 private:
  void write(std::string_view record);

  int descriptor_ = -1;
  std::string path_;
  std::string pending_;  ///< what was said before the file was open
  std::string writeError_;
};

}  // namespace mirevo
