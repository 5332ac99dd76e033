#include "run/results/series_recorder.h"

#include <cmath>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

/// Records to `s_Series.dat` with a clock that the test sets; the period is the seconds 10 to 30.
class SeriesRecorderTest : public ::testing::Test {
 protected:
  SeriesRecorder recorder(bool keepsValues = false) {
    RecordedSeries run{.headLines = {"Title"},
                       .measures = {"flow"},
                       .observations = {{{10, 30}, {1.0F, 3.0F}}},
                       .periodFirst = 10,
                       .periodLast = 30,
                       .initialValues = {0.5}};
    if (keepsValues) run.kept = {{1, {10, 30}}};
    return {folder_ / "s_Series.dat", std::move(run), [this] { return now_; },
            [this](std::string_view text) { warnings_.emplace_back(text); }};
  }

  /// An evaluation whose simulated series is its number at the seconds 0 to 40.
  void evaluate(SeriesRecorder& to, int number, double aggregate, bool isInitial = false, double value = -1.0,
                bool hasSeries = true) {
    EvaluationResult result{.number = number, .aggregate = aggregate};
    const auto simulated = static_cast<float>(number);
    if (hasSeries) result.shownSeries = {{{0, 20, 40}, {simulated, simulated, simulated}}};
    const std::vector<double> values{isInitial ? 0.5 : value < 0.0 ? number : value};
    if (aggregate < (best_ ? best_->aggregate : 1e30)) best_ = BestEvaluation{number, aggregate, values};
    to.evaluationFinished(result, values, best_);
  }

  SeriesTable table() const { return readSeriesTable(folder_.read("s_Series.dat")); }
  std::string numbers() const {
    const SeriesTable read = table();
    return fmt::format("{}{} {}", read.initial ? read.initial->number : 0, read.isOfInitialParameters ? "" : "?",
                       read.best ? read.best->number : 0);
  }

  TemporaryFolder folder_;
  double now_ = 100.0;
  std::vector<std::string> warnings_;
  std::optional<BestEvaluation> best_;
};

TEST_F(SeriesRecorderTest, InitialIsTheSetupsSetOrTheFirstThatSucceededWhateverTheOrderOfArrival) {
  SeriesRecorder run = recorder();
  evaluate(run, 3, 5.0);
  EXPECT_EQ(numbers(), "3? 3");
  evaluate(run, 2, 6.0);
  evaluate(run, 4, 7.0);
  run.finish(best_);
  EXPECT_EQ(numbers(), "2? 3");
  evaluate(run, 9, 8.0, true);
  evaluate(run, 1, 9.0);
  run.finish(best_);
  EXPECT_EQ(numbers(), "9 3");
  const SeriesTable read = table();
  ASSERT_EQ(read.series.size(), 1U);
  EXPECT_THAT(read.series[0].seconds, ElementsAre(10, 20, 30));  // its own and the observations' times in the period
  EXPECT_THAT(read.series[0].observed, ElementsAre(1.0F, NanSensitiveFloatEq(std::nanf("")), 3.0F));
  EXPECT_THAT(read.series[0].initial, ElementsAre(9.0F, 9.0F, 9.0F));
  EXPECT_THAT(read.series[0].best, ElementsAre(3.0F, 3.0F, 3.0F));
}

TEST_F(SeriesRecorderTest, IsWrittenSeldomAndAtTheEnd) {
  SeriesRecorder run = recorder();
  evaluate(run, 1, 5.0, true);
  EXPECT_EQ(numbers(), "1 1");
  now_ += 1.0;
  evaluate(run, 2, 4.0);
  EXPECT_EQ(numbers(), "1 1");
  now_ += 10.0;
  evaluate(run, 3, 9.0, false, -1.0, false);  // a worse one brings none, but the time has come
  EXPECT_EQ(numbers(), "1 2");
  evaluate(run, 4, 3.0);
  run.finish(best_);
  EXPECT_EQ(numbers(), "1 4");
}

TEST_F(SeriesRecorderTest, FollowsTheSearchAndAggregatesThatComeLater) {
  SeriesRecorder run = recorder();
  evaluate(run, 1, std::nan(""), true);
  evaluate(run, 2, std::nan(""));
  run.aggregateSettled(1, 0.7);
  run.finish(BestEvaluation{2, 0.5, {2.0}});  // settled: the second is the best
  EXPECT_EQ(numbers(), "1 2");
  EXPECT_EQ(table().initial->aggregate, 0.7);
  EXPECT_EQ(table().best->aggregate, 0.5);
  best_ = BestEvaluation{7, 0.5, {2.0}};  // the search took an equal one
  run.finish(best_);
  EXPECT_EQ(numbers(), "1 7");
  best_ = BestEvaluation{8, 0.4, {8.0}};  // one whose series nobody has, until the final model run repeats it
  EXPECT_THAT(warnings_, IsEmpty());
  run.finish(best_);
  EXPECT_EQ(numbers(), "1 8");
  EXPECT_THAT(folder_.read("s_Series.dat"),
              HasSubstr("# The series of the best evaluation, No. 8, are not in s_Series.dat: they were not kept\n"));
  evaluate(run, 20, 0.4, false, 8.0);
  run.finish(best_);
  EXPECT_EQ(numbers(), "1 8");
  EXPECT_THAT(table().series.at(0).best, ElementsAre(20.0F, 20.0F, 20.0F));
}

TEST_F(SeriesRecorderTest, GoesOnFromAnEarlierFileAndWarnsOnceWhereItCannotWrite) {
  {
    SeriesRecorder earlier = recorder();
    evaluate(earlier, 1, 5.0, true);
    evaluate(earlier, 2, 4.0);
    earlier.finish(best_);
  }
  SeriesRecorder run = recorder();
  run.resume(readSeriesTable(folder_.read("s_Series.dat")));
  std::filesystem::remove(folder_ / "s_Series.dat");
  best_.reset();
  evaluate(run, 1, 5.0, true, -1.0, false);  // replayed
  evaluate(run, 2, 4.0, false, -1.0, false);
  EXPECT_EQ(numbers(), "1 2");
  EXPECT_THAT(table().series.at(0).best, ElementsAre(2.0F, 2.0F, 2.0F));
  evaluate(run, 3, 3.0);
  run.finish(best_);
  EXPECT_EQ(numbers(), "1 3");
  SeriesRecorder withoutFile = recorder();
  withoutFile.evaluationPassed({.number = 1}, std::vector<double>{-1.0}, std::nullopt);
  evaluate(withoutFile, 4, 2.0);
  withoutFile.finish(best_);
  EXPECT_FALSE(table().initial) << "a later evaluation is not the initial one";
  EXPECT_THAT(
      warnings_,
      ElementsAre(
          "The series of the initial evaluation, No. 1, are not in s_Series.dat: the earlier run left none of them"));
  warnings_.clear();

  std::filesystem::remove(folder_ / "s_Series.dat");
  std::filesystem::create_directories(folder_ / "s_Series.dat/in the way");
  evaluate(run, 4, 2.0);
  run.finish(best_);
  evaluate(run, 5, 1.0);
  run.finish(best_);
  EXPECT_EQ(warnings_.size(), 1U);
}

TEST_F(SeriesRecorderTest, OfAnEarlierRunShowsTheTrueBestFromWhatWasKeptOrSaysThatItIsNotThere) {
  for (const bool isKept : {true, false}) {
    {
      SeriesRecorder killed = recorder();  // after its first write
      evaluate(killed, 2, 5.0);
    }
    warnings_.clear();
    SeriesRecorder run = recorder(isKept);
    run.resume(table());
    const BestEvaluation first{1, 6.0, {1.0}};
    const BestEvaluation second{2, 5.0, {2.0}};
    const BestEvaluation third{3, 4.0, {3.0}};
    run.evaluationPassed({.number = 1, .aggregate = 6.0, .simulatedValues = {-1, 1.5, 1.5}}, first.parameterValues,
                         first);
    run.evaluationPassed({.number = 2, .aggregate = 5.0, .simulatedValues = {-1, 2.5, 2.5}}, second.parameterValues,
                         second);
    run.evaluationPassed({.number = 3, .aggregate = 4.0, .simulatedValues = {-1, 3.5, 3.7}}, third.parameterValues,
                         third);
    run.finish(third);
    EXPECT_EQ(numbers(), isKept ? "1? 3" : "0? 3");
    const auto gap = NanSensitiveFloatEq(std::nanf(""));
    const ShownSeries shown = table().series.at(0);
    if (isKept) {
      EXPECT_THAT(shown.initial, ElementsAre(1.5F, 1.5F));
      EXPECT_THAT(shown.best, ElementsAre(3.5F, 3.7F));
    } else {
      EXPECT_THAT(shown.best, ElementsAre(gap, gap));
    }
    const char* const said = isKept ? "are there at the times of the observations alone"
                                    : "are not in s_Series.dat: the earlier run left none";
    EXPECT_THAT(folder_.read("s_Series.dat"),
                AllOf(HasSubstr(fmt::format("# The series of the initial evaluation, No. 1, {}", said)),
                      HasSubstr(fmt::format("# The series of the best evaluation, No. 3, {}", said))));
    EXPECT_EQ(warnings_.size(), isKept ? 0U : 2U);
    // Continued again: what is not there is not taken for the best's.
    warnings_.clear();
    SeriesRecorder again = recorder(isKept);
    again.resume(table());
    again.finish(third);
    EXPECT_EQ(warnings_.size(), isKept ? 0U : 1U);
    std::filesystem::remove(folder_ / "s_Series.dat");
    best_.reset();
  }

  {
    SeriesRecorder killed = recorder();
    evaluate(killed, 2, 5.0);
  }
  SeriesRecorder run = recorder(true);  // the best of the earlier run stays the best, at all its times
  run.resume(table());
  for (const BestEvaluation& best : {BestEvaluation{1, 6.0, {1.0}}, {2, 5.0, {2.0}}}) {
    run.evaluationPassed({.number = best.number, .aggregate = best.aggregate, .simulatedValues = {-1, 1.5, 1.5}},
                         best.parameterValues, best);
  }
  run.finish(BestEvaluation{2, 5.0, {2.0}});
  EXPECT_THAT(table().series.at(0).best, ElementsAre(2.0F, 2.0F, 2.0F));
}

TEST_F(SeriesRecorderTest, OfKeptValuesThatDoNotReachOverAllPeriodsKeepsNoneOfAValidationPeriodAndSaysSoAgain) {
  const auto runOf = [this] {
    return SeriesRecorder(
        folder_ / "s_Series.dat",
        {.measures = {"flow"},
         .observations = {{{10, 20, 30}, {1.0F, 2.0F, 3.0F}}},
         .periodFirst = 10,
         .periodLast = 30,
         .kept = {{0, {10, 15, 20}}},
         .keepsSteps = true,
         .keepsAllPeriods = false,
         .evaluationFirst = 10,
         .evaluationLast = 15},
        [this] { return now_; }, [](std::string_view) {});
  };
  const BestEvaluation best{1, 6.0, {1.0}};
  for (int i = 0; i < 2; ++i) {
    SeriesRecorder run = runOf();
    if (i == 1) run.resume(table());
    run.evaluationPassed({.number = 1, .aggregate = 6.0, .simulatedValues = {1.5, 1.6, 1.7}}, best.parameterValues,
                         best);
    run.finish(best);
    const auto gap = NanSensitiveFloatEq(std::nanf(""));
    EXPECT_THAT(table().series.at(0).best, ElementsAre(1.5F, 1.6F, gap, gap));
    EXPECT_THAT(folder_.read("s_Series.dat"),
                HasSubstr("best evaluation, No. 1, are there in the evaluation period alone: the earlier run left"));
  }
}

}  // namespace
}  // namespace mirevo
