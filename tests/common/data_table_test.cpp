#include "common/data_table.h"

#include <bit>
#include <cmath>
#include <limits>

#include <fmt/format.h>
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

TEST(DataTable, RealsInColumnsAndPartsMakeTheSameText) {
  DataTable cells{{}, {"all"}, {"Name", "a", "b"}, {}};
  DataTable columns = cells;
  columns.realColumns.resize(2);
  constexpr int kRows = 60'000;  // more than one part
  for (int i = 0; i < kRows; ++i) {
    const std::string name = fmt::format("row {}", i);
    const double b = i == 7 ? NAN : -i / 7.0;
    cells.rows.push_back({name, 0.1 * i, b});
    columns.rows.push_back({name});
    columns.realColumns[0].push_back(0.1 * i);
    columns.realColumns[1].push_back(b);
  }
  const std::string text = dataTableText(cells);
  EXPECT_TRUE(dataTableText(columns) == text);
  EXPECT_THAT(text.substr(0, 40), ::testing::StartsWith("# all\nName\ta\tb\nrow 0\t0\t0\nrow 1\t0.1\t"));
  const std::string first[] = {"of a run"};
  DataTableParts parts(columns, first);
  std::string joined;
  int count = 0;
  for (std::string_view part = parts.next(); !part.empty(); part = parts.next(), ++count) joined += part;
  EXPECT_GT(count, 1);
  EXPECT_TRUE(joined == "# of a run\n" + text);
}

TEST(DataTable, WhatIsMissingOfATableIsSeen) {
  const DataTable table{{}, {"of numbers"}, {"Name", "Value"}, {{"a", 1.5}, {"b", 2.5}}};
  const std::string rows = dataTableText(table);
  const std::string head[] = {rowCountLine(table)};
  EXPECT_EQ(head[0], "Rows: 2");
  std::string counted;
  DataTableParts parts(table, head);
  for (std::string_view part = parts.next(); !part.empty(); part = parts.next()) counted += part;
  EXPECT_FALSE(readDataTable(counted).isDamaged);
  EXPECT_FALSE(readDataTable(rows).isDamaged) << "of an earlier version, which did not count";
  for (std::size_t length = 0; length < counted.size(); ++length) {
    EXPECT_TRUE(readDataTable(counted.substr(0, length)).isDamaged) << length;
  }
  EXPECT_TRUE(readDataTable(rows.substr(0, rows.size() - 2)).isDamaged);
  EXPECT_TRUE(readDataTable(rows + "c\n").isDamaged);
  EXPECT_TRUE(readDataTable(counted + "c\t3.5\n").isDamaged);
}

TEST(DataTable, NumbersComeBackAsTheSameBitsAndWholeRowsOnly) {
  const std::vector<double> values{0.1 + 0.2, -0.0, 5e-324, std::numeric_limits<double>::max(), INFINITY, -INFINITY};
  DataTable table{{}, {}, {"Number", "Value"}, {}};
  for (const double value : values) table.rows.push_back({std::int64_t{-7}, value});
  const ReadTable read = readDataTable(dataTableText(table) + "1\n1\t2\t3\n8\t9");
  ASSERT_EQ(read.rows.size(), values.size());
  for (std::size_t i = 0; i < values.size(); ++i) {
    EXPECT_EQ(read.rows[i][0], "-7");
    EXPECT_EQ(std::bit_cast<std::uint64_t>(*realCell(read.rows[i][1])), std::bit_cast<std::uint64_t>(values[i]));
  }
  EXPECT_TRUE(std::isnan(realCell("NaN").value_or(0.0)));
  EXPECT_FALSE(realCell("1,5"));
}

}  // namespace
}  // namespace mirevo
