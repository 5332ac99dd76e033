#include "common/data_table.h"

#include <bit>
#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"

namespace mirevo {
namespace {

TEST(DataTable, TextsComeBackAsTheyWereWhateverTheyHold) {
  const std::vector<std::string> texts{"#1",  "\"open",     "a\tb\nc\r",   "\\x23 \\n", "",
                                       " x ", "flow, m³/s", "\x1B[0m\x7F", "\xFF\xC3",  std::string("a\0b", 3)};
  DataTable table;
  table.headLines = {"# for\npeople"};
  table.columns = texts;
  table.rows = {{texts.begin(), texts.end()}, {texts.rbegin(), texts.rend()}};
  const std::string text = dataTableText(table);
  // Nothing is left that a reader takes for a comment, a quoted cell or another line.
  EXPECT_THAT(text.substr(text.find('\n')), Not(::testing::ContainsRegex("[#\"\r\x1B\xFF]")));
  EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 4);
  const ReadTable read = readDataTable(text);
  EXPECT_THAT(read.headLines, ElementsAre("# for people"));
  EXPECT_EQ(read.columns, texts);
  EXPECT_THAT(read.rows, ElementsAre(texts, std::vector(texts.rbegin(), texts.rend())));
  EXPECT_EQ(read.column("flow, m³/s"), 6U);
  EXPECT_EQ(readDataTable("\\xZZ\\q\\x2\\\n").columns, std::vector<std::string>{"xZZqx2\\"});
}

TEST(DataTable, NumbersComeBackAsTheSameBitsAndWholeRowsOnly) {
  const double values[] = {0.1 + 0.2, -0.0, 5e-324, std::numeric_limits<double>::max(), 1e30, INFINITY, -INFINITY};
  DataTable table{{}, {}, {"Number", "Value"}, {}};
  for (std::size_t i = 0; i < std::size(values); ++i) table.rows.push_back({std::int64_t{-7}, values[i]});
  std::string text = dataTableText(table);
  const ReadTable read = readDataTable(text + "1\n1\t2\t3\n8\t9");
  ASSERT_EQ(read.rows.size(), std::size(values));
  for (std::size_t i = 0; i < std::size(values); ++i) {
    EXPECT_EQ(read.rows[i][0], "-7");
    EXPECT_EQ(std::bit_cast<std::uint64_t>(*realCell(read.rows[i][1])), std::bit_cast<std::uint64_t>(values[i]));
  }
  EXPECT_TRUE(std::isnan(realCell("NaN").value_or(0.0)));
  EXPECT_FALSE(realCell("1,5"));
}

}  // namespace
}  // namespace mirevo
