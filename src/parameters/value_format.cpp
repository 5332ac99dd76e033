#include "parameters/value_format.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <optional>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// Characters of the exponent part, such as E+05.
constexpr std::size_t kExponentWidth = 4;
/// Instead of a value that cannot be written.
constexpr char kUnwritable = '*';

/// Deliberately in single precision: the limits between the two forms are 10^(w-1) - 1, rounded to single precision.
constexpr float kPowersOfTen[kMaximumValueWidth] = {1e0F,  1e1F,  1e2F,  1e3F,  1e4F,  1e5F,  1e6F,
                                                    1e7F,  1e8F,  1e9F,  1e10F, 1e11F, 1e12F, 1e13F,
                                                    1e14F, 1e15F, 1e16F, 1e17F, 1e18F, 1e19F};

void trimZeros(std::string& text) {
  const auto last = text.find_last_not_of('0');
  text.resize(last == std::string::npos ? 0 : last + 1);
}

/// The value with as many decimals as 20 characters hold, always with its decimal point, without trailing zeros and
/// without a trailing point; empty when the digits before the point do not fit.
std::optional<std::string> fixedForm(double value, int width) {
  // Below 1e19 the digits before the point fit 64 bits; rounding may add one.
  const std::size_t digits = std::to_string(static_cast<std::uint64_t>(std::abs(value))).size();
  const int integerWidth = static_cast<int>(digits) + (value < 0 ? 1 : 0);
  int decimals = std::max(0, kMaximumValueWidth - integerWidth - 1);
  std::string text = fmt::format("{:#.{}f}", value, decimals);
  while (static_cast<int>(text.size()) > kMaximumValueWidth && decimals > 0) {
    text = fmt::format("{:#.{}f}", value, --decimals);
  }
  if (text.size() > kMaximumValueWidth || static_cast<int>(text.find('.')) > width) return std::nullopt;
  trimZeros(text);
  if (text.back() == '.') text.pop_back();
  return text;
}

/// The mantissa with as many decimals as 20 characters hold, cut to what the width leaves beside the exponent part;
/// empty when the exponent needs three digits.
std::optional<std::string> exponentForm(double value, std::size_t width) {
  const int decimals = kMaximumValueWidth - static_cast<int>(kExponentWidth) - (value < 0 ? 3 : 2);
  std::string text = fmt::format("{:.{}E}", value, decimals);
  if (text.size() != static_cast<std::size_t>(kMaximumValueWidth)) return std::nullopt;
  const std::string exponent = text.substr(text.size() - kExponentWidth);
  text.resize(text.size() - kExponentWidth);
  trimZeros(text);
  text.resize(std::min(text.size(), width > kExponentWidth ? width - kExponentWidth : 0));
  return text + exponent;
}

/// The fewest significant digits that tell the value from all others.
int digitsOf(double value) {
  constexpr int kEnough = 17;
  int digits = 1;
  while (digits < kEnough && parseReal(fmt::format("{:.{}e}", value, digits - 1)) != value) ++digits;
  return digits;
}

/// The value with that many significant digits, in the fixed form or, where that is longer than `width`, in the
/// shortest one with an exponent; empty if neither fits. A model that reads fixed columns would misread a number
/// without a point.
std::optional<std::string> roundedForm(double value, int digits, std::size_t width) {
  const std::string text = fmt::format("{:.{}e}", std::abs(value), digits - 1);
  const std::size_t mark = text.find('e');
  const int exponent = parseInteger(text.substr(mark + 1)).value();
  std::string figures = text.substr(0, 1);
  if (mark > 2) figures += text.substr(2, mark - 2);
  const std::string sign = value < 0.0 ? "-" : "";

  constexpr int kLongestFixed = 40;  // of zeros on either side
  if (std::abs(exponent) < kLongestFixed) {
    std::string whole;
    std::string part;
    if (exponent < 0) {
      part = std::string(static_cast<std::size_t>(-exponent - 1), '0') + figures;
    } else {
      const auto places = static_cast<std::size_t>(exponent) + 1;
      whole = figures.substr(0, places);
      whole.resize(places, '0');
      if (figures.size() > places) part = figures.substr(places);
    }
    for (const std::string& fixed : {fmt::format("{}.{}", whole.empty() ? "0" : whole, part.empty() ? "0" : part),
                                     fmt::format("{}.{}", whole, part)}) {
      if (sign.size() + fixed.size() <= width) return sign + fixed;
    }
  }
  const std::string part = figures.size() > 1 ? figures.substr(1) : std::string();
  for (const std::string& power :
       {fmt::format("E{}{:02}", exponent < 0 ? '-' : '+', std::abs(exponent)), fmt::format("E{}", exponent)}) {
    const std::string scaled = fmt::format("{}{}.{}{}", sign, figures.front(), part, power);
    if (scaled.size() <= width) return scaled;
  }
  return std::nullopt;
}

std::string formatRounded(double value, std::size_t width, bool isWhole) {
  std::optional<std::string> text;
  if (std::isfinite(value) && isWhole && value == std::trunc(value)) {
    text = fmt::format("{:.0f}", value + 0.0);  // no "-0"
    if (text->size() > width) text.reset();
  }
  if (std::isfinite(value)) {
    for (int digits = digitsOf(value); digits > 0 && !text; --digits) text = roundedForm(value, digits, width);
  }
  std::string field(width, ' ');
  if (text) {
    std::copy(text->begin(), text->end(), field.end() - std::ssize(*text));
  } else {
    field.front() = kUnwritable;
  }
  return field;
}

}  // namespace

std::string FormatValueForPlaceholder(double value, ValueField placeholder) {
  const int width = placeholder.width;
  if (width <= 0) return {};
  if (placeholder.form != ValueForm::cut) {
    return formatRounded(value, static_cast<std::size_t>(width), placeholder.form == ValueForm::whole);
  }
  std::string field(static_cast<std::size_t>(width), ' ');
  const int w = std::min(width, kMaximumValueWidth);
  const double upper = static_cast<double>(kPowersOfTen[w - 1] - 1.0F);
  const double magnitude = std::abs(value);

  std::optional<std::string> text;
  if (value == 0.0) {
    text = "0";
  } else if (std::isfinite(value)) {
    // Near the limits, where the single-precision limit is above the power of ten or a sign takes a column, the fixed
    // form could lose a digit before the point and be wrong by a factor of ten; it is then empty.
    if (magnitude >= 1.0 && magnitude < upper) text = fixedForm(value, w);
    if (!text) text = exponentForm(value, static_cast<std::size_t>(w));
  }
  if (!text) {
    field[0] = kUnwritable;
    return field;
  }
  text->resize(std::min(text->size(), static_cast<std::size_t>(w)));
  std::copy(text->begin(), text->end(), field.begin() + (w - static_cast<std::ptrdiff_t>(text->size())));
  return field;
}

bool isWritable(double value) {
  return FormatValueForPlaceholder(value, kMaximumValueWidth).front() != kUnwritable;
}

std::optional<double> valueAsWritten(double value, ValueField field) {
  return parseReal(FormatValueForPlaceholder(value, field));
}

}  // namespace mirevo
