#pragma once

#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "algorithms/searches/search_algorithm.h"
#include "evaluation/chosen_evaluations.h"
#include "evaluation/evaluation_observer.h"
#include "measures/objective_functions.h"
#include "parameters/search_space.h"
#include "run/results/failed_run_file.h"
#include "run/results/failure_summary.h"
#include "run/results/pairs_file.h"
#include "run/results/restart.h"
#include "run/results/result_file.h"
#include "run/results/scenario_series.h"
#include "run/results/series_recorder.h"
#include "run/results/simulated_values_file.h"
#include "run/results/unkept_files.h"
#include "run/results/validation_table.h"
#include "run/run_state.h"

namespace mirevo {

/// The reporting of a run: log, progress, result file and the file of failed runs.
class RunReporter final : public EvaluationObserver {
 public:
  /// The result file must be open; all must outlive the reporter. `simulatedValues` receives the
  /// simulated values of every successful evaluation, `pairs` the pairs that are to be kept, `unkeptFiles` the output
  /// files that could not be kept; all may be null. `sources`: of all output measures.
  RunReporter(RunState& state, ResultFile& results, FailedRunFile& failedRuns, const SearchSpace& space,
              SimulatedValuesFile* simulatedValues = nullptr, PairsFile* pairs = nullptr,
              UnkeptFiles* unkeptFiles = nullptr, std::vector<MeasureSource> sources = {});

  /// From now on `recorder` records the series of the initial and the best evaluation; it must outlive the reporter.
  void recordSeries(SeriesRecorder& recorder) { recorder_ = &recorder; }
  void recordScenarios(ScenarioSeriesFile& file) { scenarioSeries_ = &file; }

  /// From now on evaluations are kept for judged(), in a run with validation periods.
  void keepJudged() { keepsJudged_ = true; }
  /// The successful evaluations by their numbers.
  std::vector<JudgedEvaluation> judged() const;

  /// From now on `settings` are on disk whenever a row is written; they must outlive the reporter.
  void keepSettings(RestartSettingsFile& settings) { settings_ = &settings; }

  void message(std::string_view text) override;
  void warning(std::string_view text) override;
  void urgentWarning(std::string_view text) override;
  void processesLeft(std::string_view text) override;
  void runLost(std::string_view text) override;
  void fileAbsent(const std::string& name, std::string_view text) override;
  void recordEvaluation(std::span<const double> set, const EvaluationResult& result) override;
  void recordRepeat(std::span<const double> set, const EvaluationResult& result, int original) override;
  bool recall(int number, std::span<const double> set, EvaluationResult& result) override;
  bool readsSimulatedValues() const override { return simulatedValues_ != nullptr && simulatedValues_->isReadBack(); }
  void recordUnkeptFiles(int number, std::span<const UnkeptFile> files) override;
  void evaluationFinished(std::span<const double> set, const EvaluationResult& result) override;
  void evaluationReplayed(std::span<const double> set, const EvaluationResult& result) override;
  void runCompared(const ComparisonFindings& found) override;
  bool isCancelled() override {
    if (lookAround_) lookAround_();
    return state_.progress.isCancelled();
  }

  /// From now on `improved` is called when an evaluation that was made by this run is the best so far, and `lookAround`
  /// several times a second while models run.
  void followBest(std::function<void(const EvaluationResult&)> improved, std::function<void()> lookAround) {
    improved_ = std::move(improved);
    lookAround_ = std::move(lookAround);
  }

  /// At the end of a run: fills in the aggregates of evaluations made before the transformation of the objective
  /// functions was known, if it is known now.
  void settle(const ObjectiveAggregator& aggregator);

  /// Makes the best of a search the best of the run: the search knows which of several equal evaluations it took, and
  /// its final model run only repeats that one. Does nothing if every evaluation failed.
  void takeBestOf(const SearchSummary& search);

  const std::optional<BestEvaluation>& best() const { return best_.best(); }
  /// The number of the initial evaluation; empty before an evaluation has succeeded.
  const std::optional<int>& initial() const { return initial_.number(); }

  /// The evaluations that differ from the first successful run: for each kind of difference one line for each of the
  /// first of them, and how many more. Empty without any.
  std::vector<std::string> differenceLines() const;
  /// A sentence for each kind of difference that says how many evaluations there are, and where those lines are.
  std::vector<std::string> differenceWarnings() const;
  /// Says how many evaluations lack output files; empty if none does.
  std::string unkeptWarning() const;
  /// Sentences that say so of the best evaluation.
  std::vector<std::string> differencesOfBest() const;
  /// A sentence that says how many model runs left processes running, if there was more than one.
  std::optional<std::string> processesLeftWarning() const;
  /// Names the output files that several model runs have not left, and how many; empty if there are none.
  std::string absentWarning() const;
  /// For people, by what the best evaluation is judged, one line per measure that compares series, below a heading; by
  /// what the first successful run is, if that is not known or no evaluation is the best. Empty without such measures.
  std::vector<std::string> comparisonLines() const;
  /// The first successful run, the final run of the best set, and the evaluations that differ or have other pairs;
  /// empty as long as it is not known which is the first successful one.
  std::set<int> numbersWithPairs() const;

  int evaluationCount() const { return evaluationCount_; }
  int failedCount() const { return failedCount_; }
  /// Evaluations whose results were taken from an earlier run.
  int replayedCount() const { return replayedCount_; }
  /// Evaluations that have the result of an earlier one of the same set.
  int repeatCount() const { return repeatCount_; }
  /// Sets that were handed out once more, as the process that had them was lost.
  int lostRunCount() const { return lostRunCount_; }
  const FailureSummary& failures() const { return failures_; }

 private:
  /// An evaluation whose aggregate was not known when it arrived.
  struct Unsettled {
    int number = 0;
    std::vector<double> parameterValues;
    std::vector<double> objectiveValues;
  };
  /// `values` are on the model scale.
  void recordSeries(const std::vector<double>& values, const EvaluationResult& result);
  void count(const std::vector<double>& parameterValues, const EvaluationResult& result, std::string_view foundAt);
  void considerAsBest(int number, double aggregate, const std::vector<double>& parameterValues,
                      std::string_view foundAt);
  void requireLogWritten() const;
  /// Results are right only for a model that gives them again, those of earlier evaluations as well.
  /// The evaluation whose set the final model run repeats; 0: not known.
  int numberOfFinalSet() const;
  void warnOfFailedFinalRun(const std::string& reason);
  void compareFinalRun(const EvaluationResult& result);
  std::string firstDifference(std::span<const double> expected, std::span<const double> found) const;
  void noteReplayWithoutPairs(int number);
  bool isReplayedWithoutPairs(int number) const;
  void record(const std::vector<double>& values, const EvaluationResult& result, std::optional<int> repeats);
  /// The values of a successful evaluation and the best so far, in one line; empty without any.
  std::string valuesText(const EvaluationResult& result) const;
  /// What is said of each evaluation that differs in this, of all its measures.
  std::map<int, std::string> differencesOfKind(RunDifference::Kind kind) const;

  RunState& state_;
  ResultFile& results_;
  FailedRunFile& failedRuns_;
  const SearchSpace& space_;
  SimulatedValuesFile* simulatedValues_;
  PairsFile* pairs_;
  UnkeptFiles* unkeptFiles_;
  std::vector<MeasureSource> sources_;
  SeriesRecorder* recorder_ = nullptr;
  ScenarioSeriesFile* scenarioSeries_ = nullptr;
  RestartSettingsFile* settings_ = nullptr;
  BestChoice best_;
  InitialChoice initial_;
  std::vector<Unsettled> unsettled_;
  std::function<void(const EvaluationResult&)> improved_;
  std::function<void()> lookAround_;
  bool keepsJudged_ = false;
  std::map<int, JudgedEvaluation> judged_;
  int evaluationCount_ = 0;
  int failedCount_ = 0;
  int replayedCount_ = 0;
  int repeatCount_ = 0;
  int lostRunCount_ = 0;
  FailureSummary failures_;
  int firstSuccess_ = 0;  ///< with which others are compared
  /// By kind, evaluation and measure.
  std::map<std::tuple<RunDifference::Kind, int, std::size_t>, RunDifference> differences_;
  std::vector<bool> replayedWithoutPairs_;  ///< by number; as many as the first successful run, or lost ones
  /// The last evaluation of which it is known whether it differs.
  struct {
    int number = 0;
    std::vector<double> parameterValues;  ///< model scale
  } lastWithPairs_;
  bool searchHasEnded_ = false;
  int finalRunOf_ = 0;                   ///< the evaluation that the final run repeats; 0: the best
  std::optional<int> finalRun_;          ///< of a search: repeats the best set, or that of finalRunOf_
  std::set<int> others_;                 ///< evaluations without such a difference, with pairs of other observations
  std::size_t differencesWarnedOf_ = 0;  ///< one by one
  int runsWithProcessesLeft_ = 0;
  bool hasWarnedOfAggregate_ = false;    ///< one that is no better than that of a failed evaluation
  std::map<std::string, int> absences_;  ///< model runs that have not left an output file, by its name
};

}  // namespace mirevo
