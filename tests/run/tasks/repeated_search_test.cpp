#include "run/tasks/repeated_search.h"

#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/pareto/front_scale.h"
#include "algorithms/searches/nsga_ii.h"
#include "algorithms/searches/padds.h"
#include "matchers.h"
#include "run/tasks/optimisation_task.h"

namespace mirevo {
namespace {

constexpr int kRepeatedBudget = 70;

class RepeatedSearches : public ::testing::Test {
 protected:
  static std::unique_ptr<OptimisationTask> taskOf(std::string_view search, SurrogateUse use,
                                                  RepetitionSettings settings, std::int32_t seed) {
    auto task = std::make_unique<OptimisationTask>();
    task->method = searchMethods().make(SetupValue(std::string(search)));
    task->method->setVariableCount(2);
    if (auto* const nsga = dynamic_cast<NsgaIiMethod*>(task->method.get())) nsga->settings.populationSize = 12;
    if (auto* const padds = dynamic_cast<PaddsMethod*>(task->method.get())) padds->settings.candidates = 2;
    task->surrogateUse = use;
    task->stopping = {.maxEvaluations = kRepeatedBudget, .minChange = 0.02};
    task->surrogate.neighbourhoodSize = 20;
    task->repetitions = settings;
    task->randomSeed = seed;
    return task;
  }
  TaskOutcome run(Task& task) {
    evaluator_.emplace([](const ParameterSet& set) {
      return resultOf((set[0] - 3.0) * (set[0] - 3.0) + 10.0 * (set[1] - set[0]) * (set[1] - set[0]));
    });
    return task.run({space_, parameters_, measures_, objectives_, *evaluator_, log_});
  }
  static std::vector<double> objectivesOf(const ParameterSet& set) {
    return {(set[0] - 3.0) * (set[0] - 3.0) + (set[1] - 2.0) * (set[1] - 2.0),
            (set[0] - 6.0) * (set[0] - 6.0) + (set[1] - 7.0) * (set[1] - 7.0)};
  }
  TaskOutcome runForFront(Task& task) {
    evaluator_.emplace([](const ParameterSet& set) {
      const std::vector<double> values = objectivesOf(set);
      return EvaluationResult{.objectiveValues = values, .aggregate = values[0] + values[1]};
    });
    TaskContext context{space_, parameters_, measures_, objectives_, *evaluator_, log_};
    context.aggregate = [](std::span<const double> values) { return values[0] + values[1]; };
    return task.run(context);
  }
  /// Its best sets, one row each, without the numbers of their evaluations.
  static std::vector<std::vector<DataTable::Cell>> rowsOf(const TaskOutcome& outcome) {
    EXPECT_EQ(outcome.tables.size(), 2U);
    auto rows = outcome.tables.at(0).rows;
    for (auto& row : rows) row.erase(row.begin() + 3);
    return rows;
  }

  std::vector<ModelParameter> parameters_{{1.5, 0.5, 9.5, TransformationType::none, ParameterType::variable, 0.0, "a"},
                                          {1.5, 0.5, 9.5, TransformationType::none, ParameterType::variable, 0.0, "b"}};
  std::vector<OutputMeasure> measures_{1};
  std::vector<ObjectiveFunction> objectives_{1};
  SearchSpace space_ = BuildSearchSpace(parameters_);
  std::optional<FunctionEvaluator> evaluator_;
  RunLog log_;
};

TEST_F(RepeatedSearches, EachFindsWhatARunWithItsSeedFindsInEitherOrder) {
  for (const CodeName& name : searchMethods().names()) {
    const auto method = searchMethods().make(SetupValue(std::string(name.name)));
    if (method->facts().findsFront || method->facts().usesResiduals) continue;  // these results have neither
    for (const SurrogateUse use : {SurrogateUse::no, SurrogateUse::yes}) {
      SCOPED_TRACE(::testing::Message() << name.name << " " << static_cast<int>(use));
      const auto consecutive = taskOf(name.name, use, {3, RepetitionOrder::consecutive}, 5);
      if (use == SurrogateUse::yes && !consecutive->method->facts().usesSurrogate) continue;
      EXPECT_EQ(consecutive->plannedEvaluations(), 3 * kRepeatedBudget);
      const TaskOutcome outcome = run(*consecutive);
      const auto rows = rowsOf(outcome);
      ASSERT_EQ(rows.size(), 3U);
      const std::vector<ParameterSet> finalRun = evaluator_->batches.back();
      const int made = evaluator_->evaluationCount;

      const auto sideBySide = taskOf(name.name, use, {3, RepetitionOrder::sideBySide}, 5);
      const TaskOutcome other = run(*sideBySide);
      EXPECT_EQ(rowsOf(other), rows);
      EXPECT_EQ(evaluator_->batches.back(), finalRun);
      EXPECT_EQ(evaluator_->evaluationCount, made);
      EXPECT_THAT(outcome.report.size(), other.report.size());

      double least = std::numeric_limits<double>::infinity();
      std::vector<ParameterSet> best;
      for (std::int32_t i = 0; i < 3; ++i) {
        const auto alone = taskOf(name.name, use, {}, 5 + i);
        EXPECT_THAT(run(*alone).tables, IsEmpty());
        const auto& row = rows[static_cast<std::size_t>(i)];
        EXPECT_EQ(row[1], DataTable::Cell(std::int64_t{5 + i}));
        EXPECT_EQ(row[2], DataTable::Cell(std::int64_t{evaluator_->evaluationCount - 1}));
        EXPECT_THAT(evaluator_->batches.back(),
                    ElementsAre(ElementsAre(std::get<double>(row[6]), std::get<double>(row[7]))));
        if (std::get<double>(row[3]) >= least) continue;
        least = std::get<double>(row[3]);
        best = evaluator_->batches.back();
      }
      EXPECT_EQ(finalRun, best);
    }
  }
}

/// What a search for two objectives has found: the objectives of its front.
std::set<std::vector<double>> frontIn(const TaskOutcome& outcome) {
  std::set<std::vector<double>> front;
  for (const DataTable& table : outcome.tables) {
    if (table.file != run_files::kPareto) continue;
    for (const auto& row : table.rows) {
      if (std::get<std::int64_t>(row[1]) == 1) front.insert({std::get<double>(row[6]), std::get<double>(row[7])});
    }
  }
  return front;
}

TEST_F(RepeatedSearches, TheFrontOfAllIsThatOfWhatRunsWithTheirSeedsFindInEitherOrder) {
  objectives_.resize(2);
  for (const char* const search : {"NSGA-II", "PADDS"}) {
    SCOPED_TRACE(search);
    std::vector<TaskOutcome> outcomes;
    std::vector<std::vector<ParameterSet>> finalRuns;
    for (const RepetitionOrder order : {RepetitionOrder::consecutive, RepetitionOrder::sideBySide}) {
      const auto task = taskOf(search, SurrogateUse::no, {3, order}, 5);
      outcomes.push_back(runForFront(*task));
      finalRuns.push_back(evaluator_->batches.back());
      EXPECT_EQ(evaluator_->evaluationCount, 3 * kRepeatedBudget + 1);
    }
    EXPECT_EQ(finalRuns[0], finalRuns[1]);
    auto rows = outcomes[0].tables.at(0).rows;
    auto others = outcomes[1].tables.at(0).rows;
    for (auto* const of : {&rows, &others}) {
      for (auto& row : *of) row.erase(row.begin() + 3);
    }
    EXPECT_EQ(rows, others);

    ParetoArchive together;
    double nearest = std::numeric_limits<double>::infinity();
    for (std::int32_t i = 0; i < 3; ++i) {
      const auto alone = taskOf(search, SurrogateUse::no, {}, 5 + i);
      const auto front = frontIn(runForFront(*alone));
      for (const std::vector<double>& values : front) together.add(0, {}, values);
      const auto row = rows.at(static_cast<std::size_t>(i));
      const std::vector<double> compromise = objectivesOf({std::get<double>(row[7]), std::get<double>(row[8])});
      EXPECT_EQ(front.count(compromise), 1U);
      EXPECT_EQ(std::get<double>(row[3]), compromise[0] + compromise[1]) << "its aggregate";
    }
    const std::vector<std::vector<double>> front = together.front();
    const FrontScale scale(front);
    std::vector<std::vector<double>> compromises;
    for (const auto& row : rows) {
      compromises.push_back(objectivesOf({std::get<double>(row[7]), std::get<double>(row[8])}));
      nearest = std::min(nearest, scale.distance(compromises.back()));
    }
    EXPECT_EQ(scale.distance(objectivesOf(finalRuns[0].at(0))), nearest) << "the suggestion is the best of theirs";
    const std::set<std::vector<double>> expected(front.begin(), front.end());
    for (const TaskOutcome& outcome : outcomes) {
      EXPECT_EQ(frontIn(outcome), expected);
      const auto course = std::ranges::find(outcome.tables, run_files::kParetoCourse, &DataTable::file);
      ASSERT_NE(course, outcome.tables.end());
      EXPECT_EQ(course->rows.back()[0], DataTable::Cell(std::int64_t{3 * kRepeatedBudget}));
    }
  }
}

TEST_F(RepeatedSearches, EveryEvaluationBelongsToOneOfThem) {
  const auto task = taskOf("PSE", SurrogateUse::no, {3, RepetitionOrder::sideBySide}, 1);
  const TaskOutcome outcome = run(*task);
  std::vector<std::int64_t> counts(3, 0);
  std::int64_t next = 1;
  for (const auto& row : outcome.tables.at(1).rows) {
    EXPECT_EQ(std::get<std::int64_t>(row[1]), next);
    next = std::get<std::int64_t>(row[2]) + 1;
    counts.at(static_cast<std::size_t>(std::get<std::int64_t>(row[0]) - 1)) += next - std::get<std::int64_t>(row[1]);
  }
  EXPECT_EQ(next, evaluator_->evaluationCount) << "all but the final run";
  for (std::size_t i = 0; i < 3; ++i) EXPECT_EQ(outcome.tables[0].rows[i][2], DataTable::Cell(counts[i]));
}

TEST_F(RepeatedSearches, TheFirstSampleDeterminesTheScaleOfAll) {
  std::vector<std::vector<std::vector<DataTable::Cell>>> found;
  for (const RepetitionOrder order : {RepetitionOrder::consecutive, RepetitionOrder::sideBySide}) {
    std::optional<double> scale;  // aggregates are not known before
    const auto task = taskOf("SCE", SurrogateUse::no, {2, order}, 1);
    class Scaling final : public Evaluator {
     public:
      explicit Scaling(std::optional<double>& scale) : scale_(scale) {}
      std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
        std::vector<EvaluationResult> results;
        for (const ParameterSet& set : sets) {
          results.push_back(resultOf(set[0] + set[1]));
          results.back().number = ++count_;
          results.back().aggregate = scale_ ? *scale_ * results.back().objectiveValues[0] : 0.0;
        }
        return results;
      }
      void settleAggregates(std::span<EvaluationResult> sample) override {
        EXPECT_FALSE(scale_) << "once";
        scale_ = 1.0 / sample[1].objectiveValues[0];
        for (EvaluationResult& result : sample) result.aggregate = *scale_ * result.objectiveValues[0];
      }

     private:
      std::optional<double>& scale_;
      int count_ = 0;
    } evaluator(scale);
    TaskContext context{space_, parameters_, measures_, objectives_, evaluator, log_};
    context.aggregate = [&scale](std::span<const double> values) { return scale.value() * values[0]; };
    found.push_back(rowsOf(task->run(context)));
    for (const auto& row : found.back()) {
      EXPECT_EQ(std::get<double>(row[3]), *scale * (std::get<double>(row[6]) + std::get<double>(row[7])));
      EXPECT_LE(std::get<double>(row[3]), std::get<double>(row[5])) << "the least of the sample, on the same scale";
    }
  }
  EXPECT_EQ(found[0], found[1]);
}

}  // namespace
}  // namespace mirevo
