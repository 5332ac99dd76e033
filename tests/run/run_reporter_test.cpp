#include "run/run_reporter.h"

#include <cmath>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/text.h"
#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

class RunReporterTest : public ::testing::Test {
 protected:
  RunReporterTest() {
    space_.names = {"k"};
    space_.initial = space_.lower = {0.0};
    space_.upper = {10.0};
    space_.transformation = {TransformationType::logarithmic};
    std::string reason;
    state_.log.open((folder_ / "s.log"), reason);
    state_.progress.progressInit((folder_ / "s.log"), "");
    state_.progress.progressEvaluationLabel(4);
    results_.open((folder_ / "s.dat"), {}, {{"k"}, {}, {"fit"}});
  }

  void finish(int number, double objective, double set = 0.0) {
    EvaluationResult result;
    result.number = number;
    result.objectiveValues = {objective};
    result.aggregate = objective;
    if (objective == kFailedRunValue) {
      result.failure = EvaluationFailure{EvaluationFailure::Kind::exitCode, "run.sh exited with code 3", {}};
    }
    reporter_.recordEvaluation(std::span(&set, 1), result);
    reporter_.evaluationFinished(std::span(&set, 1), result);
  }

  TemporaryFolder folder_;
  RunState state_;
  SearchSpace space_;
  ResultFile results_;
  FailedRunFile failedRuns_{{folder_ / "calSimErr.dat", folder_ / "s_Failures.dat"}, "s", {"k"}, {"Title"}};
  RunReporter reporter_{state_, results_, failedRuns_, space_};
};

TEST_F(RunReporterTest, TheBestIsTheFirstOfEqualsAndNeverAFailure) {
  finish(1, kFailedRunValue);
  EXPECT_FALSE(reporter_.best());
  finish(4, 5.0, std::log(3.0));
  finish(3, 5.0, std::log(2.0));
  finish(5, 6.0);
  ASSERT_TRUE(reporter_.best());
  EXPECT_EQ(reporter_.best()->number, 3);
  EXPECT_DOUBLE_EQ(reporter_.best()->parameterValues.at(0), 2.0);
}

TEST_F(RunReporterTest, TheBestOfASearchIsTheOneThatItTook) {
  finish(1, 5.0);
  finish(2, 5.0, std::log(2.0));
  SearchSummary search;
  search.best = {std::log(2.0)};
  search.bestResult.number = 2;
  search.bestResult.aggregate = 5.0;
  search.bestResult.failure = EvaluationFailure{};
  reporter_.takeBestOf(search);
  EXPECT_EQ(reporter_.best()->number, 1) << "a search that found nothing";
  search.bestResult.failure.reset();
  reporter_.takeBestOf(search);
  finish(3, 4.0, std::log(2.0));  // the final model run of a model that does not repeat itself
  EXPECT_EQ(reporter_.best()->number, 2);
  EXPECT_DOUBLE_EQ(reporter_.best()->parameterValues.at(0), 2.0);
}

TEST_F(RunReporterTest, AggregatesUnknownOnArrivalAreFilledInWhenTheTransformationIsSettled) {
  ObjectiveFunction fit;
  fit.name = "fit";
  ObjectiveAggregator aggregator(std::span(&fit, 1), AggregationMethod::commonDistance);
  ASSERT_FALSE(aggregator.isSettled());
  const auto arrive = [&](int number, double objective) {
    EvaluationResult result;
    result.number = number;
    result.objectiveValues = {objective};
    result.aggregate = aggregator.aggregate(result.objectiveValues);
    const double set = 0.0;
    reporter_.recordEvaluation(std::span(&set, 1), result);
    reporter_.evaluationFinished(std::span(&set, 1), result);
    return result.objectiveValues;
  };
  const std::vector<std::vector<double>> sample{arrive(1, 4.0), arrive(2, 2.0), arrive(3, 9.0)};
  EXPECT_FALSE(reporter_.best());
  aggregator.fit(sample);
  arrive(4, 3.0);
  reporter_.settle(aggregator);
  ASSERT_TRUE(reporter_.best());
  EXPECT_EQ(reporter_.best()->number, 2);
  std::string reason;
  ASSERT_TRUE(results_.finish({}, reason)) << reason;
  const std::string text = folder_.read("s.dat");
  for (const double objective : {4.0, 2.0, 9.0, 3.0}) {
    const std::vector<double> values{objective};
    EXPECT_THAT(text, HasSubstr(fmt::format("\t{}\t{}\n", objective, formatReal(aggregator.aggregate(values)))));
  }
}

TEST_F(RunReporterTest, AnEvaluationReachesResultFileLogProgressAndTheFileOfFailures) {
  reporter_.message("Evaluation of parameter set No. 1 initiated");
  finish(1, 2.5);
  finish(2, kFailedRunValue);
  EXPECT_THAT(folder_.read("s.dat"), HasSubstr("1\tOK\t1\t2.5\t2.5\n2\tFAILED\t1\t1e+30\t1e+30\n"));
  EXPECT_EQ(folder_.read("s.log"), "Evaluation of parameter set No. 1 initiated\n   run.sh exited with code 3\n");
  EXPECT_THAT(folder_.read("s._spi_"), HasSubstr("MESSAGEvaluation of parameter set No. 1 initiated\n"));
  EXPECT_THAT(folder_.read("s._spi_"), HasSubstr("PROGRE50.0\n"));
  EXPECT_THAT(folder_.read("calSimErr.dat"),
              HasSubstr("Evaluation No. 2 (batch ended with an exit code)\n   run.sh exited with code 3\n   k = 1\n"));
  EXPECT_EQ(folder_.read("s_Failures.dat"),
            "# Title\nEvaluation\tKind\tReason\tOutput\n2\texitCode\trun.sh exited with code 3\t\n");
  EXPECT_EQ(reporter_.failedCount(), 1);
  EXPECT_EQ(reporter_.initial(), 1);
  EXPECT_EQ(state_.objectiveValues, std::vector<double>{kFailedRunValue});
}

}  // namespace
}  // namespace mirevo
