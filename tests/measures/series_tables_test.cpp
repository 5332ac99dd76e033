#include "measures/series_tables.h"

#include <filesystem>
#include <fstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/fatal_error.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

const EvaluationPeriod kPeriod{{2001, 1, 1}, {2001, 12, 31}};

class SeriesTablesTest : public ::testing::Test {
 protected:
  void SetUp() override {
    folder_ = std::string(::testing::TempDir()) + "/series_tables_" +
              ::testing::UnitTest::GetInstance()->current_test_info()->name();
    std::filesystem::remove_all(folder_);
    std::filesystem::create_directories(folder_);
    write("obs.csv", "time,Q,H\n2001-01-01,1,2\n");
    write("sim.csv", "time,Q,H\n2001-01-01,3,4\n");
  }
  void TearDown() override { std::filesystem::remove_all(folder_); }

  std::string path(const std::string& name) const { return folder_ + "/" + name; }
  void write(const std::string& name, const std::string& content) const { std::ofstream(path(name)) << content; }
  OutputMeasure measure(const std::string& simulation, const std::string& observation, int simulationItem = 1) const {
    OutputMeasure m;
    m.simulation = {path(simulation), simulationItem};
    m.observation = {path(observation), 1};
    return m;
  }
  void expectFatal(const OutputMeasure& m, const std::string& message, const std::string& detail) const {
    try {
      SeriesTables::MirevoTSobjectInit(std::vector{m}, kPeriod);
      ADD_FAILURE() << "accepted: " << message;
    } catch (const FatalError& error) {
      EXPECT_EQ(error.message(), message);
      EXPECT_THAT(error.detail(), HasSubstr(detail));
    }
  }

  std::string folder_;
};

TEST_F(SeriesTablesTest, MeasuresShareTheFilesTheyNameAlike) {
  write("sim2.csv", "time,Q\n2001-01-01,9\n");
  OutputMeasure fromFile;
  fromFile.interfaceType = InterfaceType::measureFile;
  fromFile.simulation.fileName = path("not there");
  const std::vector<OutputMeasure> measures{measure("sim2.csv", "obs.csv"), fromFile, measure("sim.csv", "obs.csv  "),
                                            measure("sim2.csv  ", "obs.csv")};
  SeriesTables tables = SeriesTables::MirevoTSobjectInit(measures, kPeriod);
  EXPECT_THAT(tables.observationFileNames(), ElementsAre(path("obs.csv")));
  EXPECT_THAT(tables.simulationFileNames(), ElementsAre(path("sim2.csv"), path("sim.csv")));
  EXPECT_EQ(&tables.observation(0), &tables.observation(2));
  tables.openSimulationFiles(tables.simulationFileNames());
  EXPECT_EQ(&tables.simulation(0), &tables.simulation(3));
  EXPECT_EQ(tables.simulation(2).itemCount(), 2);
}

TEST_F(SeriesTablesTest, SetupFailuresEndTheRun) {
  expectFatal(measure("gone.csv", "obs.csv"), "Error opening TS object for file: " + path("gone.csv"),
              path("gone.csv") + ": No such file or directory");
  expectFatal(measure("sim.csv", "gone.csv "), "Error opening TS object for file: " + path("gone.csv"), "No such file");
  expectFatal(measure("sim.dat", "obs.csv"), "Error creating TS object for file: " + path("sim.dat"), ".csv");
  write("bad.csv", "time,Q\n2001-01-01,1,2\n");
  expectFatal(measure("sim.csv", "bad.csv"), "Error opening TS object for file: " + path("bad.csv"), "bad.csv:2:1:");
  expectFatal(measure("sim.csv", "obs.csv", 3), "Error: Item No. 3 not found in " + path("sim.csv"),
              "the file has 2 items\n1: Q\n2: H");
  write("text.csv", "time,Q\n2001-01-01,bad\n");
  expectFatal(measure("sim.csv", "text.csv"), "Error getting data of TS item in " + path("text.csv"), "text.csv:2:12:");
}

TEST_F(SeriesTablesTest, UnusableResultsOfARunAreAReasonAndNoError) {
  SeriesTables tables = SeriesTables::MirevoTSobjectInit(std::vector{measure("sim.csv", "obs.csv", 2)}, kPeriod);
  struct Case {
    const char* content;
    std::string reason;  // empty: usable
  };
  const Case cases[] = {
      {"time,Q,H\n2001-01-01,,5\n", ""},
      {"time,Q,H\n2001-01-01,A:e,5\n", ""},  // a column that no measure reads
      {"time,Q,H\n", ": expected at least one time step, found none"},
      {"", ":1:1: expected a header row"},
      {"time,Q,H\n2001-01-01,1,\n2001-01-02,1,NaN\n", ": item No. 2 (H) has missing values only"},
      {"# missing = 7\ntime,Q,H\n2001-01-01,1,7\n", ": item No. 2 (H) has missing values only"},
      {"time,Q,H\n2001-01-01,1,****\n", ":2:14: expected a number"},
      {"time,Q,H\n2001-01-01,1,2\n2001-01", ":3:1: expected a valid time"},
      {"time,Q,H\n2001-01-01,1,6\n", ""},
  };
  for (const Case& c : cases) {
    write("slot.csv", c.content);
    const auto reason = tables.tryOpenSimulationFiles(std::vector{path("slot.csv")});
    ASSERT_EQ(reason.has_value(), !c.reason.empty()) << c.content << reason.value_or("");
    if (reason) {
      EXPECT_THAT(*reason, HasSubstr(path("slot.csv") + c.reason));
      EXPECT_EQ(reason->find('\n'), std::string::npos);
    } else {
      EXPECT_EQ(tables.simulation(0).timeStepCount(), 1);
    }
  }
  tables.releaseSimulationFiles();
  EXPECT_THAT(tables.tryOpenSimulationFiles(std::vector{path("gone.csv")}).value(), HasSubstr("No such file"));
  EXPECT_THROW(tables.openSimulationFiles(std::vector{path("gone.csv")}), FatalError);
}

}  // namespace
}  // namespace mirevo
