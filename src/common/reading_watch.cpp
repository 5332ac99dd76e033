#include "common/reading_watch.h"

#include <limits>

#include "common/clock.h"

namespace mirevo {
namespace {

constexpr double kLookSeconds = 0.1;

}  // namespace

void ReadingWatch::begin(double seconds, std::string limit, std::function<void()> look) {
  const double now = runTimeClock();
  hasBegun_ = true;
  deadline_ = now + seconds;
  nextLook_ = now + kLookSeconds;
  limit_ = std::move(limit);
  look_ = std::move(look);
}

bool ReadingWatch::isOver() {
  if (!hasBegun_) return false;
  const double now = runTimeClock();
  if (look_ && now >= nextLook_) {
    nextLook_ = now + kLookSeconds;
    look_();
  }
  return now > deadline_;
}

double ReadingWatch::secondsLeft() const {
  return hasBegun_ ? deadline_ - runTimeClock() : std::numeric_limits<double>::infinity();
}

}  // namespace mirevo
