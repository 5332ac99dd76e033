#pragma once

#include <functional>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/chosen_evaluations.h"
#include "evaluation/evaluation_result.h"
#include "measures/period_series.h"
#include "run/results/series_table.h"

namespace mirevo {

/// What the recorder needs to know of a run. The vectors have one entry a pair of series that is compared.
struct RecordedSeries {
  std::vector<std::string> headLines;
  std::vector<std::string> measures;       ///< names as columns have them
  std::vector<PeriodSeries> observations;  ///< with the times around the period's ends
  std::int64_t periodFirst = 0;            ///< secondNumber() of the period's ends
  std::int64_t periodLast = 0;
  std::vector<double> initialValues;  ///< the setup's, of the variable parameters, model scale
};

/// Keeps `<setup>_Series.dat`: the simulated series of the initial and of the best evaluation so far. The file is
/// replaced as a whole and never half written; so seldom that writing takes a hundredth of the run's time at most.
class SeriesRecorder final {
 public:
  /// `clock`: seconds, never running backwards. `warn` is told, once, why the file cannot be written.
  SeriesRecorder(std::string path, RecordedSeries run, std::function<double()> clock,
                 std::function<void(std::string_view)> warn);

  /// Takes over what an earlier run of the same setup has recorded, for evaluations of it that are not run again.
  void resume(std::string_view earlierFile);

  /// An evaluation has finished; `values` on the model scale. `best` is the run's best one, this one considered.
  void evaluationFinished(const EvaluationResult& result, std::span<const double> values,
                          const std::optional<BestEvaluation>& best);

  /// The aggregate of an evaluation that was not known when it finished.
  void aggregateSettled(int number, double aggregate);

  /// At the run's end: writes what is not written yet, and never throws. `best` is the run's best evaluation.
  void finish(const std::optional<BestEvaluation>& best);

 private:
  /// The series of one evaluation.
  struct Held {
    ShownEvaluation evaluation;
    std::vector<double> values;
    std::vector<PeriodSeries> series;
  };
  void holdInitial(const EvaluationResult& result, std::span<const double> values);
  void holdUnsettled(const EvaluationResult& result, std::span<const double> values);
  void follow(const std::optional<BestEvaluation>& best, const Held* finished);
  void write();
  void warn(std::string_view reason);
  ShownSeries shownSeries(std::size_t pair) const;

  std::string path_;
  RecordedSeries run_;
  std::function<double()> clock_;
  std::function<void(std::string_view)> warn_;
  std::optional<Held> initial_;
  InitialChoice initialChoice_;  ///< among the evaluations whose series are there
  std::optional<Held> best_;
  std::map<int, Held> unsettled_;  ///< evaluations whose aggregate comes later, by number
  std::size_t unsettledSteps_ = 0;
  bool isChanged_ = false;
  double nextWrite_ = 0.0;  ///< not before this time
  bool hasWarned_ = false;
};

}  // namespace mirevo
