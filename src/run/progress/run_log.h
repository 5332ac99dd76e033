#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace mirevo {

/// The run log, `<setup>.log`: each record has been passed to the system when the call returns, so that it survives a
/// kill of the program.
class RunLog final {
 public:
  static constexpr std::size_t kMostWarningsKept = 20;

  RunLog() = default;
  ~RunLog();
  RunLog(const RunLog&) = delete;
  RunLog& operator=(const RunLog&) = delete;

  /// Creates the file, replacing an existing one; false with the system's reason when that fails. Lines written before
  /// the call come first.
  bool open(const std::string& path, std::string& reason);
  void close();
  /// Whether it was open and is so no more: what is written now goes nowhere.
  bool isClosed() const { return isClosed_; }

  /// Writes one record; several lines if `text` has line ends.
  void line(std::string_view text);
  /// Writes a line of a report of a search or analysis, as a warning if it begins like one.
  void reportLine(std::string_view text);
  /// Writes a record that begins with "Warning: ", and passes it on to whoever listens. Of a closed log the listener
  /// alone gets it.
  void warning(std::string_view text);
  /// From now on `listener` gets every warning as it is in the log.
  void passWarningsTo(std::function<void(std::string_view)> listener) { listener_ = std::move(listener); }

  /// The first warnings, without "Warning: ", at most kMostWarningsKept of them.
  const std::vector<std::string>& warnings() const { return warnings_; }
  const std::string& lastWarning() const { return lastWarning_; }
  int warningCount() const { return warningCount_; }

  /// Writes that no model was run, and why ("The setup is refused"), for isOfNoRun().
  void markAsOfNoRun(std::string_view why) { line(std::string(why).append(kOfNoRun)); }
  /// Whether the file is the log of a start that came to no model run; no, if it cannot be read.
  static bool isOfNoRun(const std::string& path);

  /// What line() wrote last.
  const std::string& lastRecord() const { return lastRecord_; }
  /// For signal handlers; -1 while no file is open.
  int descriptor() const { return descriptor_; }
  const std::string& path() const { return path_; }
  /// The system's reason for the first record that could not be written ("No space left on device"); empty if all were
  /// written.
  const std::string& writeError() const { return writeError_; }

 private:
  static constexpr std::string_view kWarning = "Warning: ";
  static constexpr std::string_view kOfNoRun = ": no model was run, and the next start replaces this log";

  void write(std::string_view record);

  int descriptor_ = -1;
  bool isClosed_ = false;
  std::string path_;
  std::string pending_;  ///< lines written before the file was open
  /// The first record, by which a log is known as one: written again where the disk had no room for it, or something
  /// has emptied the file.
  std::string head_;
  std::function<void(std::string_view)> listener_;
  std::vector<std::string> warnings_;
  std::string lastWarning_;
  int warningCount_ = 0;
  std::string writeError_;
  std::string lastRecord_;
};

}  // namespace mirevo
