#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// A time as files write it, with the offset of its zone from UTC where it has one.
struct ZonedTime {
  std::int64_t second = 0;  ///< secondNumber() in its zone, rounded to whole seconds
  std::optional<int> offsetMinutes = {};
};

/// A date, or a date and time of ISO 8601: "2012-05-12T00:15:00.000-05:00", "2012-05-12 00:15Z". Empty where `text` is
/// anything else.
std::optional<ZonedTime> parseZonedTime(std::string_view text);

/// The offset that is meant by one of the time-zone codes of the USGS, "EST"; empty for any other.
std::optional<int> offsetOfZone(std::string_view code);

/// The zone in which the times of a file are read. All are left as they are written if they have the same offset, or
/// none. Where the offset changes, as with daylight saving time, all are put on the smallest that occurs, which is
/// standard time: the axis would otherwise have an hour twice.
class FileZone final {
 public:
  /// The time in UTC, or as it is where it has no offset; empty if another time of the file has one and this has not,
  /// or the other way round.
  std::optional<std::int64_t> take(const ZonedTime& time);
  /// What is to be added to all that take() has returned.
  std::int64_t shiftSeconds() const { return std::int64_t{smallest_.value_or(0)} * 60; }
  /// "its times change between UTC-05:00 and UTC-04:00, and are all read in UTC-05:00"; empty if they do not.
  std::string doubt() const;

 private:
  bool isFirst_ = true;
  std::optional<int> smallest_;
  std::optional<int> largest_;
};

}  // namespace mirevo
