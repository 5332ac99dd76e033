#pragma once

#include <cstddef>
#include <cstdint>
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

/// Where the series of a pair is among the simulated values that are kept of an evaluation.
struct KeptSeries {
  std::size_t first = 0;
  std::vector<std::int64_t> seconds;  ///< secondNumber() of the observations
};

/// What the recorder needs to know of a run. `measures` and `observations` have one entry per pair of series that is
/// compared.
struct RecordedSeries {
  std::vector<std::string> headLines;
  std::string task;                        ///< its key
  std::vector<std::string> measures;       ///< names in the series file
  std::vector<PeriodSeries> observations;  ///< with one step before and after the period
  std::int64_t periodFirst = 0;            ///< secondNumber() of the ends of the period
  std::int64_t periodLast = 0;
  double largestGap = kAnyGap;        ///< days between two simulated steps over which is interpolated
  std::vector<double> initialValues;  ///< initial values of the variable parameters, model scale
  std::vector<KeptSeries> kept = {};  ///< of the pairs, for a task that keeps the simulated values of all evaluations
  bool keepsSteps = false;            ///< at the simulated steps, too
  bool keepsAllPeriods = true;        ///< what is kept reaches over the validation periods, too
  std::int64_t evaluationFirst = 0;   ///< secondNumber() of the ends of the evaluation period; not used if it does
  std::int64_t evaluationLast = 0;
};

/// Keeps `<setup>_Series.dat`: the simulated series of the initial and of the best evaluation so far. The file is
/// replaced as a whole and never half written, and so rarely that writing takes at most about a hundredth of the run's
/// time.
class SeriesRecorder final {
 public:
  /// `clock` returns seconds, never decreasing. `warn` is called once with the reason if the file cannot be written.
  SeriesRecorder(std::string path, RecordedSeries run, std::function<double()> clock,
                 std::function<void(std::string_view)> warn);

  /// Takes over the series that an earlier run of the same setup has recorded, as its evaluations are not repeated.
  void resume(const SeriesTable& table);

  /// Takes a finished evaluation; `values` are on the model scale. `best` is the best of the run, including this one.
  void evaluationFinished(const EvaluationResult& result, std::span<const double> values,
                          const std::optional<BestEvaluation>& best);

  /// Takes a successful evaluation of an earlier run. Of its series there is what resume() has taken over, or else what
  /// was kept of its simulated values: at the times of the observations, and often in the evaluation period alone.
  void evaluationPassed(const EvaluationResult& result, std::span<const double> values,
                        const std::optional<BestEvaluation>& best);

  /// Takes the aggregate of an evaluation for which it was not known before.
  void aggregateSettled(int number, double aggregate);

  /// At the end of the run: writes what is not written yet, and warns of series that are not there; never throws.
  /// `best` is the best evaluation of the run.
  void finish(const std::optional<BestEvaluation>& best);

 private:
  /// The series of one evaluation.
  struct Held {
    ShownEvaluation evaluation;
    std::vector<double> values;
    std::vector<PeriodSeries> series;  ///< empty if they are not there
    std::string lack = {};             ///< where alone they are; empty: everywhere
  };
  void holdInitial(const EvaluationResult& result, std::span<const double> values);
  void holdUnsettled(Held held);
  void follow(const std::optional<BestEvaluation>& best, const Held* finished);
  std::optional<Held> heldOfKept(const EvaluationResult& result, std::span<const double> values) const;
  std::vector<std::string> notes() const;
  std::string missing(std::string_view which, int number) const;
  void warnOfMissing();
  void write();
  void warn(std::string_view reason);
  /// The times of the pair in the period at which it has any value.
  std::vector<std::int64_t> secondsOf(std::size_t pair) const;
  ShownSeries shownSeries(std::size_t pair) const;
  static const PeriodSeries& seriesOf(const std::optional<Held>& held, std::size_t pair);

  std::string path_;
  RecordedSeries run_;
  std::function<double()> clock_;
  std::function<void(std::string_view)> warn_;
  std::optional<Held> initial_;
  InitialChoice initialChoice_;  ///< among the evaluations that have series
  std::optional<Held> best_;
  std::optional<Held> earlierBest_;  ///< of the run that goes on, while earlier evaluations pass
  std::map<int, Held> unsettled_;    ///< evaluations whose aggregate comes later, by number
  std::size_t unsettledSteps_ = 0;
  bool isChanged_ = false;
  double nextWrite_ = 0.0;  ///< not before this time
  bool hasWarned_ = false;
  bool hasEnded_ = false;
  bool isContinued_ = false;  ///< evaluations of an earlier run have passed
};

}  // namespace mirevo
