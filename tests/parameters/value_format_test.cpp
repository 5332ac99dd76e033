#include "parameters/value_format.h"

#include <cmath>
#include <limits>
#include <random>

#include <gtest/gtest.h>

#include "common/text.h"

namespace mirevo {
namespace {

TEST(FormatValueForPlaceholder, WritesByHandComputedTexts) {
  const struct {
    double value;
    int width;
    const char* expected;
  } cases[] = {
      // Zero, whole numbers, the trimming of zeros and of the point.
      {0.0, 11, "          0"},
      {-0.0, 3, "  0"},
      {12, 11, "         12"},
      {1000, 11, "       1000"},
      {-12, 5, "  -12"},
      {2.5, 11, "        2.5"},
      {1, 2, " 1"},
      // Digits that do not fit are cut, not rounded; a point may stay last.
      {0.999999, 11, "9.99999E-01"},
      {1.23456789, 5, "1.234"},
      {1234.9, 5, "1234."},
      {1999.9, 4, "E+03"},
      {-998.76, 5, "-998."},
      {-9998.5, 5, "-9998"},
      // The limits 10^(w-1) - 1 and 1.
      {99998, 6, " 99998"},
      {99999, 6, "9.E+04"},
      {100000, 6, "1.E+05"},
      {1.0, 6, "     1"},
      {0.5, 6, "5.E-01"},
      {0.5, 5, "5E-01"},
      {0.25, 6, "2.E-01"},
      {0.25, 8, " 2.5E-01"},
      // In single precision 1e8 - 1 is 1e8, so that 99999999.5 is still below the limit of nine columns.
      {99999999.5, 9, "99999999."},
      {100000000.0, 9, "   1.E+08"},
      // Exponent form: one digit before the point, as many behind it as fit.
      {123456.789, 6, "1.E+05"},
      {1234567.89, 7, "1.2E+06"},
      {-1234567.89, 7, "-1.E+06"},
      {-123456.789, 7, "-123456"},
      {1.5e-35, 11, "    1.5E-35"},
      {1e-5, 11, "     1.E-05"},
      {1.0 / 3.0, 20, "3.33333333333333E-01"},
      {-1.0 / 3.0, 20, "-3.3333333333333E-01"},
      {9.99999999999999e99, 20, "9.99999999999999E+99"},
      // Three digits in the exponent do not fit the form; rounding may bring them about.
      {1e100, 8, "*       "},
      {9.999999999999999e99, 8, "*       "},
      {-1e-100, 8, "*       "},
      {5e-324, 8, "*       "},
      {std::numeric_limits<double>::infinity(), 4, "*   "},
      {std::numeric_limits<double>::quiet_NaN(), 4, "*   "},
      // Wide fields.
      {12, 23, "                  12   "},
      {1e100, 22, "*                     "},
      {0.5, 25, "              5.E-01     "},
      {1e18, 20, " 1000000000000000000"},
      {9.5e18, 20, " 9500000000000000000"},
      // A sign without a column left for it: the exponent form, as the fixed one would lose a digit.
      {-9.5e18, 20, "            -9.5E+18"},
      {-1.0000000002e14, 15, "-1.00000000E+14"},
      {1.0000000002e14, 15, "100000000020000"},
      // Too narrow for an exponent part: unreadable, which the setup warns of.
      {0.5, 3, "E-0"},
      {0.5, 1, "E"},
      {5, 0, ""},
  };
  for (const auto& [value, width, expected] : cases) {
    EXPECT_EQ(FormatValueForPlaceholder(value, width), expected) << value << " in " << width;
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
