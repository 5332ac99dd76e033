#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// Shows a message to the user, under a title where one is given. It goes to standard error with either value of `G48`,
/// which under `//qmon` is the viewer's: nothing in an unattended run may wait for a person.
void showMessage(std::string_view text, std::string_view title = {});

/// Ends the process with the exit code, whichever front end is active.
[[noreturn]] void qmonExit(int exitCode);

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
