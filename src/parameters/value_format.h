#pragma once

#include <optional>
#include <string>

namespace mirevo {

/// Width of the widest field into which a value is written; the rest of a wider placeholder is blank.
inline constexpr int kMaximumValueWidth = 20;

/// The text of a value for a placeholder of `width` characters (delimiters included): right-aligned in its first
/// min(width, 20) characters. Returns exactly `width` characters. Digits that do not fit are cut off, not rounded. A
/// value whose exponent needs three digits, and one that is not a number, becomes "*" followed by blanks.
std::string FormatValueForPlaceholder(double value, int width);

/// Whether the text of a value is a number and not "*", which does not depend on the width.
bool isWritable(double value);

/// The value that a model reads from a placeholder of this width; empty if that holds no number.
std::optional<double> valueAsWritten(double value, int width);

}  // namespace mirevo
