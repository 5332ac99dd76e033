#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The number that marks missing values, of the comments of a text file.
class MissingMarks final {
 public:
  /// Of the comment without its sign, in this line; that text which is to be a number and is none, if so.
  std::optional<std::string_view> read(std::string_view comment, std::string_view sign, std::size_t line);
  /// NaN without a mark.
  float value() const { return value_; }
  /// Of comments that seem to mark missing values in another way, or a second time. Those numbers that are `marked` in
  /// any way are none.
  std::vector<std::string> doubts(const std::string& sourceName, std::span<const double> marked = {}) const;

 private:
  struct Doubt {
    std::size_t line = 0;
    std::string text;
    std::optional<float> marker;  ///< of a comment; no doubt if it is the value that marks missing ones
  };

  float value_ = std::numeric_limits<float>::quiet_NaN();
  std::size_t line_ = 0;  ///< of the last mark, from 1; 0: none
  std::vector<Doubt> doubts_;
};

/// Whether a column with this heading seems to hold the time of day: "Hour", "HH:MM", "time (UTC)".
bool isHeadingOfHours(std::string_view heading);

/// Whether a cell holds a time of day: "9:30", "09:30:00".
bool isTimeOfDay(std::string_view cell);

/// Whether all times are at midnight.
bool areDates(std::int64_t startSecond, std::span<const double> days);

}  // namespace mirevo
