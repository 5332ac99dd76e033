#include "platform/series/printed_units.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <limits>
#include <optional>
#include <string_view>

namespace mirevo {

namespace {

/// Digits that tell one number of 32 bits from the next in some decades, and in all of them.
constexpr int kFewSingleDigits = 8;
constexpr int kSingleDigits = 9;

/// The number that the text of a number of 32 bits stands for, with this many digits or with as few as tell it from
/// others.
double readAgain(float single, std::optional<int> digits) {
  char text[64];
  const auto end =
      digits ? std::to_chars(std::begin(text), std::end(text), single, std::chars_format::scientific, *digits - 1).ptr
             : std::to_chars(std::begin(text), std::end(text), single).ptr;
  double value = 0.0;
  std::from_chars(std::begin(text), end, value);
  return value;
}

/// Whether all values are texts of numbers of 32 bits with this many digits, or the shortest ones.
bool areTextsOfSingles(std::span<const double> values, int digits) {
  return std::all_of(values.begin(), values.end(), [digits](double value) {
    if (!std::isfinite(value)) return true;
    const auto single = static_cast<float>(value);
    return readAgain(single, digits) == value || readAgain(single, std::nullopt) == value;
  });
}

}  // namespace

std::vector<double> printedUnits(std::span<const double> values) {
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
  const bool isTextOfSingles =
      mostDigits >= kFewSingleDigits && mostDigits <= kSingleDigits && areTextsOfSingles(values, mostDigits);
  if ((isSingle && mostDigits > kSingleDigits) || isTextOfSingles) return singleUnits(values);
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
