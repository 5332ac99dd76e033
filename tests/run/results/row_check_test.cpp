#include "run/results/row_check.h"

#include <gmock/gmock.h>

#include "common/checksum.h"
#include "run/results/result_table.h"
#include "run/setup_fixture.h"

namespace mirevo {
namespace {

constexpr std::string_view kSquaresRows =
    "Evaluation\tStatus\tDepth\tRate\tFlow error\tWritten\tFlow\tAggregate\n"
    "1\tOK\t400\t0.5\t2\t7\t4\t3\n"
    "2\tOK\t410\t0.5\t3\t7\t9\t6.75\n"
    "3\tFAILED\t420\t0.5\t1e+30\t1e+30\t1e+30\t1e+30\n";

class RowCheckTest : public SetupFixture {
 protected:
  static std::vector<ResultRow> rowsOf(const std::string& text) {
    return readResultTable(text, {{"Depth", "Rate"}, {"Flow error", "Written"}, {"Flow"}}).rows;
  }
  static RowChecksums checksumsOf(const std::string& text) {
    std::string table = "Evaluation\tChecksum\n";
    for (const ResultRow& row : rowsOf(text)) table += rowChecksumText({row.number, checksumOf(resultRowText(row))});
    return readRowChecksums(table);
  }
  static RowChecksums withOther(const RowChecksums& checksums, const RowChecksum& other) {
    std::vector<RowChecksum> all(checksums.begin(), checksums.end());
    all.push_back(other);
    return RowChecksums(all);
  }
  /// The first fault; empty if all rows hold.
  static std::string faultOf(const std::string& text, const RowChecksums& checksums, const RunConfig& config,
                             RowOrigin origin = RowOrigin::thisSetup) {
    const CheckedRows checked = checkRows(rowsOf(text), checksums, config, origin);
    return checked.faults.empty() ? "" : rowFaultText(checked.faults.front());
  }
  static std::string withEdit(std::string_view from, std::string_view to) {
    std::string text(kSquaresRows);
    const auto at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    return text.replace(at, from.size(), to);
  }
};

TEST_F(RowCheckTest, WhatWasChangedOrDoesNotFollowIsNamedByItsLine) {
  const RunConfig config = read();
  const RowChecksums checksums = checksumsOf(std::string(kSquaresRows));
  const std::string changed = "it is not as it was written: it has another checksum";
  const std::string isChanged = "line 3 (evaluation No. 2): " + changed;
  // What is changed, and what is found with the checksums and without them.
  const struct {
    std::string_view from, to;
    std::string with, without;
  } cases[] = {
      {"1\tOK", "1\tOK", "", ""},
      {"6.75\n", "6.750 \r\n", "", ""},  // saved by an editor
      {"2\tOK\t410", "2\tOK\t411", isChanged, ""},
      {"\t3\t7\t9", "\t4\t7\t9", isChanged,
       "line 3 (evaluation No. 2): objective function \"Flow\" is 9, its output measures give 16"},
      {"\t9\t6.75", "\t9.5\t6.75", isChanged,
       "line 3 (evaluation No. 2): objective function \"Flow\" is 9.5, its output measures give 9"},
      {"6.75", "6.7", isChanged, "line 3 (evaluation No. 2): the aggregate is 6.7, its objective functions give 6.75"},
      {"6.75", "6.7500000001", isChanged, ""},  // as rounding may differ between machines
      {"\t3\t7\t9", "\tNaN\t7\t9", isChanged, "line 3 (evaluation No. 2): its status is OK, but a value is not finite"},
      {"2\tOK", "2\tFAILED", isChanged,
       "line 3 (evaluation No. 2): its status is FAILED, but not all of its values are 1e+30"},
      {"3\tFAILED", "3\tOK", "line 4 (evaluation No. 3): " + changed,
       "line 4 (evaluation No. 3): its status is OK, but its values are those of a failed evaluation"},
      {"1e+30\n", "5\n", "line 4 (evaluation No. 3): " + changed,
       "line 4 (evaluation No. 3): its status is FAILED, but not all of its values are 1e+30"},
      {"2\tOK", "9\tOK", "line 3 (evaluation No. 9): it has no checksum, though rows below it have one", ""},
      {"2\tOK", "1\tOK", "line 3 (evaluation No. 1): " + changed,
       "line 3 (evaluation No. 1): the evaluation is in line 2, too"},
      {"3\tFAILED", "502\tFAILED", "line 4 (evaluation No. 502): the run has at most 501 evaluations",
       "line 4 (evaluation No. 502): the run has at most 501 evaluations"}};
  for (const auto& [from, to, with, without] : cases) {
    EXPECT_EQ(faultOf(withEdit(from, to), checksums, config), with) << from << " => " << to;
    EXPECT_EQ(faultOf(withEdit(from, to), {}, config), without) << from << " => " << to;
  }
  EXPECT_EQ(faultOf(std::string(kSquaresRows) + "1\tOK\t400\t0.5\t2\t7\t4\t3\n", checksums, config),
            "line 5 (evaluation No. 1): the evaluation is in line 2, too");
}

TEST_F(RowCheckTest, TheLastRowsMayLackTheirChecksums) {
  const RunConfig config = read();
  const std::string rows(kSquaresRows);
  RowChecksums checksums = withOther(checksumsOf(rows.substr(0, rows.find("3\tFAILED"))), {4, 0});  // not written
  EXPECT_EQ(checkRows(rowsOf(rows), checksums, config, RowOrigin::thisSetup).withoutChecksum, 1U);
  EXPECT_EQ(faultOf(rows, checksums, config), "");
  checksums = withOther(checksums, {2, 5});  // it had other values before
  EXPECT_EQ(faultOf(rows, checksums, config), "");
}

TEST_F(RowCheckTest, AnAggregateIsCheckedIfTheSetupAloneGivesIt) {
  const std::string given = "\n        Standard_Deviation = 2\n        Location = ";
  // The edits, the aggregate of the second row, whether it holds.
  const std::tuple<std::string, const char*, bool> cases[] = {
      {"Aggregation_Method = 0 => 1", "NaN", true},  // of the sample, as long as the run goes on
      {"Aggregation_Method = 0 => 1", "17", true},
      {"Aggregation_Method = 0 => 1 & Weight = 0.75 => Weight = 0.75" + given + "1", "4.125", true},  // 0.75 (9/2 + 1)
      {"Aggregation_Method = 0 => 1 & Weight = 0.75 => Weight = 0.75" + given + "1", "NaN", false},
      {"Aggregation_Method = 0 => 1 & Weight = 0.75 => Weight = 0.75" + given + "-4.5", "1e-13", true},  // rounded to 0
      {"Aggregation_Method = 0 => 2 & Weight = 0.75 => Weight = 0.75" + given + "9", "0.375", true},
      {"Aggregation_Method = 0 => 2 & Weight = 0.75 => Weight = 0.75" + given + "9", "0.376", false},
      {"Aggregation_Method = 0 => 3", "0", true},
      {"Aggregation_Method = 0 => 3", "1", false},
      {"Weight = 0.75 => 1e308", "Inf", true}};
  for (const auto& [edits, aggregate, holds] : cases) {
    std::vector<ResultRow> rows = rowsOf(withEdit("6.75", aggregate));
    rows.erase(rows.begin());
    if (std::string_view(aggregate) == "Inf") {
      rows[0].measures[0] = 1e10;
      rows[0].objectives[0] = 1e20;
    }
    EXPECT_EQ(checkRows(rows, {}, read(edits), RowOrigin::thisSetup).faults.empty(), holds) << edits << aggregate;
  }
}

TEST_F(RowCheckTest, ARowAsItWasWrittenHoldsThoughTheSetupHasChanged) {
  const RunConfig now = read("Weight = 0.75 => 0.5 & Max_No_Evaluations = 500 => 1");
  const std::string rows(kSquaresRows);
  EXPECT_EQ(faultOf(rows, checksumsOf(rows), now, RowOrigin::perhapsOther), "");
  EXPECT_NE(faultOf(rows, checksumsOf(rows), now), "");
  EXPECT_NE(faultOf(rows, {}, now, RowOrigin::perhapsOther), "");
}

}  // namespace
}  // namespace mirevo
