#include "platform/terminal/front_end.h"

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <unistd.h>

#include "common/descriptor_output.h"
#include "common/utf8.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/terminal.h"

namespace mirevo {
namespace {

constexpr int kPatienceMilliseconds = 1000;

/// The ECMA-48 control sequence for red or yellow, or none.
std::string_view colourOf(MessageType type) {
  if (type == MessageType::error) return "\x1b[31m";
  return type == MessageType::warning ? "\x1b[33m" : "";
}

}  // namespace

MessageResult showMessage(std::string_view text, std::string_view title, MessageType type) {
  std::string shown = title.empty() ? programName() : std::string(title);
  const std::string_view colour = colourOf(type);
  if (!colour.empty() && ::isatty(STDERR_FILENO) == 1 && wantsColour()) {
    shown.insert(0, colour);
    shown += "\x1b[0m";
  }
  shown.append(": ").append(withValidUtf8(text)).append("\n");  // names and contents of files may be in any encoding
  if (signalState.liveLineDescriptor.exchange(-1) >= 0) shown.insert(0, kClearLine);
  return writeWhole(STDERR_FILENO, shown, kPatienceMilliseconds).error == 0 ? MessageResult::ok
                                                                            : MessageResult::notShown;
}

int writeAnswer(std::string_view text) {
  const OutputResult result = writeWhole(STDOUT_FILENO, text);
  if (result.error != 0) showMessage(std::string("Unable to write the answer: ") + std::strerror(result.error));
  return result.error == 0 ? 0 : 1;
}

bool isUnattended() {
  const char* mode = std::getenv("BUILDMODE");
  return mode != nullptr && std::string_view(mode) == "NIGHT";
}

std::string programName() {
  return std::filesystem::path(::program_invocation_short_name).stem().string();
}

void qmonExit(int exitCode) {
  std::exit(exitCode);
}

}  // namespace mirevo
