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

}  // namespace mirevo
