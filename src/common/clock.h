#pragma once

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// A monotonic clock: seconds from an arbitrary origin.
double runTimeClock();

/// The system's local date and time, "2026-11-21 04:10:09": for people; no result depends on it.
std::string dateAndTimeNow();

/// The same for a moment on the system's clock.
std::string dateAndTimeOf(std::time_t moment);

/// The local date and time with the offset of the time zone from UTC, "2026-11-21 04:10:09 +0100", which means the same
/// on other machines.
std::string dateAndTimeWithZone();

/// Takes a date and time in the form of dateAndTimeWithZone() off the front of `text` and returns it in seconds since
/// 1970-01-01 UTC. Empty, with `text` unchanged, where `text` begins otherwise.
std::optional<double> takeDateAndTimeWithZone(std::string_view& text);

/// The name of this machine; empty when it has none.
std::string hostName();

}  // namespace mirevo
