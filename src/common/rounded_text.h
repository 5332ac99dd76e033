#pragma once

#include <string>

namespace mirevo {

/// The value with so many significant digits for people, and as a whole number where it has more before the point:
/// "0.0123", "12.3", "1230" with three.
std::string roundedText(double value, int digits);

}  // namespace mirevo
