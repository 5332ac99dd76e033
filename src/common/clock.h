#pragma once

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// The run-time clock: seconds from an arbitrary origin, never running backwards.
double runTimeClock();

/// The system's local date and time, "2026-11-21 04:10:09": for people; no result depends on it.
std::string dateAndTimeNow();

/// The same of a moment on the system's clock.
std::string dateAndTimeOf(std::time_t moment);

/// That of now with the zone's difference from universal time, "2026-11-21 04:10:09 +0100", which means the same on
/// other machines.
std::string dateAndTimeWithZone();

/// Takes what dateAndTimeWithZone() says off the front of `text`: seconds since 1970-01-01 UTC. Nothing, and nothing
/// taken, where `text` begins otherwise.
std::optional<double> takeDateAndTimeWithZone(std::string_view& text);

/// The name of this machine; empty when it has none.
std::string hostName();

}  // namespace mirevo
