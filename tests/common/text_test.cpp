#include "common/text.h"

#include <cmath>
#include <limits>
#include <optional>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "common/take_text.h"

namespace mirevo {
namespace {

TEST(Text, ReadsRealsInEveryFormAndNothingElse) {
  const std::pair<const char*, double> numbers[] = {{"1", 1.0},        {" -2.5\t", -2.5},     {"+.5", 0.5},
                                                    {"1.", 1.0},       {"1.5E-035", 1.5e-35}, {"1.5d3", 1500.0},
                                                    {"-1D+2", -100.0}, {"1e-999", 0.0},       {"4.9e-324", 4.9e-324}};
  for (const auto& [text, value] : numbers) {
    EXPECT_EQ(parseReal(text), value) << text;
  }
  for (const char* text :
       {"1e999", "-1e999", "", "+", "+-1", "1 2", "0x10", "nan", "inf", "1e", "1,5", "1e5e5", "--1", "1d5d", "."}) {
    EXPECT_EQ(parseReal(text), std::nullopt) << text;
  }
  EXPECT_EQ(parseReal("0." + std::string(400, '0') + "1"), 0.0);
  EXPECT_EQ(parseReal("1" + std::string(400, '0')), std::nullopt);
}

TEST(Text, ReadsIntegersWithin32Bits) {
  for (const auto& [text, value] :
       {std::pair{"0", 0}, {"+7", 7}, {" -2147483648 ", std::numeric_limits<std::int32_t>::min()}}) {
    EXPECT_EQ(parseInteger(text), value) << text;
  }
  for (const char* text : {"2147483648", "1.0", "", "+-3", "1e3"}) EXPECT_EQ(parseInteger(text), std::nullopt) << text;
}

TEST(Text, WritesRealsThatReadBackAsTheSameBits) {
  for (const double value : {0.1, -1.0 / 3.0, 1e30, 5e-324, 1.7976931348623157e308, -0.0, 123456789.125}) {
    const auto back = parseReal(formatReal(value));
    ASSERT_TRUE(back.has_value()) << formatReal(value);
    EXPECT_EQ(*back, value);
    EXPECT_EQ(std::signbit(*back), std::signbit(value));
  }
  EXPECT_EQ(formatReal(std::nan("")), "NaN");
  EXPECT_EQ(formatReal(-std::numeric_limits<double>::infinity()), "-Inf");
}

TEST(Text, SuggestsTheNearestNameAndNoFarOne) {
  const std::vector<std::string> names = {"Initial_Value", "Lower_Bound", "Upper_Bound", "Title"};
  EXPECT_EQ(nearestName("Intial_Value", names), "Initial_Value");
  EXPECT_EQ(nearestName("upper_bound", names), "Upper_Bound");
  EXPECT_EQ(nearestName("Ttle", names), "Title");
  EXPECT_EQ(nearestName("Weight", names), std::nullopt);
  EXPECT_EQ(nearestName("", names), std::nullopt);
  const std::vector<std::string> letters = {"a", "b1"};
  EXPECT_EQ(nearestName("c", letters), std::nullopt) << "one edit from any letter";
  EXPECT_EQ(nearestName("A", letters), "a");
  EXPECT_EQ(nearestName("b", letters), "b1");
  const std::vector<std::string> operators = {"<", "<=", ">", ">="};
  EXPECT_EQ(nearestName("=<", operators), "<=") << "as near as <, and as long";
  EXPECT_EQ(nearestName("=>", operators), ">=");
}

TEST(Text, SplitsLinesAtEitherLineEnd) {
  using Lines = std::vector<std::string_view>;
  EXPECT_EQ(splitLines("a\r\nb\n\nc"), (Lines{"a", "b", "", "c"}));
  EXPECT_EQ(splitLines("a\n"), (Lines{"a"}));
  EXPECT_EQ(splitLines(""), Lines{});
}

TEST(Text, SplitsAtASeparatorIntoAtMostSoManyParts) {
  using Parts = std::vector<std::string_view>;
  EXPECT_EQ(splitAt("a\t\tb\t", '\t'), (Parts{"a", "", "b", ""}));
  EXPECT_EQ(splitAt("a\tb\tc", '\t', 2), (Parts{"a", "b\tc"}));
  EXPECT_EQ(splitAt("", '\t'), Parts{""});
}

TEST(Text, TakesNumbersOfSoManyDigitsOrNothing) {
  const std::tuple<const char*, std::size_t, std::size_t, std::optional<std::int64_t>, const char*> cases[] = {
      {"0087 OK", 1, 9, 87, " OK"},     {"2001-01", 4, 4, 2001, "-01"},
      {"20010", 2, 4, 2001, "0"},       {"201-01", 4, 4, std::nullopt, "201-01"},
      {"-5", 1, 9, std::nullopt, "-5"}, {"99999999999999999999", 1, 99, std::nullopt, "99999999999999999999"}};
  for (const auto& [text, least, most, number, rest] : cases) {
    std::string_view left = text;
    EXPECT_EQ(takeNumber(left, least, most), number) << text;
    EXPECT_EQ(left, rest);
  }
}

TEST(Text, TrimsAndReplacesNumbers) {
  EXPECT_EQ(trimTrailing("  a b \t\r"), "  a b");
  EXPECT_EQ(trim(" \n a b \t"), "a b");
  EXPECT_EQ(withNumber("Evaluation of parameter set No. % completed: OK", 12),
            "Evaluation of parameter set No. 12 completed: OK");
}

}  // namespace
}  // namespace mirevo
