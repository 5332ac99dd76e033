#include <algorithm>
#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// Calibrations of three integer parameters with a model that counts its runs.
class Reuse : public ::testing::Test {
 protected:
  Reuse() { folder_.useScript(fmt::format("echo run >>'{}/runs'", folder_.path())); }

  /// `choice`: of a keyword row of MIREVO_SIMULATION_OPTION.
  std::string writeSetup(const RunSettings& settings, const std::string& choice) const {
    const std::string setup = folder_.writeSetup(settings);
    folder_.editSetup("Upper_Bound = 10.0\n      Transformation_Type = 0",
                      "Upper_Bound = 10.0\n"
                      "      Transformation_Type = 2");
    folder_.editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0",
                      "Upper_Bound = 5.0\n"
                      "      Transformation_Type = 2");
    folder_.editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0\n      Parameter_Type = 1",
                      "Upper_Bound = 5.0\n      Transformation_Type = 2\n      Parameter_Type = 0");
    folder_.editSetup("    Title =", "    " + choice + "\n    Title =");
    folder_.editSetup("End_Date = 2001-12-31", "End_Date = 2001-08-31");
    folder_.editSetup("    [OUTPUT_MEASURES]",
                      "    [VALIDATION_PERIODS]\n      TqSEKdxListItemCount = 1\n      [VALIDATION_1]\n"
                      "        Start_Date = 2001-09-01\n        End_Date = 2001-12-01\n      [/VALIDATION_1]\n"
                      "    [/VALIDATION_PERIODS]\n    [OUTPUT_MEASURES]");
    folder_.editSetup("Standard_Deviation = 0.1\n    [/PARAMETER_2]",
                      "Standard_Deviation = 0.1\n    [/PARAMETER_2]\n    [PARAMETER_3]\n      Mean_Value = 1.5\n"
                      "      Standard_Deviation = 0.5\n    [/PARAMETER_3]");
    return setup;
  }
  void run(const std::string& setup, int processes = 0) const {
    const ProgramResult result = processes == 0 ? runProgram({setup}) : startJob(processes, {setup}).wait();
    ASSERT_EQ(result.exitCode, 0) << result.error << log();
  }
  int takeRunCount() const {
    const int count = occurrences(folder_.read("runs"), "run");
    std::filesystem::remove(folder_ / "runs");
    return count;
  }
  ReadTable table(const RunSettings& settings) const { return readDataTable(folder_.read(settings.resultFile())); }
  std::string log() const { return folder_.read("basin.log"); }

  /// Takes the mark of repeats from the rows, after checking that each has the values of the row that it names.
  static int takeMarks(ReadTable& table) {
    if (table.columns.empty() || table.columns.back() != "Repeats") return 0;
    table.columns.pop_back();
    int count = 0;
    std::map<std::string, std::vector<std::string>> ownResults;
    for (std::vector<std::string>& row : table.rows) {
      const std::string original = row.back();
      row.pop_back();
      const std::vector<std::string> values(row.begin() + 1, row.end());
      if (original == "0") {
        ownResults[row[0]] = values;
      } else {
        EXPECT_EQ(values, ownResults[original]) << row[0];
        ++count;
      }
    }
    return count;
  }

  ModelFolder folder_;
};

/// What a run has left beside its rows that follows from results alone, by file; for a result file its `#` lines.
std::map<std::string, std::string> otherResults(const ModelFolder& folder, const std::string& resultFile) {
  std::map<std::string, std::string> found;
  for (const char* name : {"_Series.dat", "_Pairs.dat", "_Optimisation_Pairs.dat", "_Failures.dat",
                           "_Optimisation_Failures.dat", "_Band_1.csv", "_Quantiles.dat", "_SampleCorrelation.dat"}) {
    if (folder.exists(std::string("basin") + name)) found[name] = folder.read(std::string("basin") + name);
  }
  std::istringstream lines(withoutDates(folder.read(resultFile)));
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with('#')) found[resultFile] += line + "\n";
  }
  return found;
}

TEST_F(Reuse, NoSetIsRunTwiceAndTheRowsAreThoseOfModelRuns) {
  const std::tuple<const char*, RunSettings, int> cases[] = {
      {"SCE", {.algorithm = 0, .maxEvaluations = 60}, 0},
      {"SCE, surrogate, MPI", {.algorithm = 0, .usesSurrogate = true, .maxEvaluations = 60}, 4},
      {"PSE, 3 slots, scales", {.algorithm = 1, .aggregation = 1, .maxEvaluations = 60, .slots = 3}, 0},
      {"PSE, surrogate, MPI", {.algorithm = 1, .usesSurrogate = true, .maxEvaluations = 60}, 3},
      {"DDS", {.algorithm = 2, .maxEvaluations = 60}, 0},
      {"uncertainty, 3 slots", {.option = 3, .maxEvaluations = 60, .slots = 3}, 0},
      // No more failures than may be; they are run again, as a model run may fail by chance.
      {"PSE, failures", {.algorithm = 1, .maxEvaluations = 120, .slots = 2, .modelArguments = "--fail-above 9"}, 0},
  };
  for (const auto& [name, settings, processes] : cases) {
    SCOPED_TRACE(name);
    if (processes > 0 && !mpirunIsInstalled()) continue;
    run(writeSetup(settings, "Reuse_Results = 0"));
    ReadTable expected = table(settings);
    const auto others = otherResults(folder_, settings.resultFile());
    EXPECT_GE(others.size(), 3U);
    const int warnings = occurrences(log(), "Warning: ");
    const int finalRuns = settings.option == 2 ? 1 : 0;
    EXPECT_EQ(takeRunCount(), settings.maxEvaluations + finalRuns);
    EXPECT_EQ(takeMarks(expected), 0);
    EXPECT_THAT(folder_.read(settings.resultFile()), Not(HasSubstr("Repeats")));

    run(writeSetup(settings, "Report = 1"), processes);
    ReadTable found = table(settings);
    const int repeats = takeMarks(found);
    EXPECT_EQ(found.columns, expected.columns);
    EXPECT_EQ(found.rows, expected.rows);
    EXPECT_EQ(otherResults(folder_, settings.resultFile()), others);
    EXPECT_GT(repeats, 5);
    EXPECT_EQ(takeRunCount(), settings.maxEvaluations + finalRuns - repeats);
    const std::string account = folder_.read(settings.option == 2 ? "basin_Optimisation_Run.dat" : "basin_Run.dat");
    EXPECT_THAT(account, HasSubstr(fmt::format("\nrepeats\t{}\n", repeats)));
    EXPECT_THAT(log(), HasSubstr(fmt::format("\n{} of them have the result of an earlier evaluation", repeats)));
    EXPECT_THAT(folder_.read("basin_Report.html"), HasSubstr(fmt::format("\"repeats\":{}", repeats)));
    EXPECT_EQ(occurrences(log(), "Warning: "), warnings);
  }
}

TEST_F(Reuse, AKilledRunGoesOnToTheSameFile) {
  const RunSettings settings{.algorithm = 1, .maxEvaluations = 60, .slots = 2, .restart = 1};
  const std::string setup = writeSetup(settings, "Report = 0");
  run(setup);
  const std::string expected = withoutDates(folder_.read(settings.resultFile()));
  const std::string checksums = folder_.read("basin_Optimisation_Checksums.dat");
  const int runs = takeRunCount();
  // What a kill leaves: some rows, the last of which is cut; before and behind the first one that repeats another.
  const std::string rows = folder_.read(settings.resultFile());
  for (const char* last : {"\n12\t", "\n30\t", "\n59\t"}) {
    folder_.write(settings.resultFile(), rows.substr(0, rows.find(last) + 6));
    run(setup);
    EXPECT_EQ(withoutDates(folder_.read(settings.resultFile())), expected) << last;
    EXPECT_EQ(folder_.read("basin_Optimisation_Checksums.dat"), checksums) << last;
    EXPECT_LE(takeRunCount(), runs) << last;
  }
  // The marks stay when results are not reused any more, and no row is made again.
  folder_.editSetup("Report = 0", "Reuse_Results = 0");
  run(setup);
  EXPECT_EQ(withoutDates(folder_.read(settings.resultFile())), expected);
  EXPECT_EQ(takeRunCount(), 1);
  EXPECT_THAT(log(), HasSubstr("Reuse of results: none, the model is run for every set"));
}

TEST_F(Reuse, EveryListedRunIsMadeAndEveryFolderOfKeptFiles) {
  run(writeSetup({.option = 0, .scenarios = {"1, 2, 3", "4, 2, 1", "1, 2, 3"}}, "Reuse_Results = 1"));
  EXPECT_EQ(takeRunCount(), 3);
  EXPECT_THAT(log(), HasSubstr("Reuse of results: none, every listed run is made"));
  run(writeSetup({.option = 3, .maxEvaluations = 30, .savedFile = "model/simulated.csv"}, "Reuse_Results = 1"));
  EXPECT_EQ(takeRunCount(), 30);
  EXPECT_THAT(log(), HasSubstr("Reuse of results: none, as output files are kept of every model run"));
}

TEST_F(Reuse, AModelThatDrawsRandomNumbersIsFoundOut) {
  folder_.useScript(
      "echo \"fail-above = 1e9\" >>parameters.txt\nsed -i \"s/^a = .*/a = $(date +%N | tail -c 7)/\" "
      "parameters.txt");
  const ProgramResult result = runProgram({writeSetup({.algorithm = 1, .maxEvaluations = 60}, "Report = 0")});
  EXPECT_EQ(result.exitCode, 0) << result.error;
  EXPECT_THAT(result.error, HasSubstr("a model that draws random numbers needs Reuse_Results = 0"));
}

}  // namespace
}  // namespace mirevo::testing
