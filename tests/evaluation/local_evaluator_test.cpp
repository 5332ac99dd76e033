#include "evaluation/local_evaluator.h"

#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <tuple>

#include "evaluation/evaluation_fixture.h"
#include "evaluation/fake_launcher.h"
#include "matchers.h"

namespace mirevo {
namespace {

class LocalEvaluatorTest : public EvaluationTest {
 protected:
  /// A batch of that length that computes the series from the parameter file, as the model does, but not below
  /// `least`.
  static FakeLauncher::Batch computes(double seconds, double least = -1e30) {
    const auto compute = [least](const std::string& folder) {
      std::ifstream input(folder + "/parameters.txt");
      std::string name, equals;
      double a = 0.0;
      input >> name >> equals >> a;
      std::ofstream(folder + "/simulated.csv") << series(std::max(a, least));
    };
    return {.seconds = seconds, .write = compute};
  }
  static FakeLauncher::Batch fails(double seconds) {
    return {.seconds = seconds,
            .failure = {BatchFailure::Kind::exitCode, 3, "run.sh exited with code 3"},
            .output = {"reading", "no convergence"},
            .leftBehind = "run.sh left a process running"};
  }
};

TEST_F(LocalEvaluatorTest, OneSlotRunsOneSetAfterAnother) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(20.0); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
  const auto results = evaluate(evaluator, {2.0, 4.0});
  EXPECT_THAT(measuresOf(results), ElementsAre(1.0, 3.0));
  EXPECT_THAT(observer_.events, ElementsAre("Evaluation of parameter set No. 1 initiated",
                                            "Evaluation of parameter set No. 1 completed: OK", "record 1 a=2 OK",
                                            "Evaluation of parameter set No. 2 initiated",
                                            "Evaluation of parameter set No. 2 completed: OK", "record 2 a=4 OK"));
  EXPECT_DOUBLE_EQ(launcher.now, 40.0);  // no wait goes on after a batch has ended
  EXPECT_EQ(launcher.longestWait, kPollSeconds);
  EXPECT_LE(launcher.longestWait, 3.0);
}

TEST_F(LocalEvaluatorTest, SimulatedValuesThatAreReadAgainTakeNoMemory) {
  description_.keepSimulatedValues = true;
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
  EXPECT_THAT(evaluate(evaluator, {2.0}).at(0).simulatedValues, testing::Each(2.0));
  observer_.readsValues = true;
  EXPECT_EQ(evaluate(evaluator, {2.0}).at(0).simulatedValues.capacity(), 0U);
}

TEST_F(LocalEvaluatorTest, EverySetsOutputIsSavedUnderItsNumberAndAFailedOnesIsNot) {
  description_.savedFiles = {folder_ / "base/simulated.csv"};
  description_.savedFolder = folder_ / "run_Saved";
  FakeLauncher launcher([&](int start, const std::string&) { return start == 2 ? fails(1.0) : computes(3.0); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 100);
  const EvaluationResult failed = evaluate(evaluator, {2.0, 4.0}).at(1);
  EXPECT_THAT(failed.measureValues, ElementsAre(kFailedRunValue));
  EXPECT_THAT(failed.objectiveValues, ElementsAre(kFailedRunValue));
  EXPECT_EQ(failed.aggregate, kFailedRunValue);
  EXPECT_EQ(failed.failure->reason, "run.sh exited with code 3");
  EXPECT_THAT(failed.failure->lastOutput, ElementsAre("reading", "no convergence"));
  evaluate(evaluator, {9.0, 6.0});
  EXPECT_EQ(folder_.read("run_Saved/1/simulated.csv"), series(2.0));
  EXPECT_FALSE(folder_.exists("run_Saved/2/simulated.csv"));
  EXPECT_FALSE(folder_.exists("run_Saved/3"));  // not run
  EXPECT_EQ(folder_.read("run_Saved/4/simulated.csv"), series(6.0));
  const std::string warning = "warning: Evaluation of parameter set No. 2: ";
  EXPECT_THAT(observer_.events, testing::IsSupersetOf({warning + "run.sh left a process running",
                                                       warning + (folder_ / "run_Process2/simulated.csv") +
                                                           " was not kept: No such file or directory"}));
}

TEST_F(LocalEvaluatorTest, ResultsStandInTheOrderOfTheSetsWhateverEndsFirst) {
  const std::vector<double> seconds = {5.0, 1.0, 3.0, 1.5, 1.0, 0.0, 2.0};
  FakeLauncher launcher(
      [&](int start, const std::string&) { return computes(seconds.at(static_cast<std::size_t>(start - 1))); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 3, 100);
  const auto results = evaluate(evaluator, {0.0, 0.5, 1.0, 1.5, 2.0, 2.5});
  EXPECT_THAT(measuresOf(results), ElementsAre(-1.0, -0.5, 0.0, 0.5, 1.0, 1.5));
  EXPECT_EQ(launcher.mostRunning, 3);
  EXPECT_DOUBLE_EQ(launcher.now, 5.0);  // a freed slot is filled at once
  std::vector<std::string> records;
  for (const std::string& event : observer_.events) {
    if (event.starts_with("record")) records.push_back(event.substr(0, 8));
  }
  EXPECT_THAT(records, ElementsAre("record 2", "record 4", "record 3", "record 6", "record 5", "record 1"));

  // Sets are numbered through the run, not the batch.
  const auto second = evaluate(evaluator, {3.0}, DispatchMode::surrogateSelected);
  EXPECT_EQ(second.at(0).number, 7);
}

TEST_F(LocalEvaluatorTest, ResultsOfAWindowAreTakenInTheOrderOfItsSetsWhateverEndsFirst) {
  // slots, window, when all have ended, in which order
  const std::tuple<int, std::size_t, double, std::vector<int>> cases[] = {
      {1, 1, 14.0, {1, 2, 3, 4, 5, 6}},
      {1, 3, 14.0, {1, 2, 3, 4, 5, 6}},
      {2, 2, 10.5, {2, 1, 4, 3, 5, 6}},  // a slot waits for the first set
      {2, 4, 7.5, {2, 3, 4, 1, 5, 6}},   // it goes on with what is behind that
  };
  const std::vector<double> seconds = {6.0, 1.0, 3.0, 1.5, 1.0, 1.5};
  for (const auto& [slots, window, end, order] : cases) {
    SCOPED_TRACE(fmt::format("{} slots, window {}", slots, window));
    observer_.events.clear();
    FakeLauncher launcher(
        [&](int start, const std::string&) { return computes(seconds.at(static_cast<std::size_t>(start - 1))); });
    LocalEvaluator& evaluator = makeEvaluator(launcher, slots, 100);
    const auto results = evaluateInWindow(evaluator, {0.0, 0.5, 1.0, 1.5, 2.0, 2.5}, window);
    EXPECT_THAT(measuresOf(results), ElementsAre(-1.0, -0.5, 0.0, 0.5, 1.0, 1.5));
    for (int i = 0; i < 6; ++i) EXPECT_EQ(results[static_cast<std::size_t>(i)].number, i + 1);
    EXPECT_DOUBLE_EQ(launcher.now, end);
    std::vector<int> ended;
    for (const std::string& event : observer_.events) {
      if (event.starts_with("record ")) ended.push_back(event.at(7) - '0');
    }
    EXPECT_EQ(ended, order);
    EXPECT_EQ(failedRuns_->failedCount(), 0);
    launcher.starts = 0;
    EXPECT_EQ(evaluate(evaluator, {3.0}).at(0).number, 7);
    EXPECT_EQ(evaluateInWindow(evaluator, {9.5, 3.0}, 2).at(1).number, 9) << "the first of them cannot be run";
  }
}

TEST_F(LocalEvaluatorTest, AWindowThatIsCutOffHandsOverWhatHasEndedBehindItsFirstSet) {
  FakeLauncher launcher([&](int start, const std::string&) { return computes(start == 3 ? 100.0 : 1.0); });
  launcher.onWait = [&] { observer_.cancelled = launcher.now >= 5.0; };
  LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 100);
  EXPECT_THROW(evaluateInWindow(evaluator, {2.0, 3.0, 4.0, 6.0, 7.0, 8.0}, 3), RunCancelled);
  EXPECT_EQ(launcher.halts, 1);
  const UnfinishedBatch made = evaluator.takeUnfinished();
  EXPECT_THAT(made.sets, ElementsAre(ParameterSet{6.0}, ParameterSet{7.0}));
  EXPECT_THAT(measuresOf(made.results), ElementsAre(5.0, 6.0));
  EXPECT_TRUE(evaluator.takeUnfinished().sets.empty());
}

TEST_F(LocalEvaluatorTest, TheFailureAfterTheLimitEndsTheRunOnceItIsOnRecord) {
  const std::tuple<int, int, std::size_t> cases[] = {{1, 1, 0}, {9, 1, 0}, {10, 2, 0}, {10, 2, 2}, {25, 3, 0}};
  for (const auto& [planned, fatalFailure, window] : cases) {
    observer_.events.clear();
    FakeLauncher launcher([&](int, const std::string&) { return fails(1.0); });
    LocalEvaluator& evaluator = makeEvaluator(launcher, 1, planned);
    EXPECT_EQ(refusalOf([&] { evaluateInWindow(evaluator, std::vector(5, 2.0), window); }),
              fmt::format("Error: Unable to continue. No of failed simulations too high.\n"
                          "failed evaluations: {}; at most {} may fail, a tenth of the {} planned\n"
                          "the last of them, No. {}: run.sh exited with code 3\n| reading\n| no convergence",
                          fatalFailure, planned / 10, planned, fatalFailure));
    EXPECT_EQ(observer_.events.back(), fmt::format("record {} a=2 FAILED", fatalFailure));
    EXPECT_EQ(launcher.starts, fatalFailure);
  }
}

// The file in the base folder is filled, but with another year.
TEST_F(LocalEvaluatorTest, ARunWithoutPairsIsAFailedOneAsSoonAsAnotherHasShownThatThereCanBeSome) {
  const auto ofYear = [](std::string year) {
    std::string text = series(3.0);
    for (auto at = text.find("2001"); at != std::string::npos; at = text.find("2001", at + 4))
      text.replace(at, 4, year);
    return text;
  };
  folder_.write("base/simulated.csv", ofYear("1990"));
  // evaluations of an earlier run; the years that the others write, the later ones sooner (empty: it fails); the failed
  // ones (empty: the run ends)
  const std::tuple<std::map<int, double>, std::vector<std::string>, std::vector<int>> cases[] = {
      {{}, {"", "2001", "1990", "2001", "1990"}, {1, 3, 5}},
      {{}, {"", "1990", "2001", "2001", "2001"}, {}},
      {{{1, -2.0}}, {"1990", "2001", "2001", "2001"}, {}},
      {{{1, 2.0}}, {"1990", "2001", "1990", "2001"}, {2, 4}},
  };
  for (const auto& [earlier, years, failing] : cases) {
    for (const auto& [slots, keepsPairs, window] :
         {std::tuple{1, true, 0U}, {3, true, 0U}, {3, false, 0U}, {3, true, 3U}, {2, false, 4U}}) {
      takeUp(earlier, keepsPairs);
      FakeLauncher launcher([&](int start, const std::string&) {
        const std::string& year = years.at(static_cast<std::size_t>(start) - 1);
        FakeLauncher::Batch batch = year.empty() ? fails(5.0) : computes(5.0 - start);
        batch.write = [text = ofYear(year.empty() ? "2001" : year)](const std::string& folder) {
          std::ofstream(folder + "/simulated.csv") << text;
        };
        return batch;
      });
      std::vector<int> failed;
      const std::string refusal = refusalOf([&] {
        for (const EvaluationResult& result :
             evaluateInWindow(makeEvaluator(launcher, slots, 100), std::vector(5, 2.0), window)) {
          if (!result.ok()) failed.push_back(result.number);
        }
      });
      EXPECT_EQ(failed, failing) << slots;
      EXPECT_EQ(refusal.starts_with("Error: No simulated data found at observation times"), failing.empty()) << refusal;
    }
  }
}

TEST_F(LocalEvaluatorTest, RunsAreComparedWithTheFirstSuccessWhateverEndsFirst) {
  const std::vector<std::size_t> days{0, 4, 5, 2, 3};  // that each run writes; 0: it fails
  const auto fewer = [](int number, int count, int firstCount, int first) {
    return fmt::format("{}: output measure \"bias\" has {} pairs, {} in the first successful run, No. {}", number,
                       count, firstCount, first);
  };
  // coverage, evaluations of an earlier run, what fails, what is told of the pairs
  const std::tuple<double, std::map<int, double>, std::vector<int>, std::vector<std::string>> cases[] = {
      {0.0, {}, {1}, {"first 2", fewer(4, 2, 4, 2), fewer(5, 3, 4, 2)}},
      {0.5, {}, {1}, {"first 2", fewer(4, 2, 4, 2), fewer(5, 3, 4, 2)}},
      {0.6, {}, {1, 4}, {"first 2", fewer(5, 3, 4, 2)}},
      {0.6, {{1, 2.0}}, {4}, {"first 1", fewer(2, 4, 5, 1), fewer(5, 3, 5, 1)}},  // 3 of 5 are 0.6
      {1.0, {{1, -2.0}, {2, 2.0}}, {1, 4, 5}, {"first 2"}},
  };
  for (const auto& [coverage, earlier, failing, told] : cases) {
    description_.minimumCoverage = coverage;
    for (const auto& [slots, window] : {std::pair{1, 0U}, {3, 0U}, {3, 3U}, {2, 4U}}) {
      observer_.pairs.clear();
      takeUp(earlier);
      const auto firstRun = earlier.size();
      FakeLauncher launcher([&](int start, const std::string&) {
        const std::size_t place = firstRun + static_cast<std::size_t>(start) - 1;
        FakeLauncher::Batch batch = days[place] == 0 ? fails(5.0) : computes(5.0 - static_cast<double>(place));
        batch.write = [count = days[place]](const std::string& folder) {
          const std::string whole = series(3.0);
          constexpr std::size_t kHeader = 10, kLine = 13;
          std::ofstream(folder + "/simulated.csv") << whole.substr(0, kHeader + count * kLine);
        };
        return batch;
      });
      std::vector<int> failed;
      for (const EvaluationResult& result :
           evaluateInWindow(makeEvaluator(launcher, slots, 100), std::vector(5, 2.0), window)) {
        if (!result.ok()) failed.push_back(result.number);
        if (result.number < 4 || result.ok()) continue;
        EXPECT_EQ(result.failure->kind, EvaluationFailure::Kind::tooFewPairs);
      }
      EXPECT_EQ(failed, failing) << coverage << " " << slots;
      EXPECT_THAT(observer_.pairs, testing::UnorderedElementsAreArray(told)) << coverage << " " << slots;
    }
  }
}

TEST_F(LocalEvaluatorTest, FilesThatLackWhatThoseOfTheFirstSuccessHaveAreToldWhateverEndsFirst) {
  const std::string whole = series(3.0);
  const std::string cut = whole.substr(0, whole.size() - 1);
  const std::string gap = std::string(whole).erase(whole.find("2001-01-03"), 13);
  const std::string doubt =
      "The last line of simulated.csv has an end in later runs, and none in the first successful run, No. 2, which may "
      "be cut off";
  // what each run writes, if it does not fail; what fails; what is told
  const std::tuple<std::vector<std::string>, std::vector<int>, std::vector<std::string>> cases[] = {
      {{whole, cut, gap, cut},
       {2, 4},
       {"first 1",
        "3: simulated.csv has no time step between 2001-01-02 00:00 and 2001-01-04 00:00, 48 hours; in the first "
        "successful run, No. 1, steps are at most 24 hours apart"}},
      {{gap, cut, whole, gap}, {2}, {"first 1"}},
      {{"", cut, cut, cut}, {1}, {"first 2"}},
      {{"", cut, cut, whole}, {1}, {"first 2", doubt}},
  };
  description_.failedFolderPrefix = folder_ / "run_Failed";
  for (const auto& [written, failing, told] : cases) {
    for (const auto& [slots, window] : {std::pair{1, 0U}, {3, 0U}, {1, 2U}, {3, 4U}}) {
      SCOPED_TRACE(told.back() + fmt::format(" {} {}", slots, window));
      observer_.pairs.clear();
      foldersToKeep_ = 1;
      FakeLauncher launcher([&](int start, const std::string&) {
        const std::string& content = written.at(static_cast<std::size_t>(start - 1));
        FakeLauncher::Batch batch = content.empty() ? fails(9.0) : computes(9.0 - start);
        batch.output = {"last words"};
        batch.write = [&content](const std::string& folder) { std::ofstream(folder + "/simulated.csv") << content; };
        return batch;
      });
      std::vector<int> failed;
      for (const EvaluationResult& result :
           evaluateInWindow(makeEvaluator(launcher, slots, 100), std::vector(4, 2.0), window)) {
        if (result.ok()) continue;
        failed.push_back(result.number);
        EXPECT_THAT(result.measureValues, ElementsAre(kFailedRunValue));
        EXPECT_THAT(result.failure->lastOutput, ElementsAre("last words"));
        if (result.number == 1) continue;
        EXPECT_EQ(failureKindKey(result.failure->kind), "resultsCutOff");
        EXPECT_EQ(result.failure->reason,
                  "the last line of simulated.csv has no end, as it has in the first successful run, No. 1: it is cut "
                  "off");
      }
      EXPECT_EQ(failed, failing);
      EXPECT_EQ(folder_.read(fmt::format("run_Failed{}/simulated.csv", failing.front())),
                written.at(static_cast<std::size_t>(failing.front() - 1)));
      EXPECT_THAT(observer_.pairs, testing::UnorderedElementsAreArray(told));
    }
  }
}

TEST_F(LocalEvaluatorTest, AModelWhoseMeasuresNeverChangeIsToldOfOnce) {
  std::vector<std::vector<double>> twentyOne;
  for (int i = 0; i < 21; ++i) twentyOne.push_back({0.1 * i});
  // batches, of which the last is the final run; after how many of them the warning comes (0: never), and its beginning
  const std::tuple<std::vector<std::vector<double>>, std::size_t, const char*> cases[] = {
      {{{0, 1, 2}, {1, 0}, {0}}, 1, "All 3 successful"},
      {{{0}, {1}, {0}}, 3, "All 3 successful"},
      {{{9.5, 0}, {1, 2}, {0}}, 2, "All 3 successful"},
      {twentyOne, 20, "All 20 successful"},
      {{{0, 0}, {0, 0}, {0}}, 0, ""},
      {{{0.3, 0.3 + 1e-16}, {0.3 + 1e-16}, {0.3}}, 0, ""},  // which is written alike
      {{{0.3, 0.3 + 1e-16}, {0.3, 2}, {0.3}}, 2, "All 4 successful"},
      {{{0, 4}, {1, 2}, {0}}, 0, ""},
  };
  for (const auto& [batches, warnedAfter, text] : cases) {
    FakeLauncher launcher([&](int start, const std::string&) { return computes(start % 2 == 0 ? 1.0 : 3.0, 3.0); });
    LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 100);
    for (std::size_t i = 0; i < batches.size(); ++i) {
      observer_.events.clear();
      evaluate(evaluator, batches[i], i + 1 == batches.size() ? DispatchMode::finalRun : DispatchMode::task);
      const bool isWarned = observer_.events.back().starts_with("warning at once: ");
      EXPECT_EQ(isWarned, i + 1 == warnedAfter) << i << observer_.events.back();
      if (!isWarned) continue;
      EXPECT_EQ(
          observer_.events.back(),
          fmt::format("warning at once: {} model runs so far have the same output measures, \"bias\" = 2, though their "
                      "parameters differ: does the model read parameters.txt, and does it write simulated.csv "
                      "anew?",
                      text));
    }
  }
}

TEST_F(LocalEvaluatorTest, AMeasureWithoutWeightsIsTheSameWhateverTheModelDoes) {
  description_.measures.front().weight = description_.measures.front().weightAbove = 0.0;
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0, 3.0); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 100);
  evaluate(evaluator, {0, 1, 2}, DispatchMode::task);
  evaluate(evaluator, {0}, DispatchMode::finalRun);
  for (const std::string& event : observer_.events) EXPECT_THAT(event, Not(HasSubstr("same output measures")));
}

TEST_F(LocalEvaluatorTest, OneMeasureOfSeveralThatNeverChangesIsToldOf) {
  description_.measures.push_back(description_.measures.front());
  folder_.write("base/gauge.csv", series(0.0));
  description_.measures.back().name = "gauge";
  description_.measures.back().simulation.fileName = folder_ / "base/gauge.csv";
  description_.objectives.front().measures = {0, 1};
  for (const bool changes : {false, true}) {
    FakeLauncher launcher([&](int start, const std::string&) {
      FakeLauncher::Batch batch = computes(1.0);
      batch.write = [start, changes, simulated = batch.write](const std::string& folder) {
        simulated(folder);
        std::ofstream(folder + "/gauge.csv") << series(changes && start == 2 ? 4.0 : 3.0);
      };
      return batch;
    });
    LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
    observer_.events.clear();
    const auto countWarnings = [this] {
      return std::count_if(observer_.events.begin(), observer_.events.end(), [](const std::string& event) {
        return event.find("have the same \"gauge\"") != event.npos;
      });
    };
    evaluate(evaluator, {0, 1, 2});
    EXPECT_EQ(countWarnings(), 0) << "a count, perhaps";
    for (int i = 0; i < 6; ++i) evaluate(evaluator, {3.0 + 0.1 * i, 4.0, 4.5});
    const std::string text =
        "warning at once: All 21 successful model runs so far have the same \"gauge\" = 2, though their parameters "
        "differ and other output measures change: is gauge.csv what is to be read, and does the model write it anew?";
    EXPECT_EQ(std::count(observer_.events.begin(), observer_.events.end(), text), changes ? 0 : 1);
    EXPECT_EQ(countWarnings(), changes ? 0 : 1);
  }
}

TEST_F(LocalEvaluatorTest, SetsThatCannotBeRunAreNotStarted) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
  auto results = evaluate(evaluator, {9.5, 5.0, 2.0});
  EXPECT_EQ(launcher.starts, 1);
  EXPECT_THAT(observer_.events,
              ElementsAre("Evaluation of parameter set No. 1 completed: FAILED - parameter constraints violated",
                          "record 1 a=9.5 FAILED",
                          "Evaluation of parameter set No. 2 completed: FAILED - parameter constraints violated",
                          "record 2 a=5 FAILED", "Evaluation of parameter set No. 3 initiated",
                          "Evaluation of parameter set No. 3 completed: OK", "record 3 a=2 OK"));
  EXPECT_EQ(results[0].failure->kind, EvaluationFailure::Kind::constraintsViolated);
  EXPECT_THAT(results[1].failure->reason, HasSubstr("inverse"));
  EXPECT_EQ(failedRuns_->failedCount(), 2);
  results = evaluate(evaluator, {-1e120});
  EXPECT_EQ(launcher.starts, 1);
  EXPECT_EQ(failureKindKey(results[0].failure->kind), "valueNotWritable");
  EXPECT_EQ(results[0].failure->reason, "the value -1e+120 of parameter \"a\" cannot be written in its field, " +
                                            folder_ / "base/parameters.tpl:2");
  EXPECT_THAT(refusalOf([&] { evaluate(makeEvaluator(launcher, 1, 9), {9.5}); }),
              HasSubstr("\nfailed evaluations: 1, 1 of them not run as they violate a constraint or an equation has no "
                        "finite value; at most 0 may fail"));
}

TEST_F(LocalEvaluatorTest, CancellationHaltsWhatRunsAndStartsNothing) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(100.0); });
  launcher.onWait = [&] { observer_.cancelled = launcher.now >= 6.0; };
  LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 100);
  EXPECT_THROW(evaluate(evaluator, std::vector(4, 2.0)), RunCancelled);
  EXPECT_DOUBLE_EQ(launcher.now, 6.0);
  EXPECT_EQ(launcher.halts, 1);
  EXPECT_EQ(launcher.starts, 2);
  EXPECT_EQ(observer_.events.back(), "Simulation cancelled");
  evaluator.takeUnfinished();
  EXPECT_THROW(evaluate(evaluator, std::vector(4, 2.0)), RunCancelled);
  EXPECT_EQ(launcher.starts, 2);
}

TEST_F(LocalEvaluatorTest, SettlesTheTransformationFromTheSampleWithoutItsFailures) {
  method_ = AggregationMethod::commonProbability;
  FakeLauncher launcher([&](int start, const std::string&) { return start == 2 ? fails(1.0) : computes(1.0); });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
  auto sample = evaluate(evaluator, {2.0, 3.0, 4.0});
  EXPECT_TRUE(std::isnan(sample[0].aggregate));
  evaluator.settleAggregates(sample);
  // Objective values 1 and 3: mean 2, standard deviation √2, so the aggregates are Φ(∓1/√2).
  EXPECT_NEAR(sample[0].aggregate, 0.23975006109347674, 1e-12);
  EXPECT_NEAR(sample[2].aggregate, 0.7602499389065233, 1e-12);
  EXPECT_EQ(sample[1].aggregate, kFailedRunValue);
  EXPECT_THAT(observer_.events.back(), HasSubstr("Standard deviation = 1.414"));
}

TEST_F(LocalEvaluatorTest, WhatAnEarlierRunHasEvaluatedIsNotRunAgain) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  takeUp({{1, 2.0}, {3, -4.0}, {5, 6.0}});
  LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 10);
  auto results = evaluate(evaluator, {2.0, 3.0, 4.0, 1.5});
  EXPECT_THAT(measuresOf(results), ElementsAre(1.0, 2.0, 3.0, 0.5));
  EXPECT_EQ(results[0].aggregate, 1.0);
  EXPECT_EQ(results[2].failure->reason, "in the past");
  EXPECT_EQ(failedRuns_->failedCount(), 1);
  EXPECT_EQ(launcher.starts, 2);
  EXPECT_THAT(
      observer_.events,
      ElementsAre("replay 1 a=2 OK", "replay 3 a=4 FAILED", "Evaluation of parameter set No. 2 initiated",
                  "Evaluation of parameter set No. 4 initiated", "Evaluation of parameter set No. 2 completed: OK",
                  "record 2 a=3 OK", "Evaluation of parameter set No. 4 completed: OK", "record 4 a=1.5 OK"));
  // A final run is made for its folder, but has its row already.
  results = evaluate(evaluator, {6.0}, DispatchMode::finalRun);
  EXPECT_EQ(launcher.starts, 3);
  EXPECT_EQ(observer_.events.back(), "replay 5 a=6 OK");
  EXPECT_THAT(observer_.events, Not(Contains(HasSubstr("other results than in its row"))));
}

TEST_F(LocalEvaluatorTest, AFinalRunThatDiffersFromItsRowIsToldOf) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.5, 7.0); });
  takeUp({{1, 6.0}});
  evaluate(makeEvaluator(launcher, 1, 10), {6.0}, DispatchMode::finalRun);
  EXPECT_THAT(observer_.events, Contains(AllOf(HasSubstr("warning at once: "), HasSubstr("No. 1, the final model run, "
                                                                                         "was made again and has other "
                                                                                         "results than in its row"))));
  EXPECT_EQ(observer_.events.back(), "replay 1 a=6 OK");
}

TEST_F(LocalEvaluatorTest, AFinalRunThatSucceedsWhereItHadFailedIsToldOf) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  takeUp({{1, -6.0}});
  evaluate(makeEvaluator(launcher, 1, 10), {6.0}, DispatchMode::finalRun);
  EXPECT_THAT(observer_.events, Contains(HasSubstr("No. 1, the final model run, was made again and has succeeded")));
  EXPECT_EQ(observer_.events.back(), "replay 1 a=6 FAILED");
}

/// An interrupted run has rows of sets behind one that had not ended.
TEST_F(LocalEvaluatorTest, AWindowTakesWhatAnEarlierRunHasEvaluated) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  takeUp({{1, 2.0}, {2, 3.0}, {4, -1.5}, {5, 6.0}});
  LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 10);
  const auto results = evaluateInWindow(evaluator, {2.0, 3.0, 4.0, 1.5, 6.0, 7.0, 8.0}, 3);
  EXPECT_THAT(measuresOf(results), ElementsAre(1.0, 2.0, 3.0, 0.5, 5.0, 6.0, 7.0));
  EXPECT_EQ(results[3].failure->reason, "in the past");
  EXPECT_EQ(failedRuns_->failedCount(), 1);
  EXPECT_EQ(launcher.starts, 3);
  std::erase_if(observer_.events, [](const std::string& event) { return event.starts_with("Evaluation"); });
  EXPECT_THAT(observer_.events,
              ElementsAre("replay 1 a=2 OK", "replay 2 a=3 OK", "replay 4 a=1.5 FAILED", "replay 5 a=6 OK",
                          "record 3 a=4 OK", "record 6 a=7 OK", "record 7 a=8 OK"));
}

TEST_F(LocalEvaluatorTest, AModelWhoseMeasuresNeverChangeIsToldOfAfterTwentyResultsOfAWindow) {
  FakeLauncher launcher([&](int start, const std::string&) { return computes(start % 2 == 0 ? 1.0 : 3.0, 3.0); });
  std::vector<double> values(25);
  for (std::size_t i = 0; i < values.size(); ++i) values[i] = 0.1 * static_cast<double>(i);
  evaluateInWindow(makeEvaluator(launcher, 2, 100), values, 4);
  const auto isWarning = [](const std::string& event) { return event.starts_with("warning at once: All 20 "); };
  EXPECT_EQ(std::count_if(observer_.events.begin(), observer_.events.end(), isWarning), 1);
}

TEST_F(LocalEvaluatorTest, ARunWhoseOutputFilesCouldNotBeKeptIsMadeAgainForThemAlone) {
  folder_.write("file", "");
  // Where files are kept, by how much the model run differs from before, what is told.
  const std::tuple<const char*, double, std::vector<std::string>, std::size_t> cases[] = {
      {"run_Saved", 0.0, {"2 lacks 0"}, 0},
      {"run_Saved", 0.0, {"2 lacks 0"}, 3},
      {"run_Saved", 0.5, {"has other results than before, and its files are not kept"}, 0},
      {"run_Saved", 1e9, {"the model run failed"}, 0},
      {"run_Saved", 1e9, {"the model run failed"}, 1},
      {"file/run_Saved", 0.0, {" was not kept: ", "2 lacks 1", " was not kept: ", "4 lacks 1"}, 0}};
  for (const auto& [where, change, told, window] : cases) {
    description_.savedFiles = {folder_ / "base/simulated.csv"};
    description_.savedFolder = folder_ / where;
    takeUp({{1, 2.0}, {2, 4.0}, {3, 6.0}});
    earlier_->runAgain({2});
    FakeLauncher launcher([&, change = change](int start, const std::string&) {
      return start == 1 && change > 1.0 ? fails(1.0) : computes(1.0, start == 1 ? 4.0 + change : 0.0);
    });
    observer_.events.clear();
    if (change != 0.0) folder_.write("run_Saved/2/simulated.csv", "kept before");
    const auto results = evaluateInWindow(makeEvaluator(launcher, 1, 100), {2.0, 4.0, 6.0, 8.0}, window);
    EXPECT_THAT(measuresOf(results), ElementsAre(1.0, 3.0, 5.0, 7.0)) << where << change;
    std::vector<testing::Matcher<std::string>> matchers;
    for (const std::string& text : told) matchers.push_back(HasSubstr(text));
    std::erase_if(observer_.events, [](const std::string& event) {
      return event.find("again") == event.npos && event.find(" not kept") == event.npos &&
             event.find(" lacks ") == event.npos;
    });
    EXPECT_THAT(observer_.events, testing::ElementsAreArray(matchers)) << where << change;
    EXPECT_FALSE(folder_.exists("run_Saved/1"));
    if (where == std::string("run_Saved")) {
      EXPECT_EQ(folder_.read("run_Saved/2/simulated.csv"), change == 0.0 ? series(4.0) : "kept before");
    }
    std::filesystem::remove_all(folder_ / "run_Saved");
  }
}

/// Without the last line end, a run waits for the first successful one, which may have to be repeated, too.
TEST_F(LocalEvaluatorTest, RunsThatAreMadeAgainAreMadeInTheOrderOfTheirNumbers) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  takeUp({{1, 2.0}, {2, 2.0}}, true, 1);
  earlier_->runAgain({2});
  evaluate(makeEvaluator(launcher, 1, 10), {2.0, 2.0});
  std::erase_if(observer_.events, [](const std::string& event) { return event.find("initiated") == event.npos; });
  EXPECT_THAT(observer_.events, ElementsAre(HasSubstr("No. 1 "), HasSubstr("No. 2 ")));
}

TEST_F(LocalEvaluatorTest, AnotherSetUnderTheSameNumberIsNoReplay) {
  FakeLauncher launcher([&](int, const std::string&) { return computes(1.0); });
  takeUp({{2, 3.0}});
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 10);
  EXPECT_THAT(refusalOf([&] {
                evaluate(evaluator, {1.0, std::nextafter(3.0, 4.0)});
              }),
              StartsWith("Error: Unable to continue the earlier run\n"
                         "evaluation No. 2 has a = 3 in the earlier results, and 3.0000000000000004 now, "
                         "though the settings are the same."));
}

/// Earlier versions had exp(ln 5) where the setup gives 5.
TEST_F(LocalEvaluatorTest, AGivenLogarithmicValueIsThatOfAnEarlierVersionToo) {
  const double earlier = std::exp(std::log(5.0));
  ASSERT_NE(earlier, 5.0);
  SearchSpace space{.names = {"k"},
                    .initial = {std::log(5.0)},
                    .lower = {0.0},
                    .upper = {3.0},
                    .transformation = {TransformationType::logarithmic}};
  space.givenValues[{0, std::log(5.0)}] = 5.0;
  const ObjectiveAggregator aggregator(description_.objectives, method_);
  const EvaluationResult result{.measureValues = {1.0}, .objectiveValues = {1.0}};
  EarlierEvaluations evaluations(space, aggregator,
                                 {{1, {{earlier}, result}}, {2, {{std::nextafter(earlier, 0.0)}, result}}});
  EXPECT_TRUE(evaluations.take(1, space.initial));
  EXPECT_THAT(refusalOf([&] { evaluations.take(2, space.initial); }), HasSubstr("has k = 4.99"));
}

TEST_F(LocalEvaluatorTest, TheFoldersOfTheFirstFailedRunsAreKept) {
  description_.failedFolderPrefix = folder_ / "run_Failed";
  foldersToKeep_ = 3;
  FakeLauncher launcher([&](int, const std::string& folder) {
    std::ofstream(folder + "/mirevo_batch.log") << "why";
    return fails(1.0);
  });
  takeUp({{1, -4.0}});
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
  evaluate(evaluator, {4.0, 9.5, 2.0, 3.0, 1.0});
  EXPECT_FALSE(folder_.exists("run_Failed1")) << "of the earlier run";
  EXPECT_FALSE(folder_.exists("run_Failed2")) << "no model run";
  EXPECT_EQ(folder_.read("run_Failed3/mirevo_batch.log"), "why");
  EXPECT_THAT(folder_.read("run_Failed4/parameters.txt"), EndsWith(" 3\n"));
  EXPECT_FALSE(folder_.exists("run_Failed5"));

  description_.runsAtOnce = 2'000'000'000;
  earlier_.reset();
  evaluate(makeEvaluator(launcher, 1, 100), {4.0});
  EXPECT_FALSE(folder_.exists("run_Failed1")) << "no room for it";
  EXPECT_THAT(observer_.events, Contains(HasSubstr("was not kept as " + (folder_ / "run_Failed1") + ": it needs ")));
}

TEST_F(LocalEvaluatorTest, AFolderThatAModelDamagesIsMadeAnewOnceAndThenGivenUp) {
  namespace fs = std::filesystem;
  fs::create_directory(folder_ / "elsewhere");
  folder_.write("elsewhere/simulated.csv", "another's");
  folder_.write("base/out/simulated.csv", series(0.0));
  description_.measures.push_back(description_.measures.front());
  description_.measures.back().simulation.fileName = folder_ / "base/out/simulated.csv";
  description_.objectives.front().measures.push_back(1);
  using Damage = std::function<void(const std::string&)>;
  const std::tuple<Damage, const char*> cases[] = {
      {[](const std::string& folder) { fs::remove_all(folder); }, "Unable to work in {}: No such file or directory"},
      {[](const std::string& folder) { fs::remove(folder + "/run.sh"); }, "Unable to open {}/run.sh: No such file"},
      {[](const std::string& folder) { fs::remove(folder + "/parameters.txt"); },
       "Unable to open {}/parameters.txt: No such file"},
      {[](const std::string& folder) {
         fs::remove(folder + "/simulated.csv");
         fs::create_directory(folder + "/simulated.csv");
       },
       "Unable to remove {}/simulated.csv: Is a directory"},
      {[this](const std::string& folder) {
         fs::remove_all(folder + "/out");
         fs::create_directory_symlink(folder_ / "elsewhere", folder + "/out");
       },
       "Unable to work with {0}/out/simulated.csv: the link {0}/out leads to "},
  };
  const std::string second = folder_ / "run_Process2";
  for (const auto& [damage, text] : cases) {
    observer_.events.clear();
    // Only runs in the second slot do it.
    FakeLauncher launcher([&](int, const std::string&) {
      FakeLauncher::Batch batch = computes(1.0);
      batch.write = [&, compute = batch.write](const std::string& folder) {
        compute(folder);
        fs::copy_file(folder + "/simulated.csv", folder + "/out/simulated.csv");
        if (folder == second) damage(folder);
      };
      return batch;
    });
    LocalEvaluator& evaluator = makeEvaluator(launcher, 2, 100);
    const auto results = evaluate(evaluator, {1.0, 2.0, 3.0, 4.0, 6.0, 7.0});
    EXPECT_EQ(launcher.starts, 6);
    EXPECT_THAT(measuresOf({results[0], results[2], results[4], results[5]}), ElementsAre(0.0, 2.0, 5.0, 6.0));
    const std::string told = fmt::format(fmt::runtime(text), second);
    EXPECT_THAT(observer_.events,
                testing::IsSupersetOf({StartsWith("warning: The process folder " + second +
                                                  " was made anew, as the model had damaged it. " + told),
                                       StartsWith("warning: Slot 2 is given up and runs no model any more, as its "
                                                  "process folder was damaged again. " +
                                                  told)}));
    EXPECT_EQ(folder_.read("elsewhere/simulated.csv"), "another's") << "it is removed before a run in its own folder";
  }
}

TEST_F(LocalEvaluatorTest, ADamagedFolderIsFatalOnlyWhereNoSlotIsLeft) {
  int rarely = 0;  // the last run that leaves the folder whole of so many; 0: none does
  FakeLauncher launcher([&](int start, const std::string&) {
    FakeLauncher::Batch batch = computes(1.0);
    batch.write = [&, start, compute = batch.write](const std::string& folder) {
      compute(folder);
      if (rarely == 0 || start % rarely != 0) std::filesystem::remove(folder + "/parameters.txt");
    };
    return batch;
  });
  LocalEvaluator& evaluator = makeEvaluator(launcher, 1, 100);
  EXPECT_THAT(refusalOf([&] {
                evaluate(evaluator, {1.0, 2.0, 3.0, 4.0});
              }),
              StartsWith("Error: Unable to open " + (folder_ / "run_Process1/parameters.txt") +
                         "\nNo such file or directory\nno process folder is left"));
  EXPECT_EQ(launcher.starts, 2);
  LocalEvaluator& withTwo = makeEvaluator(launcher, 2, 100);
  launcher.renewError = "no room";
  EXPECT_THAT(
      refusalOf([&] {
        evaluate(withTwo, {1.0, 2.0, 3.0, 4.0});
      }),
      testing::EndsWith("made anew: no room\nno process folder is left: the model damages them, and the last one "
                        "could not be made anew"));
  EXPECT_THAT(observer_.events, testing::Contains(HasSubstr("as its process folder was damaged. Unable to open")));
  launcher.renewError.clear();
  launcher.starts = 0;
  rarely = 2;
  EXPECT_EQ(evaluate(makeEvaluator(launcher, 1, 100), {1.0, 2.0, 3.0, 4.0, 6.0}).size(), 5U);
}

}  // namespace
}  // namespace mirevo
