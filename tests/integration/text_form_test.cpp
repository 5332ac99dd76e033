// Series in text of other forms, as models and gauges have them: a run gives what it gives with the same series as CSV.

#include <string>
#include <string_view>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/text.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

constexpr const char* kResults = "basin_Optimisation.dat";

/// The gauge's file: "2001  1 31  12,5", with a first column of its station.
std::string gaugeOf(const std::string& csv) {
  std::string gauge = "Pegel Brück\n";
  for (const std::string_view line : splitLines(csv)) {
    if (!line.starts_with("2001-")) continue;
    std::string value(line.substr(line.find(',') + 1));
    std::replace(value.begin(), value.end(), '.', ',');
    gauge += fmt::format("17 2001 {:>2} {} {}\n", parseInteger(line.substr(5, 2)).value(), line.substr(8, 2), value);
  }
  return gauge;
}

std::string rowsOf(const std::string& results) {
  const auto begin = results.find("\nEvaluation");
  return results.substr(begin, results.find("\n#", begin) - begin);
}

TEST(TextForms, ARunHasTheRowsThatItHasWithTheSameSeriesAsCsv) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.maxEvaluations = 10});
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string expected = rowsOf(folder.read(kResults));
  ASSERT_GT(expected.size(), 500U);

  const std::string form = R"( && awk -F, 'BEGIN { print "MODEL 4.2\n\n      Date     Flow\n      d/m/y    m3/s" }
NR > 1 { split($1, d, /[- ]/); printf "%2d/%2d/%4d %s\n", d[3], d[2], d[1], $2 }' simulated.csv > run.out)";
  folder.write("model/run.sh", fmt::format("#!/bin/sh\n{} \"$@\"{}\n", MIREVO_TEST_MODEL, form), 0755);
  const std::string run = fmt::format("cd '{}/model' && ./run.sh && rm simulated.csv", folder.path());
  ASSERT_EQ(std::system(run.c_str()), 0);
  folder.write("gauge.dat", gaugeOf(folder.read("observed.csv")));
  folder.editSetup("'model/simulated.csv'\n          Item_No = 1",
                   "'model/run.out'\nSkip_Rows = 2\nHeader_Rows = 2\nColumn_Widths = 11, 30\nTime_Format = "
                   "'DD/MM/YYYY'\nItem_Name = 'flow M3/s'");
  folder.editSetup("'observed.csv'\n          Item_No = 1",
                   "'gauge.dat'\nSkip_Rows = 1\nHeader_Rows = 0\nColumn_Separator = 'blank'\nDecimal_Sign = ','\n"
                   "Time_Column = '2, 3, 4'\nTime_Format = 'YYYY MM DD'\nItem_Name = 'column 5'");
  const ProgramResult result = runProgram({setup});
  ASSERT_EQ(result.exitCode, 0) << result.error << folder.read("basin.log");
  EXPECT_EQ(rowsOf(folder.read(kResults)), expected);
}

/// Numbers are longer in model runs than in the file that the model's folder has.
TEST(TextForms, ColumnsThatCutANumberAreWarnedOfOnceHoweverARunIsMade) {
  const ModelFolder folder;
  const char* const form = "awk -F, 'NR > 1 { printf \"%.10s %6.DIGITSf  17.5\\n\", $1, $2 }' simulated.csv > run.out";
  const auto formed = [form](const char* digits) {
    return std::string(form).replace(std::string(form).find("DIGITS"), 6, digits);
  };
  for (const bool isJob : {false, true}) {
    if (isJob && !mpirunIsInstalled()) continue;
    for (const int slots : {1, 3}) {
      if (isJob && slots == 1) continue;
      const std::string setup = folder.writeSetup({.option = 3, .maxEvaluations = 12, .slots = slots});
      folder.editSetup("'model/simulated.csv'\n          Item_No = 1",
                       "'model/run.out'\nHeader_Rows = 0\nColumn_Widths = 11, 6, 20\nItem_No = 1");
      const std::string whole = formed("3");
      folder.write("model/run.sh", fmt::format("#!/bin/sh\n{} \"$@\" && {}\n", MIREVO_TEST_MODEL, whole), 0755);
      ASSERT_EQ(std::system(fmt::format("cd '{}/model' && ./run.sh && rm simulated.csv", folder.path()).c_str()), 0);
      folder.write("model/run.sh", fmt::format("#!/bin/sh\n{} \"$@\" && {}\n", MIREVO_TEST_MODEL, formed("9")), 0755);
      const ProgramResult run = isJob ? startJob(3, {setup}).wait() : runProgram({setup});
      EXPECT_EQ(run.exitCode, 0) << run.error << folder.read("basin.log");
      const std::string log = folder.read("basin.log");
      EXPECT_EQ(occurrences(log, "Column_Widths ends column 2 before character 18, between "), 1)
          << slots << isJob << log;
      EXPECT_THAT(log, HasSubstr("Warning: Evaluation of parameter set No. "));
    }
  }
}

TEST(TextForms, ARefusalTellsTheKeywordAndShowsTheFirstLines) {
  const ModelFolder folder;
  folder.write("observed.csv", "gauge 17\n31.01.2001\t7,5\n");
  const std::string setup = folder.writeSetup({});
  EXPECT_THAT(runProgram({setup}).error,
              AllOf(HasSubstr("Error opening TS object for file: " + folder / "observed.csv"), HasSubstr("File_Name: "),
                    HasSubstr("observed.csv:1:1: expected a header row"), HasSubstr("\n  1 header: gauge 17"),
                    HasSubstr("\n  2 row: 31.01.2001 | 7,5")));
  const std::string named = "'observed.csv'\n          Item_No = 1";
  folder.editSetup(named, "'observed.nc'\nDecimal_Sign = ','");
  EXPECT_THAT(runProgram({setup}).error,
              AllOf(HasSubstr("Error creating TS object for file: " + folder / "observed.nc"),
                    HasSubstr("basin.kdx:87:16: Decimal_Sign: "), HasSubstr(".nc is a file of another format")));
  folder.editSetup("Decimal_Sign = ','", "Column_Separator = ','\nDecimal_Sign = ','");
  EXPECT_THAT(runProgram({setup}).error,
              AllOf(HasSubstr("Error: Form of a text file invalid"), HasSubstr("basin.kdx:87:20: Column_Separator: "),
                    HasSubstr("another character than the Decimal_Sign")));
}

TEST(TextForms, AModelWhoseItemsMoveHasFailed) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.maxEvaluations = 4});
  const std::string header =
      folder.read("model/simulated.csv").substr(0, folder.read("model/simulated.csv").find('\n'));
  const std::string item = header.substr(header.find(',') + 1);
  folder.editSetup("'model/simulated.csv'\n          Item_No = 1",
                   fmt::format("'model/simulated.csv'\nItem_Name = '{}'", item));
  folder.write("model/run.sh",
               fmt::format("#!/bin/sh\n{} \"$@\" && sed -i '1s/.*/time,other/' simulated.csv\n", MIREVO_TEST_MODEL),
               0755);
  const ProgramResult result = runProgram({setup});
  EXPECT_NE(result.exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("expected item No. 1 to be \"" + item +
                                                  "\", as in the file of the model's folder, found \"other\""));
}

}  // namespace
}  // namespace mirevo::testing
