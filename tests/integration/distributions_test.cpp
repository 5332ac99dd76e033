#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The number in the column `heading` of the first row that begins with these cells; NaN where there is none.
double numberIn(const std::string& text, const std::vector<std::string>& first, const std::string& heading) {
  const ReadTable table = readDataTable(text);
  for (const std::vector<std::string>& cells : table.rows) {
    if (!std::equal(first.begin(), first.end(), cells.begin())) continue;
    return realCell(cells.at(table.column(heading).value())).value();
  }
  return std::nan("");
}

TEST(Distributions, OfASampleTakeOverTheCorrelationOfACovarianceRunAndItGoesOnWithTheSameSets) {
  const ModelFolder folder;
  std::string setup = folder.writeSetup({.option = 1});
  folder.editSetup("End_Date = 2001-12-31", "End_Date = 2001-05-31");  // the sine of b is then hardly ever below 0
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const double correlation = numberIn(folder.read("basin_Correlation.dat"), {"a"}, "b");
  ASSERT_LT(correlation, -0.5);

  setup = folder.writeSetup({.option = 3, .maxEvaluations = 150, .restart = 1});
  folder.editSetup("      Mean_Value = 5.0\n      Standard_Deviation = 0.5\n",
                   "      Distribution = 'triangular'\n      Minimum_Value = 4\n      Mode_Value = 4\n"
                   "      Maximum_Value = 7\n");
  folder.editSetup("      Mean_Value = 2.0\n      Standard_Deviation = 0.1\n",
                   "      Distribution = 'beta'\n      Alpha = 2\n      Beta = 2\n");
  folder.editSetup("  [/UNCERTAINTY",
                   "    [CORRELATIONS]\n      Correlation_File = 'basin_Correlation.dat'\n"
                   "      TqSEKdxListItemCount = 0\n    [/CORRELATIONS]\n  [/UNCERTAINTY");
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error << folder.read("basin.log");
  const std::string results = folder.read("basin.dat");
  const std::string quantiles = folder.read("basin_Quantiles.dat");
  EXPECT_NEAR(numberIn(quantiles, {"parameter", "a"}, "Mean"), 5.0, 0.15);
  EXPECT_NEAR(numberIn(quantiles, {"parameter", "a"}, "50 %"), 7 - std::sqrt(4.5), 0.25);
  EXPECT_NEAR(numberIn(folder.read("basin_SampleCorrelation.dat"), {"a"}, "b"), correlation, 4 / std::sqrt(150.0));
  EXPECT_THAT(
      folder.read("basin.log"),
      AllOf(HasSubstr("\n  PARAMETER_1: a, triangular, from 4 to 7, mode 4; on the model scale median 4.87868, "),
            HasSubstr("\n  Correlations of the normal scores: a and b ")));
  const std::string dependence = folder.read("basin_SampleSensitivities.dat");
  EXPECT_EQ(numberIn(dependence, {"measure", "flow", "b"}, "Count"), 150);
  EXPECT_GT(numberIn(dependence, {"measure", "flow", "a"}, "FirstOrder"), 0.2);
  EXPECT_THAT(results, HasSubstr("The parameters are correlated: an index has what"));
  if (folder.exists("basin_Report.html")) {  // not in a build without its page
    EXPECT_THAT(folder.read("basin_Report.html"),
                AllOf(HasSubstr(R"("distributions":[{"text":"triangular, from 4 to 7, mode 4","quantiles":[4.)"),
                      HasSubstr(R"("sampleSensitivity":{"parameters":["a","b"],"outputs":["flow",)")));
  }

  // A run that was cut off goes on with the same sets, and has the same statistics of all of them.
  std::size_t at = 0;
  for (int line = 0; line < 120; ++line) at = results.find('\n', at) + 1;
  folder.write("basin.dat", results.substr(0, at));
  ASSERT_EQ(runProgram({setup}).exitCode, 0) << folder.read("basin.log");
  EXPECT_EQ(readDataTable(folder.read("basin.dat")).rows, readDataTable(results).rows);
  EXPECT_EQ(folder.read("basin_SampleSensitivities.dat"), dependence);

  // Another content of the file would be another sample.
  folder.write("basin_Correlation.dat", "Parameter\ta\tb\na\t1\t0.5\nb\t0.5\t1\n");
  EXPECT_THAT(runProgram({setup}).error, HasSubstr("the content of basin_Correlation.dat has changed"));
}

}  // namespace
}  // namespace mirevo::testing
