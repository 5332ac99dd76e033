// What a report takes from the tables of Markov chains, as the program writes them.
#include "report/report_posterior.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/bayes/posterior.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/data_table.h"
#include "common/run_files.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr double kPriorWidth = 20.0;

/// Chains of two dimensions with hostile names: x normal around 3, y = 2 x with noise, on a prior of width 20.
class PosteriorFiles {
 public:
  explicit PosteriorFiles(int mostRuns, double burnInShare = 0.2, std::size_t matrixLimit = 1000,
                          bool isPossible = true) {
    settings.mostRuns = mostRuns;
    settings.burnInShare = burnInShare;
    DreamProblem problem;
    problem.lower = {-10.0, -10.0};
    problem.upper = {10.0, 10.0};
    problem.modelParameterCount = 1;
    problem.drawPrior = [](std::span<const double> unit) {
      return std::vector<double>{kPriorWidth * (unit[0] - 0.5), kPriorWidth * (unit[1] - 0.5)};
    };
    problem.logPrior = [](std::span<const double>) { return -2.0 * std::log(kPriorWidth); };
    int runs = 0;
    problem.evaluate = [runs, isPossible](std::span<const DreamProposal> proposals) mutable {
      std::vector<ProposalResult> results;
      for (const DreamProposal& one : proposals) {
        const double x = one.point[0] - 3.0;
        const double y = one.point[1] - 2.0 * one.point[0];
        const double density = -0.5 * x * x - 0.5 * y * y / 0.04;
        results.push_back({isPossible ? density : -std::numeric_limits<double>::infinity(), ++runs});
      }
      return results;
    };
    DreamSampler sampler(settings, problem, 7);
    while (!sampler.isFinished()) sampler.advance();
    counts = sampler.parallelCounts();
    counts.proposals += sampler.snookerCounts().proposals;
    counts.accepted += sampler.snookerCounts().accepted;
    const ShownDimensions dimensions{{"x\t# \"it\"", "y"}, 1, [](std::span<const double> point) {
                                       return std::vector<double>(point.begin(), point.end());
                                     }};
    std::vector<std::vector<double>> prior;
    for (int i = 0; i < 200; ++i) prior.push_back({0.1 * (i - 99.5), 0.1 * (i - 99.5)});
    summary = summarisePosterior(sampler, dimensions, prior, matrixLimit);
    write(chainsTable(sampler, dimensions));
    if (!summary) return;
    write(posteriorTable(*summary, dimensions));
    write(marginalsTable(sampler, dimensions, prior));
    write(convergenceTable(sampler, dimensions));
    write(posteriorCorrelationTable(*summary, dimensions));
  }

  std::optional<ReportedPosterior> reported() {
    faults.clear();
    return reportedPosterior(folder / "basin", settings, 1, faults);
  }

  DreamSettings settings;
  TemporaryFolder folder;
  DreamCounts counts;
  std::optional<PosteriorSummary> summary;
  std::vector<std::string> faults;

 private:
  void write(const DataTable& table) { folder.write(runFilePath("basin", table.file), dataTableText(table)); }
};

TEST(ReportedPosterior, IsThatOfTheChainsToTheLastBit) {
  PosteriorFiles files(12'000);
  const auto found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_THAT(files.faults, IsEmpty());
  EXPECT_TRUE(found->hasPosterior);
  EXPECT_EQ(found->stateCount, files.summary->draws);
  EXPECT_DOUBLE_EQ(found->acceptance, files.counts.rate());
  EXPECT_EQ(found->correlations, files.summary->correlations);
  ASSERT_EQ(found->dimensions.size(), 2U);
  for (std::size_t j = 0; j < 2; ++j) {
    const ReportedDimension& own = found->dimensions[j];
    const PosteriorSummary::Dimension& expected = files.summary->dimensions[j];
    EXPECT_EQ(own.isOfErrors, j == 1);
    EXPECT_EQ(own.quantiles, expected.quantiles);
    EXPECT_EQ(own.priorQuantiles, expected.priorQuantiles);
    EXPECT_EQ(own.rHat, expected.rHat);
    EXPECT_EQ(own.rHats.back(), expected.rHat);
    EXPECT_EQ(own.effectiveSizes.size(), found->checkedRuns.size());
    EXPECT_EQ(own.mostProbable, files.summary->mostProbable[j]);
    double all = 0.0;
    for (const double share : own.posterior) all += share;
    EXPECT_NEAR(all, 1.0, 1e-9);
    EXPECT_EQ(own.edges.size(), own.posterior.size() + 1);
    EXPECT_EQ(own.draws.size(), 600U);
    EXPECT_EQ(own.traces.size(), 4U);
    EXPECT_EQ(own.traces[0].size(), found->generations.size());
  }
  EXPECT_EQ(found->dimensions[0].name, "x\t# \"it\"");
  // x has the standard deviation 1, a 5 to 95 % range of 3.29, on a prior with one of 18.
  EXPECT_NEAR(found->dimensions[0].narrowing, 3.29 / 18.0, 0.03);
  EXPECT_LE(found->generations.size(), 501U);
  EXPECT_EQ(found->generations.back(), static_cast<double>(found->generationCount)) << "the last one is drawn";

  JsonWriter json;
  json.beginObject();
  writePosterior(json, *found);
  const std::string text = json.endObject().take();
  for (const char* const part :
       {"and y trade off: a correlation of 0.99", "\"state\":\"reached\",\"findings\":[\"The chains have converged"}) {
    EXPECT_NE(text.find(part), std::string::npos) << part;  // without the whole text
  }
}

TEST(ReportedPosterior, ShowsWhatIsThereOfFilesThatAreCutOffOrMissing) {
  PosteriorFiles files(4'000);
  const auto path = [](const RunFile& file) { return runFilePath("basin", file); };
  const std::string chains = files.folder.read(path(run_files::kChains));
  const std::size_t generations = files.reported()->generationCount;
  files.folder.write(path(run_files::kChains), chains.substr(0, chains.size() - 20));
  auto found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_EQ(found->generationCount, generations - 1);
  EXPECT_THAT(files.faults, ElementsAre(HasSubstr("basin_Chains.dat is cut off or damaged: ")));

  // A row in the middle that is gone ends what can be read: behind it, states would be those of other chains.
  const std::size_t middle = chains.find('\n', chains.size() / 2) + 1;
  files.folder.write(path(run_files::kChains), chains.substr(0, middle) + chains.substr(chains.find('\n', middle) + 1));
  found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_LT(found->generationCount, generations * 2 / 3);
  files.folder.write(path(run_files::kChains), chains);

  for (const RunFile* file : {&run_files::kMarginals, &run_files::kConvergence, &run_files::kSampleCorrelation}) {
    const std::string text = files.folder.read(path(*file));
    for (const std::string& damaged :
         {std::string("# nothing\n"), text.substr(0, text.rfind('\n', text.size() - 2)), std::string("a\tb\n1\t2\n")}) {
      files.folder.write(path(*file), damaged);
      found = files.reported();
      ASSERT_TRUE(found);
      EXPECT_TRUE(found->hasPosterior);
      EXPECT_LE(files.faults.size(), 1U);
      for (const ReportedDimension& own : found->dimensions) {
        EXPECT_EQ(own.rHats.size(), own.rHats.empty() ? 0 : found->checkedRuns.size());
        EXPECT_EQ(own.edges.size(), own.posterior.empty() ? 0 : own.posterior.size() + 1);
      }
    }
    std::filesystem::remove(files.folder / path(*file));
    found = files.reported();
    EXPECT_THAT(files.faults,
                ElementsAre(path(*file) + " cannot be read, and what it has is not shown: No such file or directory"));
    files.folder.write(path(*file), text);
  }
  files.folder.write(path(run_files::kPosterior), "# nothing\n");
  found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_FALSE(found->hasPosterior);
  EXPECT_FALSE(found->dimensions[0].draws.empty());
  EXPECT_THAT(files.faults, ElementsAre("basin_Posterior.dat is cut off or damaged, and what it has is not shown"));

  for (const std::string& damaged : {std::string(), chains.substr(0, 30), std::string("a\tb\n1\t2\n")}) {
    files.folder.write(path(run_files::kChains), damaged);
    EXPECT_FALSE(files.reported());
    EXPECT_THAT(files.faults, ElementsAre("The chains are not shown: basin_Chains.dat is damaged"));
  }
}

TEST(ReportedPosterior, OfMoreDimensionsThanAMatrixIsKeptOfHasTheTradeOffsOfThePairs) {
  PosteriorFiles files(4'000, 0.2, 1);
  const auto found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_THAT(files.faults, IsEmpty());
  EXPECT_THAT(found->correlations, IsEmpty());
  JsonWriter json;
  json.beginObject();
  writePosterior(json, *found);
  EXPECT_THAT(json.endObject().take(), HasSubstr("and y trade off: a correlation of 0.99"));
}

TEST(ReportedPosterior, OfARunThatEndedInBurnInHasTheChainsAlone) {
  PosteriorFiles files(40, 0.9);
  const auto found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_THAT(files.faults, IsEmpty());
  EXPECT_FALSE(found->hasPosterior);
  EXPECT_EQ(found->dimensions[1].traces.size(), 4U);
  JsonWriter json;
  json.beginObject();
  writePosterior(json, *found);
  EXPECT_THAT(json.endObject().take(), ::testing::Not(HasSubstr("\"state\"")));
}

TEST(ReportedPosterior, OfChainsWithoutALikelihoodShowsNothingOfTheirStates) {
  PosteriorFiles files(400, 0.2, 1000, false);
  const auto found = files.reported();
  ASSERT_TRUE(found);
  EXPECT_THAT(files.faults, IsEmpty()) << "the tables that are not there are none that are missing";
  EXPECT_EQ(found->stateCount, 0U);
  for (const ReportedDimension& one : found->dimensions) {
    EXPECT_THAT(one.draws, IsEmpty());
    EXPECT_THAT(one.traces, IsEmpty());
  }
  JsonWriter json;
  json.beginObject();
  writePosterior(json, *found);
  const std::string text = json.endObject().take();
  EXPECT_THAT(text, HasSubstr("\"findings\":[\"There is no posterior: no model run has a likelihood"));
  EXPECT_THAT(text, HasSubstr("\"advice\":[]"));
}

}  // namespace
}  // namespace mirevo
