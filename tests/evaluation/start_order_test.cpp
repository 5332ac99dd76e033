#include <algorithm>
#include <array>
#include <cmath>
#include <numeric>
#include <random>
#include <set>

#include "evaluation/evaluation_fixture.h"
#include "evaluation/evaluation_ledger.h"
#include "evaluation/run_times.h"

namespace mirevo {
namespace {

/// How often of all pairs of new sets the one that takes longer is the one of which that is expected; 0.5 is chance.
double shareInOrder(const RunTimes& times, std::mt19937_64& random, std::size_t parameters,
                    const std::function<double(const ParameterSet&)>& seconds) {
  const auto effects = times.effects();
  std::uniform_real_distribution<double> uniform(0.0, 1.0);
  std::vector<std::pair<double, double>> sets;  // expected and true
  for (int i = 0; i < 100; ++i) {
    ParameterSet set(parameters);
    for (double& value : set) value = uniform(random);
    sets.emplace_back(expectedLog(effects, set), seconds(set));
  }
  int inOrder = 0;
  int pairs = 0;
  for (const auto& a : sets) {
    for (const auto& b : sets) {
      if (!(a.second < b.second)) continue;
      ++pairs;
      if (a.first < b.first) ++inOrder;
    }
  }
  return static_cast<double>(inOrder) / pairs;
}

TEST(RunTimesTest, ExpectsLongerTimesWhereTheParametersMakeThemSoAndNothingOtherwise) {
  struct Case {
    const char* name;
    std::size_t parameters;
    int runs;
    std::function<double(const ParameterSet&)> seconds;
    double least;  ///< share of pairs in order; 0: nothing is expected
  };
  const auto noise = [](const ParameterSet& set) {
    return 1.0 + std::fmod(1e6 * std::abs(set[0] + 3.0 * set[1]), 1.0);
  };
  const Case cases[] = {
      {"one of ten", 10, 84, [](const ParameterSet& set) { return 1.0 / (0.05 + set[3]); }, 0.95},
      {"a product of three", 10, 200,
       [](const ParameterSet& set) { return (0.1 + set[0]) * (0.1 + set[1]) / (0.2 + set[9]); }, 0.9},
      {"long in the middle", 5, 200,
       [](const ParameterSet& set) { return std::exp(-20.0 * std::pow(set[2] - 0.5, 2)); }, 0.85},
      {"with noise", 4, 200, [&](const ParameterSet& set) { return noise(set) * std::exp(2.0 * set[2]); }, 0.8},
      {"noise alone", 10, 200, noise, 0.0},
      {"equal but for starting", 10, 200, [&](const ParameterSet& set) { return 1.0 + 0.01 * noise(set); }, 0.0},
      {"too few runs", 10, 23, [](const ParameterSet& set) { return set[0]; }, 0.0},
      {"too many parameters", 10000, 100, [](const ParameterSet& set) { return set[0]; }, 0.0},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(each.name);
    std::mt19937_64 random(17);
    std::uniform_real_distribution<double> uniform(0.0, 1.0);
    RunTimes times;
    for (int i = 0; i < each.runs; ++i) {
      ParameterSet set(each.parameters);
      for (double& value : set) value = uniform(random);
      times.add(set, each.seconds(set));
    }
    if (each.least == 0.0) {
      EXPECT_TRUE(times.effects().empty());
    } else {
      EXPECT_GT(shareInOrder(times, random, each.parameters, each.seconds), each.least);
    }
  }
}

TEST(RunTimesTest, AParameterOfFewValuesIsNoDivisionByZero) {
  RunTimes times;
  for (int i = 0; i < 200; ++i) times.add(ParameterSet{static_cast<double>(i % 3), 7.0}, i % 3 == 1 ? 10.0 : 1.0);
  const auto effects = times.effects();
  ASSERT_FALSE(effects.empty());
  for (const double value : {-1.0, 0.0, 1.0, 2.0, 5.0}) {
    EXPECT_TRUE(std::isfinite(expectedLog(effects, ParameterSet{value, 7.0}))) << value;
  }
  EXPECT_GT(expectedLog(effects, ParameterSet{1.0, 7.0}), expectedLog(effects, ParameterSet{2.0, 7.0}));
}

/// A ledger without models: a set takes as many seconds as its value says, and `take` is told of every start.
class StartOrderTest : public EvaluationTest {
 protected:
  EvaluationLedger makeLedger(bool reuses) {
    aggregator_ = std::make_unique<ObjectiveAggregator>(description_.objectives, method_);
    failedRuns_ = std::make_unique<FailedRunPolicy>(1000);
    return EvaluationLedger(observer_, *failedRuns_, nullptr, {},
                            RunComparison({{.name = "bias", .fileName = "simulated.csv"}}, {}),
                            reuses ? KnownResults(parameters_->searchSpace(), *aggregator_) : KnownResults());
  }

  struct Made {
    std::vector<int> starts;      ///< numbers, in the order in which they were started
    std::vector<double> results;  ///< measures, in the order of the sets
    double end = 0.0;
  };
  /// Runs the sets, one per value, in so many slots. The first `failed` sets fail.
  Made run(EvaluationLedger& ledger, const std::vector<double>& values, std::size_t slots, int failed = 0) {
    std::vector<ParameterSet> sets;
    for (const double value : values) sets.push_back({value});
    Made made;
    std::set<std::pair<double, std::size_t>> running;  // end and place
    double now = 0.0;
    ledger.open(sets, DispatchMode::task, slots);
    while (!ledger.isComplete()) {
      while (running.size() < slots) {
        const auto place = ledger.takeNext();
        if (!place) break;
        made.starts.push_back(ledger.numberOf(*place));
        ledger.markInitiated(*place, now);
        running.emplace(now + ledger.set(*place)[0], *place);
      }
      if (running.empty()) break;  // the last sets had their results from others
      const auto [end, place] = *running.begin();
      running.erase(running.begin());
      now = end;
      ledger.markEnded(place, now);
      const double value = ledger.set(place)[0];
      EvaluationResult result{.measureValues = {value}, .objectiveValues = {value}, .aggregate = value};
      result.pairs = {{.count = 5}};
      if (ledger.numberOf(place) <= failed) result.fail({EvaluationFailure::Kind::exitCode, "exited", {}});
      ledger.finish(place, std::move(result));
    }
    for (const EvaluationResult& result : ledger.end()) made.results.push_back(result.measureValues.at(0));
    made.end = now;
    return made;
  }
  static std::vector<double> values(int count, std::uint64_t seed) {
    std::mt19937_64 random(seed);
    std::uniform_real_distribution<double> uniform(0.1, 8.0);
    std::vector<double> values;
    for (int i = 0; i < count; ++i) values.push_back(uniform(random));
    return values;
  }
};

TEST_F(StartOrderTest, TheLastSetsOfABatchStartLongestFirstAndResultsStayInTheirOrder) {
  EvaluationLedger ledger = makeLedger(false);
  const std::vector<double> first = values(100, 1);
  const std::vector<double> second = values(100, 2);
  EXPECT_EQ(run(ledger, first, 4).results, first);
  const Made made = run(ledger, second, 4);
  EXPECT_EQ(made.results, second);
  ASSERT_EQ(made.starts.size(), 100U);
  // By number until 8 sets a slot are left.
  for (int i = 0; i < 68; ++i) EXPECT_EQ(made.starts[static_cast<std::size_t>(i)], 101 + i);
  std::vector<double> last;
  for (std::size_t i = 68; i < 100; ++i) last.push_back(second[static_cast<std::size_t>(made.starts[i] - 101)]);
  EXPECT_TRUE(std::ranges::is_sorted(last, std::greater()));
  // No slot waits longer for the others than the shortest of these takes.
  EXPECT_LT(made.end, std::accumulate(second.begin(), second.end(), 0.0) / 4 + last.back());
}

TEST_F(StartOrderTest, SetsStartByNumberWhereNothingIsKnownOrAResultMayWait) {
  struct Case {
    const char* name;
    std::vector<double> values;
    std::size_t slots;
    int failed;
  };
  const Case cases[] = {
      {"equal times", std::vector<double>(60, 1.0), 4, 0},
      {"a single slot", values(60, 1), 1, 0},
      {"no run has succeeded", values(60, 1), 2, 60},
      {"too few runs", values(23, 1), 4, 0},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(each.name);
    EvaluationLedger ledger = makeLedger(false);
    const Made made = run(ledger, each.values, each.slots, each.failed);
    EXPECT_TRUE(std::ranges::is_sorted(made.starts));
  }
}

TEST_F(StartOrderTest, OfEqualSetsTheFirstIsRunWhateverTheOrder) {
  EvaluationLedger ledger = makeLedger(true);
  std::vector<double> some = values(60, 3);
  run(ledger, some, 4);
  observer_.events.clear();
  std::vector<double> twice = values(16, 4);
  const std::vector<double> again = twice;
  twice.insert(twice.end(), again.rbegin(), again.rend());
  const Made made = run(ledger, twice, 4);
  EXPECT_EQ(made.results, twice);
  EXPECT_EQ(made.starts.size(), 16U);
  EXPECT_LE(*std::ranges::max_element(made.starts), 76);
  EXPECT_FALSE(std::ranges::is_sorted(made.starts));
  EXPECT_EQ(
      std::ranges::count_if(observer_.events, [](const std::string& event) { return event.find(" repeats ") < 4; }),
      16);
}

}  // namespace
}  // namespace mirevo
