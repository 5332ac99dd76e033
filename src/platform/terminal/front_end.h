#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// The kind of a message to the user, with the numbers that message boxes give their icons.
enum class MessageType { error = 16, warning = 48, information = 64 };

/// Whether a message was shown; `ok` has the number of a message box's button.
enum class MessageResult { notShown = 0, ok = 1 };

/// Shows a message to the user: "title: text" on standard error, on a terminal with the title in the colour of the
/// message's type. No box is opened, whatever the value of `G48`, so nobody has to answer. A message that a terminal or
/// pipe does not accept within a second is lost.
MessageResult showMessage(std::string_view text, std::string_view title = {}, MessageType type = MessageType::error);

/// Writes the answer to a question of the command line to standard output. Returns the exit code: 1, and a message, if
/// that fails.
int writeAnswer(std::string_view text);

/// Whether nobody is watching: BUILDMODE is "NIGHT".
bool isUnattended();

/// The name of the program's file without folder and ending: the title of messages.
std::string programName();

/// Ends the process with this exit code, under a viewer or not.
[[noreturn]] void qmonExit(int exitCode);

}  // namespace mirevo
