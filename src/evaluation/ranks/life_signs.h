#pragma once

#include <algorithm>
#include <functional>
#include <utility>

#include "evaluation/ranks/rank_messages.h"
#include "platform/jobs/job.h"

namespace mirevo {

/// What a worker sends while it has a set, so that the master knows that it is there.
class LifeSigns {
 public:
  using Clock = std::function<double()>;

  /// A worker that has not looked at its model for so long was itself stopped or kept waiting.
  static constexpr double kLongGap = 2.0;

  /// `silenceLimit`: seconds without a sign after which the master gives the set to another worker; 0: never.
  LifeSigns(Job& job, Clock clock, double silenceLimit)
      : job_(job),
        clock_(std::move(clock)),
        interval_(std::min(silenceLimit / 8.0, kLongestInterval)),
        limit_(silenceLimit) {}

  /// A model run begins.
  void begin() {
    lastLook_ = lastSign_ = clock_();
    longestGap_ = 0.0;
  }
  /// To be called often; returns the seconds since the last call.
  double look() {
    const double now = clock_();
    const double gap = now - std::exchange(lastLook_, now);
    longestGap_ = std::max(longestGap_, gap);
    if (interval_ > 0.0 && now - lastSign_ >= interval_) {
      lastSign_ = now;
      job_.send(0, static_cast<int>(RankMessage::alive), {});
    }
    return gap;
  }
  bool wasInterrupted() const { return longestGap_ >= kLongGap; }
  /// Whether the master may have given the set to another worker.
  bool mayBeTakenForLost() const { return limit_ > 0.0 && longestGap_ >= 0.5 * limit_; }

 private:
  static constexpr double kLongestInterval = 10.0;

  Job& job_;
  Clock clock_;
  double interval_;  ///< s; 0: no signs
  double limit_;     ///< s; 0: none
  double lastLook_ = 0.0;
  double lastSign_ = 0.0;
  double longestGap_ = 0.0;
};

}  // namespace mirevo
