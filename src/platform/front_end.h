#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// How the program talks to the person who started it; the value of `G48` in the environment.
enum class FrontEnd { win, qmon };

/// The front end that the environment names: "QMON" is the progress viewer's, everything else the plain one.
FrontEnd chosenFrontEnd();

/// File name of the running program without folder and ending: "Mirevo".
std::string programBaseName();

inline constexpr int kErrorIcon = 16;

/// Shows a message to the user: on standard error with either front end, as nothing in an unattended run may wait for a
/// person. A title other than the default, the program's name, is put before the text. Returns the answer, which is
/// always 1 ("OK"); `type` is carried for viewers that know icons.
int showMessage(std::string_view text, std::optional<std::string_view> title = std::nullopt, int type = kErrorIcon);

/// Ends the process with the exit code, whichever front end is active.
[[noreturn]] void qmonExit(int exitCode);

/// The run-time clock: seconds from an arbitrary origin, never running backwards.
double runTimeClock();

/// Local date and time of the system, "2026-11-21 04:10:09": for people, never for results.
std::string dateAndTimeNow();

}  // namespace mirevo
