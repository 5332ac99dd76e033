#include <algorithm>
#include <cmath>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "common/text.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The number in a column of the first row that begins with these cells; NaN where there is none.
double sobolCell(const std::string& text, const std::vector<std::string>& first, const std::string& heading) {
  const ReadTable table = readDataTable(text);
  for (const std::vector<std::string>& cells : table.rows) {
    if (!std::equal(first.begin(), first.end(), cells.begin())) continue;
    return realCell(cells.at(table.column(heading).value())).value();
  }
  return std::nan("");
}

struct ExpectedIndex {
  double value;
  double error;  ///< root mean square
};

/// A folder in which the model is a function of x1, x2 ..., whose value is the measure.
class SobolFunctionFolder : public ModelFolder {
 public:
  SobolFunctionFolder(const std::string& function, int parameters, double lower, double upper,
                      const std::string& keywords) {
    writeSetup({.option = 1, .slots = 2});
    std::string text = read("basin.kdx");
    const auto replaced = [&text](const std::string& from, const std::string& to, const std::string& with) {
      const auto begin = text.find(from);
      const auto end = text.find(to, begin) + to.size();
      text.replace(begin, end - begin, with);
    };
    std::string sections = fmt::format("[MODEL_PARAMETERS]\n    TqSEKdxListItemCount = {}\n", parameters);
    std::string form = fmt::format("!\nfunction = {}\n", function);
    for (int j = 1; j <= parameters; ++j) {
      sections += fmt::format(
          "[PARAMETER_{0}]\nInitial_Value = {1}\nLower_Bound = {2}\nUpper_Bound = {3}\nParameter_Name = "
          "'x{0}'\nTransformation_Type = 0\nParameter_Type = 0\n[/PARAMETER_{0}]\n",
          j, 0.5 * (lower + upper) + 0.1, lower, upper);
      form += fmt::format("x{0} = !x{0}                  !\n", j);
    }
    write("model/parameters.tpl", form);
    replaced("[MODEL_PARAMETERS]", "[INTERNAL_CONSTRAINTS]", sections + "[INTERNAL_CONSTRAINTS]");
    replaced("Interface_Type = 0", "0", "Interface_Type = 1");
    replaced("[SIMULATION_FILE]", "[/OBSERVATION_FILE]", "");
    replaced("File_Name = ''", "''", "File_Name = 'model/value.txt'");
    replaced("Sensitivity_Type = 0", "[/LOCAL_SA]",
             fmt::format("Sensitivity_Type = 'Sobol'\n[SOBOL]\n{}\n[/SOBOL]", keywords));
    write("basin.kdx", text);
  }
  ProgramResult run() const { return runProgram({*this / "basin.kdx"}); }
  double index(const std::string& parameter, const std::string& order, const std::string& column = "Index") const {
    return sobolCell(read("basin_Sobol.dat"), {"objective", "fit", parameter, "", order}, column);
  }
  /// Within three standard errors and between its limits.
  void expectIndex(const std::string& parameter, const std::string& order, const ExpectedIndex& expected) const {
    EXPECT_NEAR(index(parameter, order), expected.value, 3.0 * expected.error) << parameter << " " << order;
    EXPECT_LE(index(parameter, order, "Lower"), expected.value) << parameter << " " << order;
    EXPECT_GE(index(parameter, order, "Upper"), expected.value) << parameter << " " << order;
  }
};

TEST(SobolRun, OfTheIshigamiFunctionThroughTheWholeProgram) {
  const SobolFunctionFolder folder("ishigami", 3, -M_PI, M_PI, "Sample_Size = 256");
  const ProgramResult run = folder.run();
  ASSERT_EQ(run.exitCode, 0) << run.error;
  // Errors between those that sobol_coverage has for 128 and for 512 blocks.
  const ExpectedIndex first[] = {{0.3139, 0.062}, {0.4424, 0.057}, {0.0, 0.062}};
  const ExpectedIndex total[] = {{0.5576, 0.075}, {0.4424, 0.032}, {0.2437, 0.031}};
  for (std::size_t j = 0; j < 3; ++j) {
    const std::string name = fmt::format("x{}", j + 1);
    folder.expectIndex(name, "first", first[j]);
    folder.expectIndex(name, "total", total[j]);
    EXPECT_EQ(folder.index(name, "total", "Blocks"), 256.0);
  }
  const ReadTable stages = readDataTable(folder.read("basin_SobolConvergence.dat"));
  EXPECT_EQ(stages.rows.size(), 2U * 3 * 2 * 4);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Interact with others"));
}

// A failed run, at the value of which others compute, or for which they drop all that its block has.
TEST(SobolRun, OfTheGFunctionOfWhichATenthOfTheRunsFails) {
  const SobolFunctionFolder folder("g", 8, 0.0, 1.0, "Sample_Size = 128");
  folder.write("model/parameters.tpl", folder.read("model/parameters.tpl") + "fail-share = 0.092\n");
  const ProgramResult run = folder.run();
  ASSERT_EQ(run.exitCode, 0) << run.error;
  // Errors that sobol_coverage has for 128 blocks with a tenth of the runs failing.
  const ExpectedIndex first[] = {{0.7162, 0.138}, {0.1790, 0.072}, {0.0237, 0.026}, {0.0072, 0.018}, {0.0001, 0.0014}};
  const ExpectedIndex total[] = {
      {0.7871, 0.131}, {0.2422, 0.033}, {0.0343, 0.0072}, {0.0105, 0.0018}, {0.0001, 0.00005}};
  for (std::size_t j = 0; j < std::size(first); ++j) {
    const std::string name = fmt::format("x{}", j + 1);
    folder.expectIndex(name, "first", first[j]);
    folder.expectIndex(name, "total", total[j]);
    EXPECT_GT(folder.index(name, "total", "Blocks"), 128 * 0.72);
    EXPECT_LT(folder.index(name, "first", "Blocks"), 128 * 0.88);
  }
  EXPECT_THAT(folder.read("basin.log"), ::testing::ContainsRegex("Can be fixed.*x5"));
  EXPECT_THAT(folder.read("basin.log"), ::testing::ContainsRegex("Warning: .*% of the model runs failed"));
}

/// simulated = a + b sin(t / 58) + c t / 365 with a in [0, 10], b in [0, 5]: the sum of two shares at every time.
std::string sobolSetup(const ModelFolder& folder, const std::string& keywords, int slots = 2) {
  const std::string setup = folder.writeSetup({.option = 1, .slots = slots});
  const bool isOpen = keywords.find("[/SOBOL]") == std::string::npos;
  folder.editSetup("Sensitivity_Type = 0",
                   "Sensitivity_Type = 'Sobol'\n[SOBOL]\n" + keywords + (isOpen ? "\n[/SOBOL]" : ""));
  return setup;
}

TEST(SobolRun, OfASimulatedSeriesAreOnesOfEveryTime) {
  const ModelFolder folder;
  const ProgramResult run = runProgram({sobolSetup(folder, "Sample_Size = 64")});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const std::string text = folder.read("basin_SobolSeries_1.csv");
  const std::vector<std::string_view> lines = splitLines(text);
  ASSERT_EQ(lines.size(), 2U + 365);
  EXPECT_EQ(lines[0], "# Sobol' indices of flow, with limits of 95 %");
  EXPECT_EQ(lines[1],
            "time,observed,mean,standard deviation,blocks,S a,S a lower,S a upper,ST a,ST a lower,ST a upper,"
            "S b,S b lower,S b upper,ST b,ST b lower,ST b upper");
  int covered = 0;
  for (const int t : {1, 90, 200, 290}) {
    const std::vector<std::string_view> cells = splitAt(lines[static_cast<std::size_t>(t) + 2], ',');
    const double ofB = 25.0 * std::pow(std::sin(t / 58.0), 2);
    const double shares[] = {100.0 / (100.0 + ofB), ofB / (100.0 + ofB)};
    for (const std::size_t j : {0U, 1U}) {
      for (const bool isTotal : {false, true}) {
        const std::size_t column = 5 + 6 * j + (isTotal ? 3 : 0);  // the index, then its limits
        EXPECT_NEAR(*parseReal(cells[column]), shares[j], isTotal ? 0.12 : 0.3) << t << " " << column;
        const bool isInside = *parseReal(cells[column + 1]) <= shares[j] && shares[j] <= *parseReal(cells[column + 2]);
        covered += isInside ? 1 : 0;
      }
    }
    EXPECT_NEAR(*parseReal(cells[3]), std::sqrt((100.0 + ofB) / 12.0), 0.1) << t;
    EXPECT_EQ(cells[4], "64");
  }
  EXPECT_GE(covered, 13);  // of 16
  const std::string report = folder.read("basin_Report.html");
  EXPECT_THAT(report, HasSubstr(R"("sobol":{"factors":["a","b"],"negligible":0.05,"outputs":[{"kind":"measure")"));
  EXPECT_THAT(report, HasSubstr(R"("series":[{"measure":"flow")"));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Series of flow, largest total index: a at 100 % of 365 times"));
  // Of a table that ends after a whole row, the number of rows in its head tells that there were more.
  const std::string table = folder.read("basin_Sobol.dat");
  folder.write("basin_Sobol.dat", table.substr(0, table.rfind('\n', table.size() / 2) + 1));
  EXPECT_EQ(RunningProgram({folder / "basin.kdx"}, {}, MIREVO_REPORT).wait().exitCode, 0);
  EXPECT_THAT(folder.read("basin_Report.html"),
              AllOf(HasSubstr("basin_Sobol.dat is cut off or damaged, and what it has is not shown"),
                    ::testing::Not(HasSubstr(R"("sobol":{"factors")"))));
}

TEST(SobolRun, AreTheSameWhateverTheSlotsAndAfterARestart) {
  std::vector<std::string> results;
  for (const int slots : {1, 3}) {
    const ModelFolder folder;
    ASSERT_EQ(runProgram({sobolSetup(folder, "Sample_Size = 32\nSecond_Order = 1", slots)}).exitCode, 0);
    for (const char* name : {"basin_Sobol.dat", "basin_SobolConvergence.dat", "basin_SobolSeries_1.csv"}) {
      results.push_back(folder.read(name));
    }
  }
  // Interrupted in the middle: it has statistics, which are gone when the run goes on.
  const ModelFolder folder;
  folder.write("hold", "");
  folder.useScript("echo run >>../runs\ntest ! -e ../hold -o $(wc -l <../runs) -lt 60 || exec sleep 3600");
  const std::string setup = sobolSetup(folder, "Sample_Size = 32\nSecond_Order = 1", 1);
  RunningProgram program({setup});
  EXPECT_TRUE(folder.reaches("basin_Sensitivity.dat", "\n59\tOK\t"));
  folder.write("basin._kill_", "");
  EXPECT_EQ(program.wait().exitCode, 1);
  EXPECT_THAT(folder.read("basin_Sobol.dat"), HasSubstr("Unfinished run: statistics of "));
  EXPECT_THAT(folder.read("basin_SobolSeries_1.csv"), HasSubstr("# Unfinished run"));
  EXPECT_NEAR(sobolCell(folder.read("basin_Sobol.dat"), {"objective", "fit", "a", "", "total"}, "Blocks"), 12.0, 4.0);
  std::filesystem::remove(folder / "hold");
  folder.editSetup("Restart = 0", "Restart = 1");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  std::size_t i = 0;
  for (const char* name : {"basin_Sobol.dat", "basin_SobolConvergence.dat", "basin_SobolSeries_1.csv"}) {
    const auto tail = [](const std::string& text) { return text.substr(text.find('\n', text.find("Setup file"))); };
    const bool isTable = std::string_view(name).ends_with(".dat");
    EXPECT_EQ(isTable ? tail(results[i]) : results[i], isTable ? tail(results[i + 3]) : results[i + 3]) << name;
    EXPECT_EQ(isTable ? tail(results[i]) : results[i], isTable ? tail(folder.read(name)) : folder.read(name)) << name;
    ++i;
  }
}

TEST(SobolRun, AreRefusedWithTheReason) {
  const std::pair<const char*, const char*> cases[] = {
      {"Sample_Size = 16", "Error: Sample size in Sobol sensitivity analysis invalid"},
      {"Sample_Size = 64\nGroup = 'both: a, d'", "there is no variable parameter \"d\""},
      {"Sample_Size = 64\nBootstrap_Samples = 0", "Bootstrap_Samples: expected 100 to 100000, found 0"},
      {"Sample_Size = 64\nNegligible_Index = 5", "Negligible_Index: expected greater than 0 and at most 1, found 5"},
      {"Sample_Size = 2000000000", "blocks of 4 sets"},
      {"Sample_Size = 64\n[/SOBOL]\n[CORRELATIONS]\nTqSEKdxListItemCount = 1\n[PAIR_1]\nFirst_Parameter = 'a'\n"
       "Second_Parameter = 'b'\nCorrelation = 0.5\n[/PAIR_1]\n[/CORRELATIONS]",
       "parameters 'a' and 'b' are correlated"},
  };
  for (const auto& [keywords, expected] : cases) {
    const ModelFolder folder;
    const std::string setup = sobolSetup(folder, keywords);
    for (const std::vector<std::string>& arguments : {std::vector{setup}, {"--check", setup}}) {
      const ProgramResult run = runProgram(arguments);
      EXPECT_EQ(run.exitCode, 1);
      EXPECT_THAT(run.error, AllOf(HasSubstr(expected), HasSubstr("basin.kdx:")));
    }
  }
}

TEST(SobolRun, SaysBeforeTheFirstRunThatASingleGroupHasKnownIndices) {
  const ModelFolder folder;
  const std::string setup = sobolSetup(folder, "Sample_Size = 32\nSeries_Indices = 'none'\nGroup = 'all: a, b'");
  const std::string warning = "\nWarning: all is the only group, and has all parameters: its first-order and its total";
  EXPECT_THAT(runProgram({"--check", setup}).output, HasSubstr(warning));
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string log = folder.read("basin.log");
  EXPECT_LT(log.find(warning), log.find("No. 1 initiated"));
  EXPECT_THAT(log, ::testing::Not(HasSubstr("too small to tell which parameter matters more")));
}

TEST(SobolRun, SaysHowItsDistributionsAndConstraintsFitToTheBounds) {
  const ModelFolder folder;
  const std::string setup = sobolSetup(
      folder,
      "Sample_Size = 32\nSeries_Indices = 'none'\n[/SOBOL]\n[PARAMETER_1]\nMean_Value = 1210\nStandard_Deviation = 1\n"
      "[/PARAMETER_1]\n[CORRELATIONS]\nCorrelation_Type = 'rank'\nTqSEKdxListItemCount = 0\n[/CORRELATIONS]");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"),
              AllOf(HasSubstr("PARAMETER_n of SENSITIVITY_ANALYSIS is that of the n-th variable parameter"),
                    HasSubstr("\n  PARAMETER_1: a, mean 1210"), HasSubstr("Mean_Value of PARAMETER_1 (a) is 1210"),
                    HasSubstr("\nSets outside the bounds of a parameter: 128 of 128 (a in 128)\n")));

  // Half of the sets have an a that is not below 5.
  sobolSetup(folder, "Sample_Size = 32");
  folder.editSetup("TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
                   "TqSEKdxListItemCount = 1\n[CONSTRAINT_1]\nLeft_Equation = 'a'\nRight_Equation = '5'\n"
                   "Logical_Operator = 1\n[/CONSTRAINT_1]\n[/INTERNAL_CONSTRAINTS]");
  const ProgramResult check = runProgram({"--check", setup});
  EXPECT_EQ(check.exitCode, 1);
  EXPECT_THAT(check.error,
              AllOf(HasSubstr("The run would end before it is complete"), HasSubstr("sets of the design")));
  EXPECT_THAT(check.output, Not(HasSubstr("Nothing is wrong")));
  EXPECT_THAT(check.output, AllOf(HasSubstr("sets of the design are not run"),
                                  HasSubstr("The run will end before it is complete"), HasSubstr("Narrower bounds")));
}

TEST(SobolRun, OtherBootstrapSamplesAndLimitsTakeAllResultsOver) {
  const std::string groups = "Sample_Size = 32\nGroup = 'first: a'\nGroup = 'other: b'";
  const std::string settings = groups + "\nBootstrap_Samples = 300\nNegligible_Index = 0.1";
  const ModelFolder fresh;
  ASSERT_EQ(runProgram({sobolSetup(fresh, settings)}).exitCode, 0);
  const ModelFolder folder;
  ASSERT_EQ(runProgram({sobolSetup(folder, groups)}).exitCode, 0);
  const std::string setup = sobolSetup(folder, settings);
  folder.editSetup("Restart = 0", "Restart = 1");
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\n128 of them were taken from the earlier run\n"));
  EXPECT_EQ(sobolCell(folder.read("basin_Sobol.dat"), {"objective", "fit", "first", "", "total"}, "Upper"),
            sobolCell(fresh.read("basin_Sobol.dat"), {"objective", "fit", "first", "", "total"}, "Upper"));
}

TEST(SobolRun, ThatEndsAsTooManyRunsFailSaysWhatItWouldWarnOf) {
  const SobolFunctionFolder folder("g", 8, 0.0, 1.0, "Sample_Size = 64");
  folder.write("model/parameters.tpl", folder.read("model/parameters.tpl") + "fail-share = 0.4\n");
  EXPECT_EQ(folder.run().exitCode, 1);
  const char* warning = "Note: [0-9]+ % of the model runs failed. Failures at random widen the limits";
  for (const char* file : {"basin.log", "basin_Sensitivity.dat"}) {
    EXPECT_THAT(folder.read(file), ::testing::ContainsRegex(warning)) << file;
  }
}

}  // namespace
}  // namespace mirevo::testing
