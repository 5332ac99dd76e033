// Any two texts, the second behind a byte 0, as the settings of an earlier run and of this one: they are compared
// without a crash, and what was read is written and read back the same.

#include <cstdint>
#include <string_view>

#include "require.h"
#include "run/results/restart_settings.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const std::size_t middle = std::min(text.find('\0'), size);
  const auto then = mirevo::parseRestartSettings(text.substr(0, middle));
  if (!then) return 0;
  const std::string written = mirevo::formatRestartSettings(*then);
  const auto again = mirevo::parseRestartSettings(written);
  require(again && mirevo::formatRestartSettings(*again) == written);
  require(mirevo::searchBudget(*again) == mirevo::searchBudget(*then));
  const auto now = mirevo::parseRestartSettings(text.substr(std::min(middle + 1, size)));
  if (!now) return 0;
  for (const std::string& change : mirevo::changedSettings(*then, *now)) require(!change.empty());
  return 0;
}
