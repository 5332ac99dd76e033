#include "platform/series/printed_units.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>
#include <string_view>

namespace mirevo {

std::vector<double> printedUnits(std::span<const double> values) {
  constexpr int kSingleDigits = 9;
  int mostDigits = 0;
  int lowestPlace = std::numeric_limits<int>::max();
  bool isSingle = true;
  for (const double value : values) {
    if (!std::isfinite(value) || value == 0.0) continue;
    char text[32];
    const std::string_view shortest(
        text, std::to_chars(std::begin(text), std::end(text), std::abs(value), std::chars_format::scientific).ptr);
    const std::size_t mark = shortest.find('e');
    const int digits = static_cast<int>(mark) - (mark > 1 ? 1 : 0);
    const int exponent = static_cast<int>(std::floor(std::log10(std::abs(value))));
    mostDigits = std::max(mostDigits, digits);
    lowestPlace = std::min(lowestPlace, exponent - digits + 1);
    isSingle = isSingle && static_cast<double>(static_cast<float>(value)) == value;
  }
  if (isSingle && mostDigits > kSingleDigits) return singleUnits(values);
  std::vector<double> units;
  for (const double value : values) {
    const double size = std::abs(value);
    if (!std::isfinite(value)) {
      units.push_back(std::numeric_limits<double>::quiet_NaN());
    } else if (mostDigits == 0) {
      units.push_back(1.0);
    } else {
      const double ofDigits = size > 0.0 ? std::pow(10.0, std::floor(std::log10(size)) - mostDigits + 1) : 0.0;
      units.push_back(std::max(std::pow(10.0, lowestPlace), ofDigits));
    }
  }
  return units;
}

std::vector<double> singleUnits(std::span<const double> values) {
  std::vector<double> units;
  for (const double value : values) {
    units.push_back(std::abs(value) * static_cast<double>(std::numeric_limits<float>::epsilon()));
  }
  return units;
}

}  // namespace mirevo
