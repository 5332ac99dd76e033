#include "run/run_reporter.h"

#include <cmath>
#include <tuple>

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
    std::string reason;
    state_.log.open((folder_ / "s.log"), reason);
    state_.progress.progressInit((folder_ / "s.log"), "");
    state_.progress.progressEvaluationLabel(4);
    results_.open((folder_ / "s.dat"), {}, {{"k"}, {}, {"fit"}});
  }

  void finish(int number, double objective, double set = 0.0) {
    EvaluationResult result{.number = number, .objectiveValues = {objective}, .aggregate = objective};
    if (objective == kFailedRunValue) {
      result.failure = EvaluationFailure{EvaluationFailure::Kind::exitCode, "run.sh exited with code 3", {}};
    }
    report(result, set);
  }
  void report(const EvaluationResult& result, double set = 0.0) {
    reporter_.recordEvaluation(std::span(&set, 1), result);
    reporter_.evaluationFinished(std::span(&set, 1), result);
  }

  TemporaryFolder folder_;
  RunState state_;
  SearchSpace space_{{"k"}, {0.0}, {0.0}, {10.0}, {TransformationType::logarithmic}};
  ResultFile results_{folder_ / "s_Checksums.dat", {"Title"}};
  FailedRunFile failedRuns_{{folder_ / "calSimErr.dat", folder_ / "s_Failures.dat"}, "s", {"k"}, {"Title"}};
  PairsFile pairs_{folder_ / "s_Pairs.dat", {"Title"}};
  RunReporter reporter_{state_, results_, failedRuns_, space_, nullptr, &pairs_};
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

TEST_F(RunReporterTest, ASuccessThatIsNoBetterThanAFailureIsWarnedOfOnce) {
  for (int number = 1; const double aggregate : {kFailedRunValue, 9e29, 2e30, 3e30}) finish(number++, aggregate);
  EXPECT_THAT(state_.log.warnings(),
              testing::ElementsAre(HasSubstr("No. 3 succeeded with the aggregate 2e+30: failed ones have 1e+30 and")));
}

TEST_F(RunReporterTest, TheBestOfASearchIsTheOneThatItTook) {
  finish(1, 5.0);
  finish(2, 5.0, std::log(2.0));
  SearchSummary search{.best = {std::log(2.0)}, .bestResult = {.number = 2, .aggregate = 5.0}};
  search.bestResult.failure = EvaluationFailure{};
  reporter_.takeBestOf(search);
  EXPECT_EQ(reporter_.best()->number, 1) << "a search that found nothing";
  search.bestResult.failure.reset();
  reporter_.takeBestOf(search);
  finish(3, 4.0, std::log(2.0));  // the final model run of a model that does not repeat itself
  EXPECT_EQ(reporter_.best()->number, 2);
  EXPECT_DOUBLE_EQ(reporter_.best()->parameterValues.at(0), 2.0);
}

TEST_F(RunReporterTest, AFinalRunWithOtherResultsThanTheBestIsTold) {
  std::string reason;
  ASSERT_TRUE(results_.finish({}, reason)) << reason;
  // Results of the best and of the final run, whether they are of an earlier run and whether an evaluation repeats
  // another one; what is told.
  const std::tuple<double, double, bool, bool, const char*> cases[] = {
      {5.0, 5.0, false, false, nullptr},
      {5.0, 4.5, false, false,
       "The final model run has other results than evaluation No. 1 of the same set (flow: 4.5 instead of 5): the "
       "model depends on more than its parameters"},
      {5.0, 4.5, true, false, "of the same set (flow: 4.5 instead of 5)"},
      {5.0, 4.5, false, true, "and 1 evaluation have the results of earlier ones"},
  };
  for (const auto& [best, final, isReplayed, hasRepeat, expected] : cases) {
    SCOPED_TRACE(expected == nullptr ? "the same" : expected);
    RunState state;
    state.log.open(folder_ / "f.log", reason);
    state.progress.progressInit(folder_ / "f.log", "");
    ResultFile results{folder_ / "f_Checksums.dat", {"Title"}};
    results.open(folder_ / "f.dat", {}, {{"k"}, {"flow"}, {"fit"}});
    RunReporter reporter(state, results, failedRuns_, space_, nullptr, &pairs_, nullptr, {{"flow", "flow.txt"}});
    const double set = 1.0;
    const auto resultOf = [](int number, double value) {
      return EvaluationResult{
          .number = number, .measureValues = {value}, .objectiveValues = {value}, .aggregate = value};
    };
    reporter.recordEvaluation(std::span(&set, 1), resultOf(1, best));
    reporter.evaluationFinished(std::span(&set, 1), resultOf(1, best));
    if (hasRepeat) reporter.recordRepeat(std::span(&set, 1), resultOf(2, best), 1);
    reporter.takeBestOf({.best = {set}, .bestResult = resultOf(1, best)});
    reporter.recordEvaluation(std::span(&set, 1), resultOf(3, final));
    if (isReplayed) {
      reporter.evaluationReplayed(std::span(&set, 1), resultOf(3, final));
    } else {
      reporter.evaluationFinished(std::span(&set, 1), resultOf(3, final));
    }
    const std::vector<std::string>& told = state.log.warnings();
    EXPECT_EQ(told.size(), expected == nullptr ? 0U : 1U);
    EXPECT_THAT(told.empty() ? std::string() : told.front(), HasSubstr(expected == nullptr ? "" : expected));
  }
}

TEST_F(RunReporterTest, AFinalRunThatFailsIsTold) {
  finish(1, 5.0);
  reporter_.takeBestOf({.best = {0.0}, .bestResult = {.number = 1, .aggregate = 5.0}});
  finish(2, kFailedRunValue);
  EXPECT_THAT(state_.log.warnings(),
              testing::ElementsAre(HasSubstr("The final model run has failed, and evaluation No. 1 of the same set has "
                                             "not: run.sh exited with code 3")));
}

TEST_F(RunReporterTest, AggregatesUnknownOnArrivalAreFilledInWhenTheTransformationIsSettled) {
  const ObjectiveFunction fit{.name = "fit"};
  ObjectiveAggregator aggregator(std::span(&fit, 1), AggregationMethod::commonDistance);
  ASSERT_FALSE(aggregator.isSettled());
  const auto arrive = [&](int number, double objective) {
    EvaluationResult result{.number = number, .objectiveValues = {objective}};
    result.aggregate = aggregator.aggregate(result.objectiveValues);
    report(result);
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

TEST_F(RunReporterTest, TheFinalRunTellsThePairsOfTheBestThatWereLost) {
  const auto haveFewerPairs = [this](int number) {
    reporter_.runCompared({.differences = {{number, 0, RunDifference::Kind::fewerPairs, "2 of 48", false}}});
  };
  const double best = 1.0;
  reporter_.evaluationReplayed(std::span(&best, 1), {.number = 1, .objectiveValues = {3.0}, .aggregate = 3.0});
  finish(2, 9.0, 2.0);
  haveFewerPairs(2);
  EXPECT_THAT(reporter_.differencesOfBest(), testing::IsEmpty()) << "of another set";
  // Of an earlier run, too, but made again.
  reporter_.evaluationReplayed(std::span(&best, 1),
                               {.number = 3, .objectiveValues = {3.0}, .aggregate = 3.0, .pairs = {MeasurePairs{}}});
  haveFewerPairs(3);
  EXPECT_THAT(reporter_.differencesOfBest(),
              testing::ElementsAre("The best evaluation, No. 1, is judged by fewer observations than the first "
                                   "successful run: 2 of 48 (found in evaluation No. 3, of the same set)"));
}

TEST_F(RunReporterTest, EvaluationsThatDifferFromTheFirstSuccessfulRunAreNamed) {
  const FileForm form{.endsLine = false, .stepCount = 48, .gapStart = 86400, .gapEnd = 90000};
  const MeasurePairs first{0, 48, 0, 86400, 2 * 86400, {0.1, 0.5, 1.0}, {-1.0, 1.0 / 3.0, 2.0}, form};
  MeasurePairs numbers;
  numbers.measure = 1;
  numbers.file.numberCount = 3;
  MeasurePairs two = first;
  two.count = 2;
  two.missingCount = 46;
  const auto arrive = [this, &numbers](int number, double objective, const MeasurePairs& pairs) {
    report({.number = number, .objectiveValues = {objective}, .aggregate = objective, .pairs = {pairs, numbers}});
  };
  arrive(3, 5.0, first);  // before it is known which run is the first successful one
  arrive(1, 6.0, first);
  EXPECT_THAT(reporter_.numbersWithPairs(), testing::IsEmpty());
  using Kind = RunDifference::Kind;
  reporter_.runCompared({1, {"as many as 48"}, {}, {}, {}});
  EXPECT_THAT(reporter_.differencesOfBest(), testing::IsEmpty());
  EXPECT_THAT(reporter_.differenceWarnings(), testing::IsEmpty());
  for (int number = 4; number < 26; ++number) {
    arrive(number, number == 7 ? 1.0 : 2.0, two);
    reporter_.runCompared({.differences = {{number, 0, Kind::fewerPairs, "2 of 48", number == 8},
                                           {number, 0, Kind::gap, "a day", false},
                                           {number, 1, Kind::fewerPairs, "3 of 9", false}}});
  }
  reporter_.runCompared({.differences = {{7, 1, Kind::otherCount, "3 numbers", false}}});
  reporter_.runCompared({.others = {26}});
  EXPECT_EQ(reporter_.numbersWithPairs().size(), 24U);  // with those of the first successful run, and of others
  EXPECT_THAT(
      reporter_.differencesOfBest(),
      testing::ElementsAre(
          "The best evaluation, No. 7, is judged by fewer observations than the first successful run: 2 of 48; 3 of 9",
          "The best evaluation, No. 7, has a longer gap in its simulated steps than the first successful run: a day",
          "The best evaluation, No. 7, has another count of numbers than the first successful run: 3 numbers"));
  EXPECT_THAT(
      reporter_.differenceWarnings(),
      testing::ElementsAre("22 evaluations are judged by fewer observations than the first successful run: the end of "
                           "s.dat names the first of them",
                           "22 evaluations have a longer gap in their simulated steps than the first successful run: "
                           "the end of s.dat names the first of them",
                           "1 evaluation has another count of numbers than the first successful run: the end of s.dat "
                           "names it"));
  const std::vector<std::string> lines = reporter_.differenceLines();
  ASSERT_EQ(lines.size(), 43U);
  EXPECT_EQ(lines.front(), "Fewer pairs: evaluation 4: 2 of 48; 3 of 9");
  EXPECT_EQ(lines[20], "Fewer pairs: 2 more evaluations, see s_Pairs.dat");
  EXPECT_EQ(lines[21], "Gap: evaluation 4: a day");
  EXPECT_EQ(lines.back(), "Count of numbers: evaluation 7: 3 numbers");
  EXPECT_THAT(
      folder_.read("s.log"),
      AllOf(HasSubstr("as many as 48\n"), HasSubstr("   Evaluation of parameter set No. 7: 2 of 48\n"),
            Not(HasSubstr("No. 8: 2 of 48")), HasSubstr("\nWarning: Evaluation of parameter set No. 23: a day\n"),
            HasSubstr("\n   Evaluation of parameter set No. 24: a day\n")));

  const std::vector<MeasureSource> sources{{"flow", "flow.csv", true}, {"peak", "peak.txt", false}};
  const auto lackOf = [&](int best) { return sentencesOnBest(best, findLackOfBest(best, pairs_.pairs(), sources)); };
  const std::vector<std::string> lack{
      "The best evaluation, No. 1, is judged by fewer observations than another run: output measure \"flow\" has 48 "
      "pairs, 50 in evaluation No. 28"};
  EXPECT_THAT(lackOf(1), testing::IsEmpty());
  for (const int number : {27, 28, 29}) {
    MeasurePairs more = first;
    more.count = number == 27 ? 49 : 50;
    pairs_.add(number, std::vector{more, numbers});
  }
  EXPECT_EQ(lackOf(1), lack);
  EXPECT_EQ(lackOf(2).size(), 1U) << "not kept, as it has the pairs of the first";
  EXPECT_THAT(lackOf(7), testing::IsEmpty()) << "said by its difference from the first";
  EXPECT_THAT(lackOf(28), testing::IsEmpty());

  const PairsByNumber written = pairs_.readEarlier().pairs;
  EXPECT_EQ(written.at(3), (std::vector{first, numbers}));
  EXPECT_EQ(written.at(7), (std::vector{two, numbers}));
  std::string reason;
  EXPECT_TRUE(pairs_.finish(reporter_.numbersWithPairs(), reason)) << reason;
  const PairsByNumber left = pairs_.readEarlier().pairs;
  EXPECT_EQ(left.size(), 23U);
  EXPECT_EQ(left.count(3), 0U);
}

TEST_F(RunReporterTest, ProcessesThatRunsLeaveAreWarnedOfOnceAndCounted) {
  reporter_.processesLeft("No. 1: a");
  EXPECT_FALSE(reporter_.processesLeftWarning());
  for (int i = 2; i <= 22; ++i) reporter_.processesLeft(fmt::format("No. {}: a", i));
  const std::string log = folder_.read("s.log");
  EXPECT_THAT(log, AllOf(HasSubstr("Warning: No. 1: a\n"), HasSubstr("\n   No. 20: a\n"), Not(HasSubstr("No. 21"))));
  EXPECT_EQ(state_.log.warningCount(), 1);
  EXPECT_EQ(reporter_.processesLeftWarning(),
            "22 model runs left processes running; the log names those of the first 20");
}

TEST_F(RunReporterTest, AFileThatRunsLeaveOutIsWarnedOfOnceAndCounted) {
  for (int i = 1; i <= 22; ++i) reporter_.fileAbsent("/out/a.csv", fmt::format("No. {}: a", i));
  reporter_.fileAbsent("/b.csv", "No. 23: b");
  EXPECT_THAT(folder_.read("s.log"), AllOf(HasSubstr("Warning: No. 1: a\n"), HasSubstr("\n   No. 20: a\n"),
                                           Not(HasSubstr("No. 21")), HasSubstr("Warning: No. 23: b\n")));
  EXPECT_EQ(state_.log.warningCount(), 2);
  EXPECT_EQ(reporter_.absentWarning(),
            "Output files to be kept that model runs have not left: out/a.csv (22 model runs)");
}

TEST_F(RunReporterTest, AnEvaluationReachesResultFileLogProgressAndTheFileOfFailures) {
  reporter_.message("Evaluation of parameter set No. 1 initiated");
  finish(1, 2.5);
  finish(2, kFailedRunValue);
  EXPECT_THAT(folder_.read("s.dat"), HasSubstr("1\tOK\t1\t2.5\t2.5\n2\tFAILED\t1\t1e+30\t1e+30\n"));
  EXPECT_EQ(folder_.read("s.log"),
            "Evaluation of parameter set No. 1 initiated\n   aggregate 2.5, best so far 2.5 (No. 1)\n   run.sh exited "
            "with code 3\n");
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
