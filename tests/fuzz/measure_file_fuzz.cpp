// Any bytes as an output-measure file: no crash, finite numbers, and more needed numbers never refuse what fewer do
// not.

#include <cmath>
#include <cstdint>
#include <string_view>

#include "measures/measure_file.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  std::string reason;
  const auto file = mirevo::parseMeasureFile("m.txt", text, 1, reason);
  require(file.has_value() || reason.starts_with("m.txt:"));
  if (!file) return 0;
  const std::vector<double>& numbers = file->numbers;
  for (const double number : numbers) require(std::isfinite(number));
  const auto again = mirevo::parseMeasureFile("m.txt", text, numbers.size(), reason);
  require(again && again->numbers == numbers);
  const auto ended = mirevo::parseMeasureFile("m.txt", std::string(text) + "\n", 1, reason);
  require(ended && ended->numbers == numbers && ended->endsLine);
  return 0;
}
