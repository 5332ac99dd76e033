#pragma once

#include <cstddef>
#include <string_view>

namespace mirevo {

/// Whether a number goes on from the character before `at` to the one there: through its digits, or through its
/// exponent. Its sign in front of its first digit does not count. `point` is the decimal sign.
bool isInsideNumber(std::string_view line, std::size_t at, char point = '.');

/// The same with its sign.
bool isInsideSigned(std::string_view line, std::size_t at, char point = '.');

}  // namespace mirevo
