// Any text as the arguments of a batch: words, or a reason; words in quotes are split into the same words again.

#include <cstdint>
#include <string_view>

#include "platform/processes/argument_text.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::string reason;
  const auto words = mirevo::splitArguments({reinterpret_cast<const char*>(data), size}, reason);
  require(words.has_value() == reason.empty());
  if (!words) return 0;
  std::string quoted;
  for (const std::string& word : *words) {
    quoted += " '";
    for (const char c : word) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
    quoted += '\'';
  }
  require(mirevo::splitArguments(quoted, reason) == words);
  return 0;
}
