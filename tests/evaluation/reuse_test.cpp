#include <fstream>

#include "evaluation/evaluation_fixture.h"
#include "evaluation/fake_launcher.h"
#include "matchers.h"

namespace mirevo {
namespace {

/// Model runs end as the test says, in the order of their starts; the measure is a - 1.
class ReuseTest : public EvaluationTest {
 protected:
  ReuseTest() { description_.reusesResults = true; }

  struct Run {
    double seconds = 1.0;
    bool succeeds = true;
  };
  FakeLauncher launcher(std::vector<Run> runs) {
    return FakeLauncher([runs = std::move(runs), this](int start, const std::string&) {
      const Run run =
          static_cast<std::size_t>(start) <= runs.size() ? runs[static_cast<std::size_t>(start - 1)] : Run{};
      FakeLauncher::Batch batch{.seconds = run.seconds};
      if (!run.succeeds) batch.failure = {BatchFailure::Kind::exitCode, 3, "run.sh exited with code 3"};
      batch.write = [this](const std::string& folder) {
        std::ifstream input(folder + "/parameters.txt");
        std::string name, equals;
        double a = 0.0;
        input >> name >> equals >> a;
        std::ofstream(folder + "/simulated.csv") << series(isConstant_ ? 3.0 : a);
      };
      return batch;
    });
  }
  std::vector<std::string> repeats() const {
    std::vector<std::string> found;
    for (const std::string& event : observer_.events) {
      if (event.find(" repeats ") != std::string::npos && event.front() != 'E') found.push_back(event);
    }
    return found;
  }

  bool isConstant_ = false;
};

TEST_F(ReuseTest, ASetThatWasRunHasItsResultWithoutAModelRun) {
  FakeLauncher models = launcher({});
  LocalEvaluator& evaluator = makeEvaluator(models, 1, 100);
  EXPECT_THAT(measuresOf(evaluate(evaluator, {2.0, 4.0})), ElementsAre(1.0, 3.0));
  observer_.events.clear();
  const auto results = evaluate(evaluator, {4.0, 2.0, -0.0, 0.0});
  EXPECT_THAT(measuresOf(results), ElementsAre(3.0, 1.0, -1.0, -1.0));
  EXPECT_EQ(results[0].number, 3);
  EXPECT_EQ(results[0].aggregate, 3.0);
  EXPECT_EQ(models.starts, 4) << "-0 and 0 have other bits";
  EXPECT_THAT(std::vector(observer_.events.begin(), observer_.events.begin() + 4),
              ElementsAre("3 repeats 2",
                          "Evaluation of parameter set No. 3 repeats No. 2: the model gets the same values, and is not "
                          "run",
                          "Evaluation of parameter set No. 3 completed: OK", "record 3 a=4 OK"));
  evaluate(evaluator, {4.0}, DispatchMode::surrogateSelected);
  EXPECT_EQ(models.starts, 4);
  evaluate(evaluator, {4.0}, DispatchMode::finalRun);
  EXPECT_EQ(models.starts, 5);
}

TEST_F(ReuseTest, EqualSetsSideBySideWaitForTheFirstThatSucceeds) {
  struct Case {
    const char* name;
    std::vector<double> values;
    int slots;
    std::vector<Run> runs;
    int starts;
    double seconds;
    std::vector<std::string> repeats;
  };
  const Case cases[] = {
      {"the slot of one that waits is another's", {2, 2, 4}, 2, {{5}, {3}}, 2, 5, {"2 repeats 1"}},
      {"several wait", {2, 2, 2, 2}, 3, {{5}}, 1, 5, {"2 repeats 1", "3 repeats 1", "4 repeats 1"}},
      {"the first fails", {2, 2, 2}, 3, {{5, false}, {2}}, 2, 7, {"3 repeats 2"}},
      {"all fail", {2, 2, 2}, 3, {{1, false}, {1, false}, {1, false}}, 3, 3, {}},
      {"they violate a constraint", {9.5, 9.5, 2}, 2, {{1}}, 1, 1, {}},
      {"two pairs", {2, 4, 4, 2}, 2, {{3}, {1}}, 2, 3, {"3 repeats 2", "4 repeats 1"}},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(each.name);
    observer_.events.clear();
    FakeLauncher models = launcher(each.runs);
    LocalEvaluator& evaluator = makeEvaluator(models, each.slots, 100);
    const auto results = evaluate(evaluator, each.values);
    EXPECT_EQ(results.size(), each.values.size());
    EXPECT_EQ(models.starts, each.starts);
    EXPECT_EQ(models.now, each.seconds);
    EXPECT_EQ(repeats(), each.repeats);
  }
}

TEST_F(ReuseTest, ACancelledRunTakesNoMoreResults) {
  FakeLauncher models = launcher({{1}, {9}});
  LocalEvaluator& evaluator = makeEvaluator(models, 2, 100);
  models.onWait = [&] { observer_.cancelled = models.now > 3; };
  EXPECT_THROW(evaluate(evaluator, {2.0, 4.0, 4.0, 2.0}), RunCancelled);
  const UnfinishedBatch made = evaluator.takeUnfinished();
  EXPECT_THAT(made.sets, ElementsAre(ElementsAre(2.0), ElementsAre(2.0)));
  EXPECT_EQ(models.starts, 2);
}

TEST_F(ReuseTest, ASearchThatOnlyRepeatsSetsCanBeCancelled) {
  FakeLauncher models = launcher({});
  LocalEvaluator& evaluator = makeEvaluator(models, 1, 100);
  evaluate(evaluator, {2.0});
  observer_.cancelled = true;
  EXPECT_THROW(evaluate(evaluator, {2.0, 2.0}), RunCancelled);
}

TEST_F(ReuseTest, ASetOfASlotThatIsGivenUpIsRunOnAnother) {
  FakeLauncher models = launcher({{1}, {5}});
  LocalEvaluator& evaluator = makeEvaluator(models, 2, 100);
  evaluate(evaluator, {2.0, 3.0});
  std::filesystem::remove_all(models.getProcessFolder(1));
  models.renewError = "no room";
  EXPECT_THAT(measuresOf(evaluate(evaluator, {4.0, 4.0, 2.0})), ElementsAre(3.0, 3.0, 1.0));
  EXPECT_EQ(models.starts, 3);
  EXPECT_THAT(repeats(), ElementsAre("4 repeats 3", "5 repeats 1"));
}

TEST_F(ReuseTest, RowsOfAnEarlierRunAnswerForSetsBehindThem) {
  // What the rows of the earlier run are of, and how many model runs {2, 2, 4, 2} then takes.
  const std::pair<std::map<int, double>, int> cases[] = {
      {{{1, 2.0}}, 1}, {{{1, 2.0}, {2, 2.0}, {3, 4.0}}, 0}, {{{2, 2.0}}, 2}, {{{1, -2.0}}, 2}};
  for (const auto& [rows, starts] : cases) {
    takeUp(rows);
    FakeLauncher models = launcher({});
    LocalEvaluator& evaluator = makeEvaluator(models, 1, 100);
    EXPECT_EQ(evaluate(evaluator, {2.0, 2.0, 4.0, 2.0}).at(3).measureValues, std::vector{1.0});
    EXPECT_EQ(models.starts, starts);
  }
}

TEST_F(ReuseTest, RepeatsSayNothingOfAModelThatIgnoresItsParameters) {
  isConstant_ = true;
  FakeLauncher models = launcher({});
  LocalEvaluator& evaluator = makeEvaluator(models, 1, 100);
  evaluate(evaluator, {2.0, 2.0, 2.0});
  evaluate(evaluator, {4.0, 2.0, 4.0});
  EXPECT_THAT(
      observer_.events,
      testing::Contains(testing::StartsWith("warning at once: All 2 successful model runs so far have the same")));
}

}  // namespace
}  // namespace mirevo
