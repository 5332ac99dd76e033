#include "parameters/value_format.h"

#include <cmath>
#include <cstdlib>
#include <random>
#include <sstream>
#include <string>
#include <tuple>

#include <fmt/format.h>
#include <gtest/gtest.h>

#include "common/text.h"

namespace mirevo {
namespace {

TEST(FormatValueForPlaceholder, WritesByHandComputedTexts) {
  // "value in width = 'text'", some on a line.
  std::istringstream cases(R"(
      # Zero, whole numbers, the trimming of zeros and of the point.
      0.0 in 11 = '          0'; -0.0 in 3 = '  0'; 12 in 11 = '         12'; 1000 in 11 = '       1000'
      -12 in 5 = '  -12'; 2.5 in 11 = '        2.5'; 1 in 2 = ' 1'
      # Digits that do not fit are cut, not rounded; a point may stay last.
      0.999999 in 11 = '9.99999E-01'; 1.23456789 in 5 = '1.234'; 1234.9 in 5 = '1234.'; 1999.9 in 4 = 'E+03'
      -998.76 in 5 = '-998.'; -9998.5 in 5 = '-9998'
      # The limits 10^(w-1) - 1 and 1.
      99998 in 6 = ' 99998'; 99999 in 6 = '9.E+04'; 100000 in 6 = '1.E+05'; 1.0 in 6 = '     1'; 0.5 in 6 = '5.E-01'
      0.5 in 5 = '5E-01'; 0.25 in 6 = '2.E-01'; 0.25 in 8 = ' 2.5E-01'
      # In single precision 1e8 - 1 is 1e8, so that 99999999.5 is still below the limit of nine columns.
      99999999.5 in 9 = '99999999.'; 100000000.0 in 9 = '   1.E+08'
      # Exponent form: one digit before the point, as many behind it as fit.
      123456.789 in 6 = '1.E+05'; 1234567.89 in 7 = '1.2E+06'; -1234567.89 in 7 = '-1.E+06'
      -123456.789 in 7 = '-123456'; 1.5e-35 in 11 = '    1.5E-35'; 1e-5 in 11 = '     1.E-05'
      0.3333333333333333 in 20 = '3.33333333333333E-01'; -0.3333333333333333 in 20 = '-3.3333333333333E-01'
      9.99999999999999e99 in 20 = '9.99999999999999E+99'
      # Three digits in the exponent do not fit the form; rounding may bring them about.
      1e100 in 8 = '*       '; 9.999999999999999e99 in 8 = '*       '; -1e-100 in 8 = '*       '
      5e-324 in 8 = '*       '; inf in 4 = '*   '; nan in 4 = '*   '
      # Wide fields.
      12 in 23 = '                  12   '; 1e100 in 22 = '*                     '
      0.5 in 25 = '              5.E-01     '; 1e18 in 20 = ' 1000000000000000000'
      9.5e18 in 20 = ' 9500000000000000000'
      # A sign without a column left for it: the exponent form, as the fixed one would lose a digit.
      -9.5e18 in 20 = '            -9.5E+18'; -1.0000000002e14 in 15 = '-1.00000000E+14'
      1.0000000002e14 in 15 = '100000000020000'
      # Too narrow for an exponent part: unreadable, which the setup warns of.
      0.5 in 3 = 'E-0'; 0.5 in 1 = 'E'; 5 in 0 = '')");
  int count = 0;
  for (std::string line; std::getline(cases, line);) {
    std::istringstream parts(line.find('#') == std::string::npos ? line : "");
    for (std::string part; std::getline(parts, part, ';'); ++count) {
      const auto text = part.find(" = '");
      ASSERT_NE(text, std::string::npos) << part;
      const int width = std::stoi(part.substr(part.find(" in ") + 4));
      const std::string written = FormatValueForPlaceholder(std::strtod(part.c_str(), nullptr), width);
      EXPECT_EQ(fmt::format(" = '{}'", written), part.substr(text));
    }
  }
  EXPECT_EQ(count, 49);
}

TEST(FormatValueForPlaceholder, RoundsToWhatTheWholeFieldHolds) {
  const std::tuple<double, int, const char*> cases[] = {
      {0.0, 5, "  0.0"},
      {0.0, 2, "0."},
      {12.0, 8, "    12.0"},
      {12.0, 3, "12."},
      {-12.0, 3, "*  "},
      {2.0 / 3.0, 5, ".6667"},
      {2.0 / 3.0, 4, ".667"},
      {-2.0 / 3.0, 2, "* "},
      {1.0 / 3.0, 24, "      0.3333333333333333"},
      {0.1, 24, "                     0.1"},
      {1234.5678, 6, "1234.6"},
      {1999.96, 6, "2000.0"},
      {1999.96, 5, "2000."},
      {2.5e-10, 6, "3.E-10"},
      {123456789.0, 7, "1.235E8"},
      {1.23456e-120, 12, "1.23456E-120"},
      {1.23456e-120, 9, "1.23E-120"},
      {-1.7976931348623157e308, 24, "-1.7976931348623157E+308"},
      {std::nan(""), 4, "*   "},
      {HUGE_VAL, 4, "*   "},
  };
  for (const auto& [value, width, expected] : cases) {
    const std::string written = FormatValueForPlaceholder(value, {width, ValueForm::rounded});
    EXPECT_EQ(written, expected) << value;
  }
}

TEST(FormatValueForPlaceholder, WritesAnIntegerWithoutAPointIfThereIsRoom) {
  const std::tuple<double, int, const char*> cases[] = {{12.0, 4, "  12"},   {-0.0, 3, "  0"},
                                                        {-7.0, 2, "-7"},     {12.5, 6, "  12.5"},
                                                        {1e15, 6, "1.E+15"}, {std::nan(""), 2, "* "}};
  for (const auto& [value, width, expected] : cases) {
    EXPECT_EQ(FormatValueForPlaceholder(value, {width, ValueForm::whole}), expected) << value;
  }
}

TEST(FormatValueForPlaceholder, LosesNoMoreThanHalfOfTheLastDigit) {
  std::mt19937_64 random(7);
  std::uniform_real_distribution<double> exponents(-12.0, 12.0);
  for (int i = 0; i < 2000; ++i) {
    const double value = (i % 2 == 0 ? 1.0 : -1.0) * std::pow(10.0, exponents(random));
    EXPECT_EQ(valueAsWritten(value, {26, ValueForm::rounded}), value);
    for (const int width : {10, 14}) {
      const auto read = valueAsWritten(value, {width, ValueForm::rounded});
      ASSERT_TRUE(read) << value;
      // At worst sign, digit, point and exponent part (1.2E-12) take the room that digits could have.
      EXPECT_LE(std::abs(*read - value), 0.5 * std::pow(10.0, 7 - width) * std::abs(value) * 1.001) << value;
    }
  }
}

TEST(FormatValueForPlaceholder, ReadsBackWithinTheWidth) {
  std::mt19937_64 random(20);
  std::uniform_real_distribution<double> mantissa(1.0, 10.0);
  std::uniform_int_distribution<int> decade(-98, 97);
  std::uniform_int_distribution<int> smallDecade(0, 19);
  for (int i = 0; i < 60000; ++i) {
    const double magnitude = mantissa(random) * std::pow(10.0, i % 2 == 0 ? decade(random) : smallDecade(random));
    const double value = i % 3 == 0 ? -magnitude : magnitude;
    for (int width = 3; width <= 25; ++width) {
      const std::string text = FormatValueForPlaceholder(value, width);
      ASSERT_EQ(text.size(), static_cast<std::size_t>(width));
      const int w = std::min(width, kMaximumValueWidth);
      const int sign = value < 0 ? 1 : 0;
      const bool exponent = text.find('E') != std::string::npos;
      if (exponent && w < 5 + sign) continue;  // no room for a digit
      const auto read = parseReal(text);
      ASSERT_TRUE(read) << text;
      // One unit of the last digit that the columns hold, and the rounding of the widest form.
      const int digits = exponent ? std::max(1, w - 4 - sign - 1) : w - sign - 1;
      const double unit = exponent ? std::pow(10.0, std::floor(std::log10(magnitude)) - (digits - 1))
                                   : std::pow(10.0, std::floor(std::log10(magnitude)) + 1 - digits);
      ASSERT_LE(std::abs(*read - value), unit * 1.0001 + magnitude * 1e-15) << value << " as \"" << text << '"';
    }
  }
}

}  // namespace
}  // namespace mirevo
