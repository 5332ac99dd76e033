#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// What a message to the user is about, numbered as message boxes number their icons.
enum class MessageType { error = 16, question = 32, warning = 48, information = 64 };

/// What became of a message; `ok` has the number of a box's button.
enum class MessageResult { notShown = 0, ok = 1 };

/// Shows a message to the user: "title: text" on standard error, the title in the colour of its type where that is a
/// terminal. No box is opened with either value of `G48` (under `//qmon` standard error is the viewer's), so nobody has
/// to answer; nor is a terminal or pipe that takes nothing waited for longer than a moment: the message is then lost.
MessageResult showMessage(std::string_view text, std::string_view title = {}, MessageType type = MessageType::error);

/// Whether nobody is there to answer: BUILDMODE is "NIGHT".
bool isUnattended();

/// The base name of the program's file, without its ending: the title of messages.
std::string programName();

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
