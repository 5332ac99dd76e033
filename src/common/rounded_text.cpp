#include "common/rounded_text.h"

#include <cmath>

#include <fmt/core.h>

namespace mirevo {

std::string roundedText(double value, int digits) {
  constexpr double kLongest = 1.0e15;  // digits in a row are not read behind that
  const double size = std::abs(value);
  const bool isWhole = size >= std::pow(10.0, digits) - 0.5 && size < kLongest;
  return isWhole ? fmt::format("{:.0f}", value) : fmt::format("{:.{}g}", value, digits);
}

}  // namespace mirevo
