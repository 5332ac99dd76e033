#pragma once

#include <cstdint>
#include <deque>
#include <optional>
#include <string>
#include <vector>

#include "common/progress_messages.h"

namespace mirevo {

/// What is known of a run from its message file. Times are seconds since 1970-01-01 UTC.
struct ProgressState {
  bool hasRecords = false;
  std::string title;
  std::string task;            ///< what the run is doing
  std::string ending;          ///< how it ended; empty until the run itself has said so
  progress::RunOrigin origin;  ///< times by the clock of the run's machine

  std::string countLabel;               ///< "Model evaluation"; empty before the task has begun
  std::optional<std::int64_t> planned;  ///< evaluations
  std::int64_t done = 0;                ///< evaluations, including failed ones
  std::int64_t failed = 0;

  std::optional<double> percent;
  std::optional<double> perSecond;
  std::optional<double> secondsLeft;  ///< at `lastNewsAt`
  double lastNewsAt = 0.0;            ///< when the latest records were written

  std::optional<progress::BestEvaluation> best;

  /// The best aggregate from `evaluations` evaluations on, until the next point.
  struct CoursePoint {
    std::int64_t evaluations = 0;
    double aggregate = 0.0;
  };
  std::vector<CoursePoint> course;  ///< thinned when it becomes long

  std::deque<std::string> notices;    ///< the latest messages that are not routine, oldest first
  std::string latestMessage;          ///< of any kind
  bool isLatestMessageNotice = true;  ///< if so, it is the last of `notices`
};

}  // namespace mirevo
