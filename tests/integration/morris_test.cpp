#include <algorithm>
#include <cmath>
#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// Of the table of a screening, the numbers of a column by parameter, in the rows of a kind.
std::map<std::string, double> columnOf(const std::string& text, const std::string& kind, const std::string& column) {
  std::map<std::string, double> values;
  const ReadTable table = readDataTable(text);
  for (const auto& row : table.rows) {
    if (row[0] == kind) values[row[2]] = realCell(row.at(table.column(column).value())).value();
  }
  return values;
}

/// Morris' function of 20 factors as a model: awk reads them one to a line and writes the value of the function. With a
/// file `failing`, which counts the runs, every tenth one fails.
constexpr const char* kMorrisModel = R"(#!/bin/sh
if test -e ../failing; then
  read n <../failing
  echo $((n + 1)) >../failing
  test $((n % 10)) = 0 && exit 3
fi
awk 'function small(k) { return sqrt(3) * (2 * (k * 0.6180339887498949 - int(k * 0.6180339887498949)) - 1) }
{ x[NR - 1] = $1 }
END {
  for (i = 0; i < 20; i++) {
    v = i == 2 || i == 4 || i == 6 ? 1.1 * x[i] / (x[i] + 0.1) : x[i]
    w[i] = 2 * (v - 0.5)
  }
  for (i = 0; i < 20; i++) {
    y += (i < 10 ? 20 : small(i)) * w[i]
    for (j = i + 1; j < 20; j++) y += (j < 6 ? -15 : small(20 * i + j)) * w[i] * w[j]
  }
  for (i = 0; i < 5; i++) for (j = i + 1; j < 5; j++) for (k = j + 1; k < 5; k++) y -= 10 * w[i] * w[j] * w[k]
  printf "%.9g\n", y + 5 * w[0] * w[1] * w[2] * w[3] >"value.txt"
}' parameters.txt
)";

class Morris : public ::testing::Test {
 protected:
  /// Makes the setup a screening of basin's model or, with `isOfFactors`, of the function above.
  void writeSetup(const std::string& keywords, bool isOfFactors = false, RunSettings settings = {.option = 1}) {
    setup_ = folder_.writeSetup(settings);
    std::string text = folder_.read("basin.kdx");
    const auto from = text.find("Sensitivity_Type = 0");
    text.replace(from, text.find("[/SENSITIVITY_ANALYSIS]") - from,
                 "Sensitivity_Type = 'Morris'\nRandom_Seed = 3\n[MORRIS]\n" + keywords + "\n[/MORRIS]\n");
    if (isOfFactors) {
      std::string sections;
      std::string lines = "!\n";
      for (int i = 1; i <= 20; ++i) {
        sections += fmt::format(
            "[PARAMETER_{0}]\nInitial_Value = 0.5\nLower_Bound = 0\nUpper_Bound = 1\nTransformation_Type = 0\n"
            "Parameter_Type = 0\nParameter_Name = 'x{0}'\n[/PARAMETER_{0}]\n",
            i);
        lines += fmt::format("!x{}               !\n", i);
      }
      const auto parameters = text.find("TqSEKdxListItemCount", text.find("[MODEL_PARAMETERS]"));
      text.replace(parameters, text.find("[INTERNAL_CONSTRAINTS]") - parameters,
                   "TqSEKdxListItemCount = 20\n" + sections);
      const auto file = text.find("File_Name = ''");
      text.replace(file, 14, "File_Name = 'model/value.txt'");
      const auto interface = text.find("Interface_Type = 0");
      text.replace(interface, 18, "Interface_Type = 1");
      folder_.write("model/parameters.tpl", lines);
      folder_.write("model/run.sh", kMorrisModel, 0755);
      folder_.write("model/value.txt", "0\n");
    }
    folder_.write("basin.kdx", text);
  }
  std::string table() const { return folder_.read("basin_Morris.dat"); }
  std::string log() const { return folder_.read("basin.log"); }

  ModelFolder folder_;
  std::string setup_;
};

TEST_F(Morris, FindsTheThreeGroupsOfTheFunctionOf20FactorsAlsoIfATenthOfTheRunsFails) {
  for (const auto& [design, isFailing] : {std::pair("radial", false), {"radial", true}, {"trajectories", true}}) {
    SCOPED_TRACE(fmt::format("{} {}", design, isFailing));
    writeSetup(fmt::format("Trajectories = 10\nDesign = '{}'\nNegligible_Share = 0.2", design), true);
    if (isFailing) folder_.write("failing", "1\n");
    const ProgramResult run = runProgram({setup_});
    ASSERT_EQ(run.exitCode, 0) << run.error;
    const auto muStar = columnOf(table(), "objective", "MuStar");
    const auto sigma = columnOf(table(), "objective", "Sigma");
    const auto rank = columnOf(table(), "objective", "Rank");
    const auto effects = columnOf(table(), "objective", "Effects");
    double lost = 0.0;
    for (int i = 1; i <= 20; ++i) {
      const std::string name = fmt::format("x{}", i);
      lost += 10.0 - effects.at(name);
      if (i <= 7) {
        EXPECT_GT(sigma.at(name), 0.25 * muStar.at(name)) << name;
        EXPECT_GT(muStar.at(name), 9.0) << name;
      } else if (i <= 10) {
        EXPECT_LT(sigma.at(name), 0.35 * muStar.at(name)) << name;
        EXPECT_NEAR(muStar.at(name), 40.0, 6.0) << name;
      } else {
        EXPECT_LT(muStar.at(name), 8.0) << name;
        EXPECT_GT(rank.at(name), 10.0) << name;
      }
    }
    EXPECT_THAT(log(), HasSubstr(fmt::format("\n210 model evaluations, {} of them failed\n", isFailing ? 21 : 0)));
    EXPECT_EQ(lost > 0.0, isFailing);
    EXPECT_TRUE(std::string(design) == "radial" || lost <= 2.0 * 21.0) << lost;
    EXPECT_THAT(log(), HasSubstr("\n   Can be fixed, with less than 20 % of the largest mu*: x"));
    EXPECT_THAT(log(), HasSubstr(" parameters in front are the same in"));
    std::filesystem::remove_all(folder_ / "basin_Process1");
  }
}

TEST_F(Morris, OfAnInterruptedRunKnowsTheEffectsThatAreThereAndARestartMakesTheSameTables) {
  // With a file `wait` the runs behind the twentieth one do not end.
  folder_.useScript(R"(n=1; test -e ../wait && while ! mkdir ../t$n; do n=$((n + 1)); done 2>/dev/null
while test -e ../wait && test $n -gt 20; do sleep 0.05; done)");
  writeSetup("Trajectories = 12", false, {.option = 1, .restart = 1});
  ASSERT_EQ(runProgram({setup_}).exitCode, 0) << log();
  const std::string expected = table();
  const std::string results = withoutDates(folder_.read("basin_Sensitivity.dat"));
  for (const bool isKilled : {false, true}) {
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      const std::string name = entry.path().filename().string();
      if (name.starts_with("basin") && name != "basin.kdx") std::filesystem::remove_all(entry.path());
    }
    folder_.write("wait", "");
    RunningProgram program({setup_});
    ASSERT_TRUE(waitUntil([&] { return std::ssize(readDataTable(folder_.read("basin_Sensitivity.dat")).rows) == 20; }));
    isKilled ? program.send(SIGKILL) : static_cast<void>(folder_.write("basin._kill_", ""));
    program.wait();
    if (!isKilled) {
      EXPECT_THAT(table(), HasSubstr("# Unfinished run: statistics of 20 of 36 evaluations\n"));
      EXPECT_EQ(columnOf(table(), "measure", "Effects"), (std::map<std::string, double>{{"a", 7}, {"b", 6}}));
      EXPECT_THAT(log(), HasSubstr("Warning: 16 evaluations were not made: 11 of 24 effects are left out"));
    }
    std::filesystem::remove(folder_ / "wait");
    for (int n = 1; n < 60; ++n) std::filesystem::remove(folder_ / fmt::format("t{}", n));
    ASSERT_EQ(runProgram({setup_}).exitCode, 0) << log();
    EXPECT_THAT(log(), HasSubstr("Restart: 20 evaluations are taken from"));
    EXPECT_EQ(table(), expected);
    EXPECT_EQ(withoutDates(folder_.read("basin_Sensitivity.dat")), results);
  }
}

TEST_F(Morris, RefusesAndWarnsOfDesignsThatCannotServe) {
  const std::pair<const char*, const char*> refusals[] = {
      {"Levels = 5", "Error: Number of levels in Morris analysis invalid"},
      {"Levels = 2", "Error: Number of levels in Morris analysis invalid"},
      {"Trajectories = 1", "Error: Number of trajectories in Morris analysis invalid"},
      {"Trajectories = 900000000", "Error: Number of trajectories in Morris analysis invalid"},
      {"Design = 'star'", "Design"},
  };
  for (const auto& [keywords, message] : refusals) {
    writeSetup(keywords);
    const ProgramResult run = runProgram({setup_});
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_THAT(run.error + log(), AllOf(HasSubstr(message), HasSubstr("basin.kdx:"))) << keywords;
  }
  writeSetup("Trajectories = 4\nLevels = 6\nCandidate_Designs = 5000");
  ASSERT_EQ(runProgram({setup_}).exitCode, 0);
  EXPECT_THAT(log(), AllOf(HasSubstr("Levels: has no effect without Design = 'trajectories'"),
                           HasSubstr("Candidate_Designs: has no effect without Design = 'trajectories'"),
                           HasSubstr("Distributions: PARAMETER_n of SENSITIVITY_ANALYSIS"),
                           HasSubstr("Sets outside the bounds of a parameter: 0 of "),
                           HasSubstr("Trajectories = 4: too few for limits"),
                           HasSubstr("Which parameters can be fixed is not said: that takes 5 effects of each")));

  EXPECT_THAT(log(), Not(HasSubstr("The parameters are correlated")));

  // What is computed of the effects needs no further model run.
  folder_.editSetup("Levels = 6", "Levels = 6\nBootstrap_Samples = 200\nNegligible_Share = 0.2");
  folder_.editSetup("Restart = 0", "Restart = 1");
  const ProgramResult again = runProgram({setup_});
  EXPECT_EQ(again.exitCode, 0) << again.error;
  EXPECT_THAT(log(), HasSubstr("\n12 of them were taken from the earlier run\n"));
}

TEST_F(Morris, TellsBeforeTheFirstRunThatParametersAreCorrelated) {
  writeSetup("Trajectories = 10");
  folder_.editSetup("[MORRIS]",
                    "[CORRELATIONS]\nTqSEKdxListItemCount = 1\n[PAIR_1]\nFirst_Parameter = 'a'\nSecond_Parameter = "
                    "'b'\nCorrelation = 0.8\n[/PAIR_1]\n[/CORRELATIONS]\n[MORRIS]");
  const std::string warning = "\nWarning: The parameters are correlated: a step takes those along";
  EXPECT_THAT(runProgram({"--check", setup_}).output, HasSubstr(warning));
  ASSERT_EQ(runProgram({setup_}).exitCode, 0);
  const auto told = log().find(warning);
  EXPECT_LT(told, log().find("No. 1 initiated"));
  EXPECT_EQ(log().find(warning, told + 1), std::string::npos) << "once";
}

}  // namespace
}  // namespace mirevo::testing
