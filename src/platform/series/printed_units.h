#pragma once

#include <span>
#include <vector>

namespace mirevo {

/// The unit in which each of the values of an item is printed, judged by the digits of all: that of the last digit that
/// any of them has, or of the last of the most significant digits, whichever is larger; 1 where all
/// are 0. Where all values are texts of numbers of 32 bits, with 8, 9 or the fewest digits that tell them apart, or
/// such numbers themselves, it is singleUnits(). NaN for a value that is none.
std::vector<double> printedUnits(std::span<const double> values);

/// The unit in which numbers of 32 bits are stored: the spacing of each from the next.
std::vector<double> singleUnits(std::span<const double> values);

}  // namespace mirevo
