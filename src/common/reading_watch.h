#pragma once

#include <functional>
#include <string>
#include <utility>

namespace mirevo {

/// Seconds that the reading of a file may take where nothing else limits it.
inline constexpr double kLongestReading = 600.0;

/// Ends the reading of files that a model wrote, and that may be damaged: after some time, or when something else asks
/// for it. Outside of a period between begin() and end() nothing is limited.
class ReadingWatch final {
 public:
  /// Reading may go on for `seconds`, of which `limit` tells in messages: "the 5 seconds of its limit". `look`, if
  /// there is one, is called about ten times a second while files are read, and may throw to end it.
  void begin(double seconds, std::string limit, std::function<void()> look = {});
  void end() { *this = {}; }
  bool hasBegun() const { return hasBegun_; }

  /// To be called often while a file is read. Whether the time is over.
  bool isOver();
  double secondsLeft() const;
  /// "reading it took longer than the 5 seconds of its limit"
  std::string reason() const { return "reading it took longer than " + limit_; }

 private:
  bool hasBegun_ = false;
  double deadline_ = 0.0;  ///< by runTimeClock()
  double nextLook_ = 0.0;
  std::string limit_;
  std::function<void()> look_;
};

}  // namespace mirevo
