// Imported cases are run by the program, with a small model in a shell.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "import/import_sources.h"
#include "integration/program_runner.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

class ImportedRun : public ::testing::Test {
 protected:
  ProgramResult import(const std::string& source) {
    return RunningProgram({folder_ / source, folder_ / "made"}, {}, MIREVO_IMPORT).wait();
  }
  /// The first and the best aggregate of the setup's search.
  std::pair<double, double> search(const std::string& name) {
    const ProgramResult run = RunningProgram({folder_ / ("made/" + name + ".kdx")}).wait();
    EXPECT_EQ(run.exitCode, 0) << run.error << folder_.read("made/" + name + ".log");
    std::istringstream rows(folder_.read("made/" + name + "_Optimisation.dat"));
    std::vector<double> aggregates;
    std::ptrdiff_t column = -1;
    for (std::string row; std::getline(rows, row);) {
      std::istringstream line(row);
      std::vector<std::string> cells;
      for (std::string cell; std::getline(line, cell, '\t');) cells.push_back(cell);
      if (row.starts_with("Evaluation\t")) {
        column = std::find(cells.begin(), cells.end(), "Aggregate") - cells.begin();
      } else if (cells.size() > 1 && cells[1] == "OK") {
        aggregates.push_back(std::stod(cells.at(static_cast<std::size_t>(column))));
      }
    }
    EXPECT_FALSE(aggregates.empty());
    if (aggregates.empty()) return {};
    return {aggregates.front(), *std::min_element(aggregates.begin(), aggregates.end())};
  }

  TemporaryFolder folder_;
};

TEST_F(ImportedRun, OfPestHasItsParametersFilesAndSumOfSquares) {
  writePestModel(folder_, "src");
  folder_.write("src/case.pst", kPestCase);
  const ProgramResult made = import("src/case.pst");
  EXPECT_EQ(made.exitCode, 0) << made.error;
  EXPECT_THAT(made.output, HasSubstr("case.pst:9: the search by derivatives has no counterpart"));
  const auto [first, best] = search("case");
  // k1 = 1, k2 = 2, k3 = 4, k5 = 15: (1 - 3)^2 + (2 (6 - 12))^2 + (0.5 * 0.477)^2; 15 is below its bound of 20.
  EXPECT_NEAR(first, 4 + 144 + 0.2385 * 0.2385, 1e-9);
  EXPECT_LT(best, 5.0);
  EXPECT_EQ(import("src/case.pst").exitCode, 1) << "the folder exists";

  // The covariance says what it leaves out.
  std::string text = folder_.read("made/case.kdx");
  const std::size_t section = text.find("[LOCAL_SA]") + 10;
  folder_.write("made/covariance.kdx", text.insert(section, "\nCalculate_Covmatrix = 1"));
  const std::string option = "Option = 'optimisation'";
  ASSERT_NE(text.find(option), std::string::npos);
  folder_.write("made/covariance.kdx", text.replace(text.find(option), option.size(), "Option = 'sensitivity'"));
  const ProgramResult run = RunningProgram({folder_ / "made/covariance.kdx"}).wait();
  EXPECT_EQ(run.exitCode, 0) << run.error;
  EXPECT_THAT(
      folder_.read("made/covariance.log"),
      AllOf(HasSubstr("The covariance is of time series alone: 4 output measures with Observed_Value are not in it"),
            HasSubstr("No covariance matrix: no objective function compares time series")));
}

TEST_F(ImportedRun, OfVersionTwoHasTheSame) {
  writePestModel(folder_, "src");
  folder_.write("src/case.pst", R"(pcf version=2
* control data keyword
noptmax 10
rand_seed 5
* parameter groups external
groups.csv
* parameter data external
parameters.csv
* observation data external
observations.csv
* model command line
sh model.sh
* model input external
inputs.csv
* model output external
outputs.csv
)");
  folder_.write("src/groups.csv", "pargpnme,inctyp,derinc\nk,relative,0.01\n");
  folder_.write(
      "src/parameters.csv",
      "parnme,partrans,parchglim,parval1,parlbnd,parubnd,pargp,partied\nk1,log,factor,1,0.01,100,k,\n"
      "k2,none,factor,2,0,10,k,\nk3,tied,factor,4,0,10,k,k2\nk4,fixed,factor,7,0,10,k,\nk5,fixed,factor,15,0,20,k,\n");
  folder_.write("src/observations.csv",
                "obsnme,obsval,weight,obgnme,x\nh1,3,1,head,7\nh2,12,2,head,7\nh3,20,0,head,7\nh4,99,0,head,7\n");
  folder_.write("src/inputs.csv", "pest_file,model_file\nin.tpl,in.dat\n");
  folder_.write("src/outputs.csv", "pest_file,model_file\nout.ins,out.dat\n");
  const ProgramResult made = import("src/case.pst");
  EXPECT_EQ(made.exitCode, 0) << made.error;
  EXPECT_THAT(made.output, HasSubstr("observations.csv:1: the columns x"));
  const auto [first, best] = search("case");
  EXPECT_NEAR(first, 4 + 144, 1e-9);
  EXPECT_LT(best, 5.0);
}

TEST_F(ImportedRun, OfOstrichHasItsParametersAndColumns) {
  writeOstrichModel(folder_, "src");
  folder_.write("src/ostIn.txt", kOstrichCase);
  const ProgramResult made = import("src/ostIn.txt");
  EXPECT_EQ(made.exitCode, 0) << made.error;
  const auto [first, best] = search("ostIn");
  // p_a = 1, p_b = 2, p_t = 5, p_n = 2: (1 - 3)^2 + (2 (7 - 12))^2 + (2 - 2)^2
  EXPECT_NEAR(first, 4 + 100, 1e-9);
  EXPECT_LT(best, 20.0);
}

TEST_F(ImportedRun, IsRefusedWithThePlace) {
  folder_.write("src/ostIn.txt", "ProgramType DDS\n");
  folder_.write("src/case.pst", "nothing\n");
  using Arguments = std::vector<std::string>;
  const std::pair<Arguments, const char*> cases[] = {
      {Arguments{folder_ / "src/ostIn.txt", folder_ / "made"},
       "ostIn.txt: expected a parameter between BeginParams and EndParams"},
      {Arguments{folder_ / "src/case.pst", folder_ / "made"}, "case.pst:1: expected \"pcf\" in the first line"},
      {Arguments{folder_ / "src/none.pst"}, "Error: Unable to open"},
      {Arguments{"--what"}, "Unknown option \"--what\""},
      {Arguments{}, "Usage: mirevo-import"},
  };
  for (const auto& [arguments, expected] : cases) {
    const ProgramResult run = RunningProgram(arguments, {}, MIREVO_IMPORT).wait();
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_THAT(run.error, HasSubstr(expected));
    EXPECT_FALSE(folder_.exists("made"));
  }
  EXPECT_THAT(RunningProgram({"--help"}, {}, MIREVO_IMPORT).wait().output, HasSubstr("Usage: mirevo-import"));
}

/// Control files that others have written, imported and read by the program: what they run is not there.
TEST_F(ImportedRun, OfRealControlFilesIsASetupThatTheProgramAccepts) {
  const char* const samples = std::getenv("MIREVO_IMPORT_SAMPLES");
  if (samples == nullptr || *samples == 0) GTEST_SKIP() << "MIREVO_IMPORT_SAMPLES names no folder of samples";
  for (const std::string source :
       {"xsec10/pest.pst", "secondary_marker/test.pst", "tplins/pest.pst", "pst_version2/control.pst"}) {
    const std::string control = std::string(samples) + "/pest/" + source;
    std::filesystem::remove_all(folder_ / "made");
    const ProgramResult made = RunningProgram({control, folder_ / "made"}, {}, MIREVO_IMPORT).wait();
    ASSERT_EQ(made.exitCode, 0) << source << made.error;
    const std::string name = std::filesystem::path(source).stem().string();
    folder_.write("made/model/mirevo_run.sh", "exit 3\n");
    const ProgramResult run = RunningProgram({folder_ / ("made/" + name + ".kdx")}).wait();
    EXPECT_THAT(run.error, HasSubstr("mirevo_run.sh exited with code 3")) << source;
  }
}

}  // namespace
}  // namespace mirevo::testing
