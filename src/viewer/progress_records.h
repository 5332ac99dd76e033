#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "viewer/progress_state.h"

namespace mirevo {

/// Builds up a ProgressState from the bytes of a message file, in pieces of any size. The records are described in
/// docs/progress-format.md; lines that are not records are skipped, and the memory used is bounded whatever the bytes.
class ProgressRecords final {
 public:
  /// Takes the next bytes of the file, written at `time` (seconds since 1970). The messages among them are appended to
  /// `messages`, if given. A line is used once it is complete.
  void feed(std::string_view bytes, double time, std::vector<std::string>* messages = nullptr);

  /// Adds a message from another source.
  void addNotice(std::string_view text);

  /// Forgets everything: another run has begun.
  void clear();

  const ProgressState& state() const { return state_; }

 private:
  void takeLine(std::string_view line, std::vector<std::string>* messages);
  void takeStatus(std::string_view text);
  void takeMessage(std::string_view text);
  bool takeEvaluationMessage(std::string_view text);
  void addCoursePoint();

  ProgressState state_;
  std::string unfinishedLine_;
  std::size_t coursePointsToSkip_ = 0;  ///< between two kept points
  std::size_t skippedCoursePoints_ = 0;
};

}  // namespace mirevo
