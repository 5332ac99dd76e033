#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// The units of a CF time variable: "hours since 1990-01-01 00:00".
struct TimeUnits {
  double secondsPerUnit = 1.0;
  std::int64_t originSecond = 0;  ///< a secondNumber()
};

/// Reads `days|hours|minutes|seconds since DATE` (singular and the usual abbreviations too). The date's month, day and
/// hour may have one digit; a time zone is accepted if it is UTC. In the `standard` calendar (also called `gregorian`,
/// and the default) an origin before 1582-10-15 is a date of the Julian calendar. Empty, with the reason, for anything
/// else and for calendars other than `standard`, `gregorian` and `proleptic_gregorian`.
std::optional<TimeUnits> parseTimeUnits(std::string_view units, std::string_view calendar, std::string& reason);

}  // namespace mirevo
