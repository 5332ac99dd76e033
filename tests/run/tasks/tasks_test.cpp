#include "run/tasks/tasks.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "matchers.h"
#include "refusal.h"
#include "run/tasks/optimisation_task.h"
#include "run/tasks/scenario_task.h"
#include "run/tasks/sensitivity_task.h"

namespace mirevo {
namespace {

ModelParameter parameter(const char* name, ParameterType type, TransformationType transformation) {
  return {1.5, 0.5, 9.5, transformation, type, 0.0, name};
}

class TasksTest : public ::testing::Test {
 protected:
  std::string run(Task& task) {
    TaskContext context{space_, parameters_, measures_, objectives_, evaluator_, log_};
    context.feasibility = feasibility_;
    context.warnUser = [this](std::string_view text) {
      EXPECT_THAT(evaluator_.batches, IsEmpty()) << "before the first model run";
      warnings_.emplace_back(text);
    };
    return task.run(context).terminationMessage;
  }

  std::vector<ModelParameter> parameters_{parameter("a", ParameterType::variable, TransformationType::none),
                                          parameter("b", ParameterType::fixed, TransformationType::none),
                                          parameter("c", ParameterType::variable, TransformationType::logarithmic),
                                          parameter("d", ParameterType::variable, TransformationType::integer)};
  std::vector<OutputMeasure> measures_{1};
  std::vector<ObjectiveFunction> objectives_{1};
  SearchSpace space_ = BuildSearchSpace(parameters_);
  FunctionEvaluator evaluator_{[](const ParameterSet& set) { return resultOf(set.front()); }};
  RunLog log_;
  Feasibility feasibility_;
  std::vector<std::string> warnings_;  ///< shown to the user
};

TEST_F(TasksTest, MultipleRunsAreOneBatchAndComeBackToTheirModelValues) {
  ScenarioTask task;
  task.settings = {ScenarioType::multipleRuns, {{{0.1, 7.0, 2.0, 3.7}}, {{-4.0, 7.0, 412.5, 2.5}}}};
  run(task);
  ASSERT_EQ(evaluator_.batches.size(), 1U);
  ASSERT_EQ(evaluator_.batches[0].size(), 2U);
  EXPECT_THAT(ToModelScale(space_, evaluator_.batches[0][0]), ElementsAre(0.1, DoubleEq(2.0), 3.5));
  EXPECT_THAT(ToModelScale(space_, evaluator_.batches[0][1]), ElementsAre(-4.0, DoubleEq(412.5), 2.5));
}

// By the aggregates of 32 bits all perturbed sets fit better.
TEST_F(TasksTest, ASetThatFitsBetterThanTheBaseSetDoesSoIn64Bits) {
  objectives_[0].measures = {0};
  for (const double perturbed : {2.0, 1.5}) {
    FunctionEvaluator evaluator([&](const ParameterSet& set) {
      EvaluationResult result = resultOf(set == space_.initial ? 2.0 : 1.9);
      result.exactMeasures = {set == space_.initial ? 2.0 : perturbed};
      return result;
    });
    TaskContext context{space_, parameters_, measures_, objectives_, evaluator, log_};
    context.aggregate = [](std::span<const double> values) { return values[0]; };
    const std::vector<std::string> report = SensitivityTask().run(context).report;
    EXPECT_EQ(std::count_if(report.begin(), report.end(),
                            [](const std::string& line) { return line.find("aggregate is 1.5, not 2;") != line.npos; }),
              perturbed < 2.0 ? 1 : 0);
    EXPECT_THAT(report, testing::Not(testing::Contains(HasSubstr("aggregate is 1.9"))));
  }
}

TEST_F(TasksTest, AScenarioValueWithoutALogarithmIsRefusedByRunAndParameter) {
  ScenarioTask task;
  task.settings = {ScenarioType::multipleRuns, {{{1.0, 1.0, 1.0, 1.0}}, {{1.0, 1.0, 0.0, 1.0}}}};
  EXPECT_EQ(refusalOf([&] { run(task); }),
            "Error: Invalid parameter transformation for parameter c\n"
            "Scenario run 2 has the value 0, which has no logarithm.");
  EXPECT_TRUE(evaluator_.batches.empty());
}

TEST_F(TasksTest, MoreSetsThatCannotBeRunThanMayFailAreToldBeforeTheFirstModelRun) {
  feasibility_ = feasibleWhere([](const auto& set) { return set[0] < 5.0; }, "constraint 1 (a < 5)");
  ScenarioTask scenarios;
  scenarios.settings.type = ScenarioType::multipleRuns;
  for (int i = 0; i < 30; ++i) scenarios.settings.runs.push_back({{i < 27 ? 1.0 : 6.0, 1.0, 1.0, 1.0}});
  run(scenarios);
  EXPECT_THAT(warnings_, IsEmpty()) << "three of 30 may fail";
  for (int i = 0; i < 23; ++i) scenarios.settings.runs[static_cast<std::size_t>(i)].values[0] = 7.0;
  evaluator_.batches.clear();
  run(scenarios);
  EXPECT_THAT(
      warnings_,
      ElementsAre(
          "26 of 30 scenarios are not run and fail, as they violate a constraint or an equation has no finite value: "
          "No. 1, 2, 3, 4, 5, "
          "6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19, 20 and 6 more\n"
          "   No. 1: constraint 1 (a < 5)\n"
          "   The run will end before it is complete: at most 3 may fail, a tenth of the 30 planned"));

  OptimisationTask optimisation;  // from initial values that violate it
  space_.initial[0] = 9.0;
  optimisation.method = searchMethods().make(SetupValue(2));
  optimisation.stopping = {.maxEvaluations = 9, .minChange = 0.0};
  evaluator_.batches.clear();
  run(optimisation);
  ASSERT_EQ(warnings_.size(), 2U);
  EXPECT_THAT(warnings_[1],
              StartsWith("1 of 1 given sets of the initial sample is not run and fails, as it violates "));
}

TEST_F(TasksTest, AfterEverySearchItsBestSetIsTheFinalModelRun) {
  for (const CodeName& name : searchMethods().names()) {
    std::vector<std::vector<ParameterSet>> alone;
    for (const SurrogateUse use : {SurrogateUse::no, SurrogateUse::yes}) {
      SCOPED_TRACE(::testing::Message() << name.name << " " << static_cast<int>(use));
      OptimisationTask task;
      task.method = searchMethods().make(SetupValue(std::string(name.name)));
      if (task.method->facts().usesResiduals) continue;  // these results have none
      task.surrogateUse = use;
      task.stopping = {.maxEvaluations = 90, .minChange = 0.0};
      task.surrogate.neighbourhoodSize = 20;
      evaluator_.batches.clear();
      EXPECT_EQ(run(task), "Optimisation terminated: Maximum number of model evaluations reached");
      ASSERT_GT(evaluator_.batches.size(), task.method->populationSize() > 90 ? 1U : 2U);
      const std::vector<ParameterSet> last = evaluator_.batches.back();
      ASSERT_EQ(last.size(), 1U);
      std::size_t evaluations = 0;
      double best = last[0].front();
      for (const auto& batch : evaluator_.batches) {
        evaluations += batch.size();
        for (const ParameterSet& set : batch) best = std::min(best, set.front());
      }
      EXPECT_EQ(last[0].front(), best);
      EXPECT_EQ(evaluations, 91U) << "the budget and the final model run";
      if (use == SurrogateUse::no) alone = evaluator_.batches;
      if (task.method->facts().usesSurrogate) continue;
      EXPECT_EQ(evaluator_.batches, alone) << "a search that uses no surrogate model runs as it does alone";
    }
  }
}

}  // namespace
}  // namespace mirevo
