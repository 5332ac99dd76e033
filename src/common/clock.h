#pragma once

#include <string>

namespace mirevo {

/// The run-time clock: seconds from an arbitrary origin, never running backwards.
double runTimeClock();

/// Local date and time of the system, "2026-11-21 04:10:09": for people, never for results.
std::string dateAndTimeNow();

/// The same with what the zone adds to universal time, "2026-11-21 04:10:09 +0100": for programs on other machines,
/// too.
std::string dateAndTimeWithZone();

/// The name of this machine; empty when it has none.
std::string hostName();

}  // namespace mirevo
