#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "run/results/result_table.h"
#include "run/results/series_table.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// How far a run has come.
enum class RunStage { running, finished, cancelled, failed, cutOff };

/// What files call it: "running", "finished", "cancelled", "failed" or "cut off".
std::string_view runStageKey(RunStage stage);

/// The account of a run for programs to read, such as `<setup>_Run.dat`: a table of keys and values. What is not known
/// yet is left out.
struct RunRecord {
  std::string task;     ///< its key
  std::string program;  ///< its version
  std::string started;
  std::vector<std::string> restarted;  ///< each time
  int plannedEvaluations = 0;          ///< 0: unknown
  std::optional<int> seed;             ///< where the task draws random numbers

  /// What a measure compares, see MeasureSource.
  struct Compared {
    std::string simulated;
    std::string observed;
  };
  std::map<int, Compared> compared;  ///< by the number of the measure

  int warningCount = 0;
  std::vector<std::string> warnings;  ///< the first of them

  std::optional<int> initialEvaluation;
  std::optional<ShownEvaluation> best;
  std::optional<int> evaluations;
  std::optional<int> failed;
  int repeats = 0;  ///< evaluations that have the result of an earlier one, without a model run
  std::vector<std::pair<std::string, int>> failuresByKind;
  int lostRuns = 0;  ///< model runs that were made again, as the worker of the job that had them was lost
  /// Of an analysis that did not come to its end, the evaluations of which it gives statistics; without any, nothing.
  std::optional<int> analysed;
  /// Of one objective function, on the way to the aggregate.
  struct Scale {
    std::string objective;
    double sigma = 0.0;
    double mu = 0.0;
  };
  std::vector<Scale> scales;

  /// How many lines the files of an analysis have, by their names: those that are no tables.
  std::vector<std::pair<std::string, int>> lines;
  std::optional<int> linesOf(std::string_view file) const;

  std::string ended;  ///< nothing where a signal ended the run
  /// Nothing while the run goes on, or where it was killed.
  std::optional<RunStage> stage;
  std::string message;  ///< why it ended
};

/// The table as text; `headLines` are for people.
std::string runRecordText(const RunRecord& record, const std::vector<std::string>& headLines);
/// Reads that text. Any text is taken; nothing where it is no such table.
std::optional<RunRecord> readRunRecord(std::string_view text);

/// What a signal handler that ends the run writes behind the record, with its message and a line end behind it.
std::string endingBeforeMessage(RunStage stage);

/// What the result file of a version of the program without records says of its run. Its lines were for people, and
/// this reads them as they were then.
RunRecord recordOfEarlierVersion(const ResultTable& results);

}  // namespace mirevo
