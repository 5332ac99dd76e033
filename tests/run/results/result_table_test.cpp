#include "run/results/result_table.h"

#include <tuple>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

const ResultColumns kTableColumns{{"X1"}, {"RMSE"}, {}};
const std::string kTableHead = "# A title\n# Mirevo\nEvaluation\tStatus\tX1\tRMSE\tAggregate\n";

TEST(ResultTable, RowsHaveTheirNumbersBetweenHeadAndClosingLines) {
  const std::string rows = "1\tOK\t0.1\t1\t2\n2\tFAILED\tNaN\t-Inf\t5e-324\n";
  const ResultTable table = readResultTable(kTableHead + rows + "# Cancelled\n# Best evaluation: 1\n", kTableColumns);
  ASSERT_EQ(table.rows.size(), 2U);
  EXPECT_EQ(resultRowText(table.rows[0]) + "\n" + resultRowText(table.rows[1]) + "\n", rows);
  EXPECT_EQ(table.headLines, (std::vector<std::string>{"A title", "Mirevo"}));
  EXPECT_EQ(table.closingLines, (std::vector<std::string>{"Cancelled", "Best evaluation: 1"}));
}

TEST(ResultTable, AFileCutAtAnyByteHoldsItsWholeRowsAndNoOther) {
  const std::string rows = "1\tOK\t1.25\t3\t3\n2\tFAILED\t2.5\t1e+30\t1e+30\n";
  const std::string text = kTableHead + rows;
  for (std::size_t length = 0; length <= text.size(); ++length) {
    const ResultTable table = readResultTable(std::string_view(text).substr(0, length), kTableColumns);
    const std::size_t firstEnd = kTableHead.size() + rows.find('\n') + 1;
    ASSERT_EQ(table.rows.size(), length == text.size() ? 2u : (length >= firstEnd ? 1u : 0u)) << length;
    if (!table.rows.empty()) {
      EXPECT_EQ(resultRowText(table.rows[0]), "1\tOK\t1.25\t3\t3");
    }
  }
}

TEST(ResultTable, HeadingsAreUniqueAndThoseOfEarlierVersionsAreKnown) {
  const ResultColumns columns{{"flow", "Status"}, {"flow", "flow (2)", "Aggregate"}, {"flow "}};
  const std::string header =
      "Evaluation\tStatus\tflow\tStatus (2)\tflow (2)\tflow (2) (2)\tAggregate (2)\tflow (3)\tAggregate";
  EXPECT_EQ(resultHeader(columns), header);
  EXPECT_TRUE(hasColumns(header, columns));
  EXPECT_TRUE(hasColumns("Evaluation\tStatus\tflow\tStatus\tflow\tflow (2)\tAggregate\tflow\tAggregate", columns));
}

TEST(ResultTable, OtherColumnsAreToldFromNone) {
  const std::tuple<std::string, std::size_t, std::size_t> cases[] = {
      {"Evaluation\tStatus\tX2\tRMSE\tAggregate\n", 1, 0}, {"Evaluation\tStatus\tX1\tAggregate\n", 0, 1}};
  for (const auto& [header, rows, others] : cases) {
    const ResultTable table = readResultTable(header + "1\tOK\t1\t2\t3\n2\tOK\t1\t2\n", kTableColumns);
    EXPECT_TRUE(table.hasHeader);
    EXPECT_FALSE(table.hasExpectedColumns);
    EXPECT_EQ(table.rows.size(), rows);
    EXPECT_EQ(table.rowsOfOtherColumns, others);
    EXPECT_EQ(table.unusableLines, 1U);
  }
  EXPECT_TRUE(readResultTable("Evaluation\tStatus\tX1 \t RMSE\tAggregate\n", kTableColumns).hasExpectedColumns);
  // A column more is that of repeats or none of the run's; one of that name before it keeps its own heading.
  const std::string wider = "Evaluation\tStatus\tX1\tRMSE\tAggregate\t";
  EXPECT_EQ(readResultTable(wider + "Repeats\n2\tOK\t1\t2\t3\t1\n", kTableColumns).rows.at(0).repeats, 1);
  EXPECT_EQ(readResultTable(wider + "Repeats\n2\tOK\t1\t2\t3\t-1\n", kTableColumns).unusableLines, 1U);
  EXPECT_FALSE(readResultTable(wider + "Others\n2\tOK\t1\t2\t3\t1\n", kTableColumns).hasExpectedCount);
  EXPECT_EQ(resultHeader({{"Repeats"}, {}, {}, {}, true}), "Evaluation\tStatus\tRepeats\tAggregate\tRepeats (2)");
}

TEST(ResultTable, DamagedRowsAreCountedAndPassedOver) {
  for (const std::string row : {"x\tOK\t1\t2\t3", "0\tOK\t1\t2\t3", "1\tDONE\t1\t2\t3", "1\tOK\t1\t2",
                                "1\tOK\t1\t2\t3\t4", "1\tOK\t1\t\t3", "1\tOK\t1\t2\t3x", "99999999999\tOK\t1\t2\t3"}) {
    const ResultTable table = readResultTable(kTableHead + row + "\n2\tOK\t1\t2\t3\n", kTableColumns);
    EXPECT_EQ(table.unusableLines, 1u) << row;
    ASSERT_EQ(table.rows.size(), 1u) << row;
    EXPECT_EQ(table.rows[0].number, 2) << row;
  }
  EXPECT_FALSE(readResultTable("some other\ttext\n", kTableColumns).hasHeader);
}

}  // namespace
}  // namespace mirevo
