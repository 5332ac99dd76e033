#pragma once

#include <optional>
#include <string>

namespace mirevo {

/// Width of the widest field into which a value is written; the rest of a wider placeholder is blank.
inline constexpr int kMaximumValueWidth = 20;

/// How a value is written into its field.
enum class ValueForm {
  cut,      ///< in the first 20 characters, digits that do not fit being cut off
  rounded,  ///< with as many digits as the whole field has room for, the last one rounded, always with a decimal point
  whole     ///< an integer without a decimal point, or as `rounded` where it is none or does not fit
};

/// The characters of a parameter file that a placeholder leaves to its value.
struct ValueField {
  int width = 0;  ///< delimiters included; 0: there is none
  ValueForm form = ValueForm::cut;

  // A width is a field of the form that most templates have.
  // NOLINTNEXTLINE(google-explicit-constructor)
  ValueField(int width_ = 0, ValueForm form_ = ValueForm::cut) : width(width_), form(form_) {}
  bool operator==(const ValueField&) const = default;
};

/// The text of a value for a field. Returns exactly as many characters as that is wide, the number on the right: of the
/// form `cut` on the right of the first min(width, 20) characters. There a value whose exponent needs three digits
/// becomes "*" followed by blanks; so does in any form one that is not a number, and in the other forms one of which
/// the field has no room for a digit.
std::string FormatValueForPlaceholder(double value, ValueField field);

/// Whether the text of a value in a field of the form `cut` is a number and not "*", which does not depend on the
/// width.
bool isWritable(double value);

/// The value that a model reads from the field; empty if that holds no number.
std::optional<double> valueAsWritten(double value, ValueField field);

}  // namespace mirevo
