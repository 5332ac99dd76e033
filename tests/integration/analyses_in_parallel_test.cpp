#include <filesystem>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/text.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

/// An analysis in place of the one that the setup of the tests has.
struct ParallelAnalysis {
  const char* name;
  int option;
  const char* from;  ///< the first text that is replaced ...
  const char* upTo;  ///< ... up to this one
  std::string with;
  std::vector<std::string> files;
};

std::vector<ParallelAnalysis> parallelAnalyses() {
  const char* const sensitivity = "Sensitivity_Type = 0";
  const char* const sensitivityEnd = "[/SENSITIVITY_ANALYSIS]";
  const char* const sampling = "Uncertainty_Type = 1";
  const char* const samplingEnd = "[/UNCERTAINTY_ESTIMATION]";
  return {
      {"Sobol",
       1,
       sensitivity,
       sensitivityEnd,
       "Sensitivity_Type = 'Sobol'\n[SOBOL]\nSample_Size = 32\n[/SOBOL]\n",
       {"basin_Sensitivity.dat", "basin_Sobol.dat", "basin_SobolConvergence.dat", "basin_SobolSeries_1.csv"}},
      {"Morris",
       1,
       sensitivity,
       sensitivityEnd,
       "Sensitivity_Type = 'Morris'\n[MORRIS]\nTrajectories = 20\n[/MORRIS]\n",
       {"basin_Sensitivity.dat", "basin_Morris.dat"}},
      {"GLUE",
       3,
       sampling,
       samplingEnd,
       "Uncertainty_Type = 'GLUE'\nSample_Size = 120\n[GLUE]\nBehavioural_Share = 0.3\n[/GLUE]\n",
       {"basin.dat", "basin_Glue.dat", "basin_Quantiles.dat", "basin_SampleSensitivities.dat", "basin_Band_1.csv"}},
      {"DREAM",
       3,
       sampling,
       samplingEnd,
       "Uncertainty_Type = 'DREAM'\nSample_Size = 120\n[DREAM]\nLikelihood = 'AR(1)'\n[/DREAM]\n",
       {"basin.dat", "basin_Chains.dat", "basin_Posterior.dat", "basin_Marginals.dat", "basin_Band_1.csv",
        "basin_TotalBand_1.csv"}},
  };
}

std::string writeAnalysis(const ModelFolder& folder, const ParallelAnalysis& analysis, int slots) {
  folder.writeSetup({.option = analysis.option, .slots = slots});
  std::string text = folder.read("basin.kdx");
  const auto begin = text.find(analysis.from);
  text.replace(begin, text.find(analysis.upTo, begin) - begin, analysis.with);
  return folder.write("basin.kdx", text);
}

/// Name and rows of each file; what a run says of itself above its rows is of the day.
std::string rowsOf(const ModelFolder& folder, const std::vector<std::string>& files) {
  std::string rows;
  for (const std::string& file : files) {
    rows += file + "\n";
    const std::string text = folder.read(file);
    for (const std::string_view line : splitLines(text)) {
      if (!line.starts_with('#')) rows += std::string(line) + "\n";
    }
  }
  return rows;
}

// Model runs that end in another order than they began, in slots and on the workers of a job.
TEST(AnalysesInParallel, HaveTheSameTablesWhateverTheSlotsAndRanks) {
  for (const ParallelAnalysis& analysis : parallelAnalyses()) {
    SCOPED_TRACE(analysis.name);
    const ModelFolder folder;
    folder.useScript(kSleepByParameters);
    ASSERT_EQ(runProgram({writeAnalysis(folder, analysis, 1)}).exitCode, 0) << folder.read("basin.log");
    const std::string ofOneSlot = rowsOf(folder, analysis.files);
    EXPECT_GT(splitLines(ofOneSlot).size(), 3 * analysis.files.size());
    ASSERT_EQ(runProgram({writeAnalysis(folder, analysis, 5)}).exitCode, 0) << folder.read("basin.log");
    EXPECT_EQ(rowsOf(folder, analysis.files), ofOneSlot) << "5 slots";
    if (!mpirunIsInstalled()) continue;
    for (const int processes : {2, 4}) {
      const ProgramResult job = startJob(processes, {writeAnalysis(folder, analysis, 1)}).wait();
      ASSERT_EQ(job.exitCode, 0) << job.error << folder.read("basin.log");
      EXPECT_EQ(rowsOf(folder, analysis.files), ofOneSlot) << processes << " processes";
    }
  }
}

}  // namespace
}  // namespace mirevo::testing
