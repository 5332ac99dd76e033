#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// The units of a CF time variable: "hours since 1990-01-01 00:00".
struct TimeUnits {
  double secondsPerUnit = 1.0;
  std::int64_t originSecond = 0;  ///< as secondNumber() counts
};

/// Reads `days|hours|minutes|seconds since DATE` (singular and the usual abbreviations too). The date's month, day and
/// hour may have one digit; a time zone is accepted where it is UTC. Under the `standard` calendar (also named
/// `gregorian`, and meant where none is given) an origin before 1582-10-15 is one of the Julian calendar. Nothing, with
/// the reason, for anything else and for every calendar but `standard`, `gregorian` and `proleptic_gregorian`.
std::optional<TimeUnits> parseTimeUnits(std::string_view units, std::string_view calendar, std::string& reason);

}  // namespace mirevo
