#pragma once

#include <algorithm>
#include <cmath>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/text.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/local_evaluator.h"
#include "evaluation/model_run.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {

/// Notes what the evaluation loop says, in its order; a finished evaluation as "record N" with its status.
class RecordingObserver final : public EvaluationObserver {
 public:
  void message(std::string_view text) override { events.emplace_back(text); }
  void warning(std::string_view text) override { events.push_back("warning: " + std::string(text)); }
  void urgentWarning(std::string_view text) override { events.push_back("warning at once: " + std::string(text)); }
  void evaluationFinished(std::span<const double> set, const EvaluationResult& result) override {
    events.push_back(fmt::format("record {} a={} {}", result.number, set[0], result.ok() ? "OK" : "FAILED"));
  }
  void recordEvaluation(std::span<const double> set, const EvaluationResult& result) override {
    recorded_[result.number] = {set[0], result};
  }
  void recordRepeat(std::span<const double> set, const EvaluationResult& result, int original) override {
    recordEvaluation(set, result);
    events.push_back(fmt::format("{} repeats {}", result.number, original));
  }
  bool recall(int number, std::span<const double> set, EvaluationResult& result) override {
    const auto found = recorded_.find(number);
    if (found == recorded_.end() || found->second.first != set[0]) return false;
    result = found->second.second;
    return true;
  }
  void evaluationReplayed(std::span<const double> set, const EvaluationResult& result) override {
    recordEvaluation(set, result);
    events.push_back(fmt::format("replay {} a={} {}", result.number, set[0], result.ok() ? "OK" : "FAILED"));
  }
  void runCompared(const ComparisonFindings& found) override {
    if (found.firstNumber != 0) pairs.push_back(fmt::format("first {}", found.firstNumber));
    for (const RunDifference& difference : found.differences) {
      pairs.push_back(fmt::format("{}: {}", difference.number, difference.text));
    }
    if (!found.doubtOfFirst.empty()) pairs.push_back(found.doubtOfFirst);
  }
  bool isCancelled() override { return cancelled; }
  void recordUnkeptFiles(int number, std::span<const UnkeptFile> files) override {
    events.push_back(fmt::format("{} lacks {}", number, files.size()));
  }
  bool readsSimulatedValues() const override { return readsValues; }

  std::vector<std::string> events;
  std::vector<std::string> pairs;  ///< what is told of them
  bool cancelled = false;
  bool readsValues = false;

 private:
  std::map<int, std::pair<double, EvaluationResult>> recorded_;  ///< set and result by number
};

/// A model of one parameter `a` in [0, 10] whose simulated series is the constant a and whose observed one is 1: the
/// measure is a - 1. Sets with a >= 9 violate a constraint; at a = 5 a dependent parameter has no finite value.
class EvaluationTest : public testing::Test {
 protected:
  EvaluationTest() {
    folder_.write("base/run.sh", "#!/bin/sh\nexec " MIREVO_TEST_MODEL " --steps 10\n", 0755);
    folder_.write("base/parameters.tpl", "!\na = !a               !\n");
    folder_.write("base/parameters.txt", "a = 0\n");
    folder_.write("base/simulated.csv", series(0.0));
    folder_.write("observed.csv", series(1.0));
    description_.baseFolder = folder_ / "base";
    description_.fileTag = "_tag";
    description_.parameterFiles = {
        {TemplateType::delimiter, folder_ / "base/parameters.txt", folder_ / "base/parameters.tpl"}};
    description_.measures = {{.name = "bias",
                              .simulation = {folder_ / "base/simulated.csv", 1},
                              .observation = {folder_ / "observed.csv", 1}}};
    description_.period = {{2001, 1, 1}, {2001, 12, 31}};
    description_.objectives = {{.name = "all", .functionType = FunctionType::sumOfAbsolutes, .measures = {0}}};
    settings_.baseFolder = description_.baseFolder;
    settings_.processFolderPrefix = folder_ / "run_Process";
    settings_.batchItems = {{folder_ / "base/run.sh", ""}};

    const ModelParameter a{.initialValue = 2.0, .upperBound = 10.0, .idValue = 1.5e-35, .name = "a"};
    const ModelParameter dependent{
        .parameterType = ParameterType::dependent, .name = "inverse", .equation = "1 / (a - 5)"};
    parameters_ = std::make_unique<ParameterModel>(std::vector{a, dependent},
                                                   std::vector<InternalConstraint>{{"a", "9", LogicalOperator::less}});
  }

  /// Five daily values from 2001-01-01 on.
  static std::string series(double value) {
    std::string text = "time,flow\n";
    for (int day = 1; day <= 5; ++day) text += fmt::format("2001-01-{:02},{}\n", day, value);
    return text;
  }

  /// Evaluations of an earlier run: the set's value by number, those with a negative one failed. Early versions kept no
  /// pairs.
  void takeUp(const std::map<int, double>& values, bool keptPairs = true, int repeated = 0) {
    aggregator_ = std::make_unique<ObjectiveAggregator>(description_.objectives, method_);
    std::map<int, EarlierEvaluations::Record> records;
    for (const auto& [number, value] : values) {
      EarlierEvaluations::Record& record = records[number];
      const double measure = std::abs(value) - 1.0;
      record.parameterValues = {std::abs(value)};
      record.result = {.measureValues = {measure}, .objectiveValues = {std::abs(measure)}};
      if (keptPairs) record.result.pairs = {{.count = 5}};
      if (value < 0) record.result.failure = EvaluationFailure{EvaluationFailure::Kind::signal, "in the past", {}};
    }
    earlier_ = std::make_unique<EarlierEvaluations>(parameters_->searchSpace(), *aggregator_, std::move(records));
    if (repeated > 0) earlier_->repeatRun(repeated);
  }
  void makeRunner(ProcessLauncher& launcher, int slotCount) {
    settings_.slotCount = slotCount;
    if (!aggregator_) aggregator_ = std::make_unique<ObjectiveAggregator>(description_.objectives, method_);
    runner_ = std::make_unique<ModelRunner>(description_, *parameters_, *aggregator_, launcher, settings_);
  }
  LocalEvaluator& makeEvaluator(ProcessLauncher& launcher, int slotCount, int planned) {
    makeRunner(launcher, slotCount);
    failedRuns_ = std::make_unique<FailedRunPolicy>(planned, foldersToKeep_);
    evaluator_ = std::make_unique<LocalEvaluator>(*runner_, observer_, *failedRuns_, slotCount, earlier_.get());
    return *evaluator_;
  }

  /// Evaluates one set a value.
  static std::vector<EvaluationResult> evaluate(Evaluator& evaluator, const std::vector<double>& values,
                                                DispatchMode mode = DispatchMode::task) {
    std::vector<ParameterSet> sets;
    for (const double value : values) sets.push_back({value});
    return evaluator.evaluateParameterSets(sets, mode);
  }
  /// The same, one after the other with at most `window` of them submitted at a time; 0: as one batch.
  static std::vector<EvaluationResult> evaluateInWindow(Evaluator& evaluator, const std::vector<double>& values,
                                                        std::size_t window) {
    if (window == 0) return evaluate(evaluator, values);
    std::vector<EvaluationResult> results;
    std::size_t submitted = 0;
    while (results.size() < values.size()) {
      for (; submitted < std::min(values.size(), results.size() + window); ++submitted) {
        const ParameterSet set{values[submitted]};
        evaluator.submit({&set, 1});
      }
      results.push_back(evaluator.awaitFirst());
    }
    return results;
  }
  static std::vector<double> measuresOf(const std::vector<EvaluationResult>& results) {
    std::vector<double> values;
    for (const EvaluationResult& result : results) values.push_back(result.measureValues.at(0));
    return values;
  }

  TemporaryFolder folder_;
  ModelDescription description_;
  LauncherSettings settings_;
  AggregationMethod method_ = AggregationMethod::none;
  RecordingObserver observer_;
  std::unique_ptr<ParameterModel> parameters_;
  std::unique_ptr<ObjectiveAggregator> aggregator_;
  std::unique_ptr<ModelRunner> runner_;
  int foldersToKeep_ = 0;
  std::unique_ptr<FailedRunPolicy> failedRuns_;
  std::unique_ptr<EarlierEvaluations> earlier_;
  std::unique_ptr<LocalEvaluator> evaluator_;
};

}  // namespace mirevo
