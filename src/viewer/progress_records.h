#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "viewer/progress_state.h"

namespace mirevo {

/// Builds up a ProgressState from the bytes of a message file, in pieces of any size. The records are described in
/// docs/progress-format.md; a line that is none is passed over, and whatever the bytes, the memory used is bounded.
class ProgressRecords final {
 public:
  /// Takes the next bytes of the file, written at `time` (seconds since 1970). The messages among them are appended to
  /// `messages` where that is given. A line is taken once its end is there.
  void feed(std::string_view bytes, double time, std::vector<std::string>* messages = nullptr);

  /// Adds a message that came another way.
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
  std::size_t coursePointsToSkip_ = 0;  ///< between two that are kept
  std::size_t skippedCoursePoints_ = 0;
};

}  // namespace mirevo
