#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/searches/search_method.h"
#include "common/data_table.h"
#include "common/progress_messages.h"
#include "common/run_files.h"
#include "common/settings/keyword_row.h"
#include "evaluation/evaluator.h"
#include "measures/objective_functions.h"
#include "measures/observed_series.h"
#include "measures/output_measure.h"
#include "parameters/search_space.h"
#include "run/access/setup_access.h"
#include "run/progress/run_log.h"

namespace mirevo {

struct SensitivitySettings;

/// What is always true of a task, whatever its settings.
struct TaskFacts {
  CodeName name;              ///< in setups; the name also tells reports which task it is: "optimisation"
  std::string_view longName;  ///< "parameter optimisation"
  ResultFileNames resultFiles;
};

/// What a task may look at while it reads its sections.
struct TaskReading {
  const SetupSection& target;
  std::span<const ModelParameter> parameters;
  std::span<const SetupSection> parameterSections;  ///< one per parameter
  std::size_t variableCount = 0;
  /// Refuses an aggregation method whose scales neither the setup nor an initial sample can give.
  std::function<void(bool hasInitialSample)> requireScales;
};

/// What a task works with when it runs.
struct TaskContext {
  const SearchSpace& space;
  std::span<const ModelParameter> parameters;
  std::span<const OutputMeasure> measures;
  std::span<const ObjectiveFunction> objectives;
  Evaluator& evaluator;
  RunLog& log;
  /// Told what a search has found, before the final model run repeats its best parameter set. May be empty.
  std::function<void(const SearchSummary&)> searchEnded = {};
  std::string filePrefix = {};  ///< folder and name of the setup: the names of the run's files begin with it
  /// The observations whose simulated values the results hold; needed where the task keepsSimulatedValues().
  std::span<const ObservedSeries> observedSeries = {};
};

/// A file beside the results.
struct TaskFile {
  std::string path;
  std::string content;
};

/// How a task ended and what it found.
struct TaskOutcome {
  std::string terminationMessage;
  std::vector<std::string> report = {};  ///< for people, at the end of the result file; the log has it already
  std::vector<DataTable> tables = {};    ///< for programs, one file each
  std::vector<TaskFile> files = {};
};

/// What a report shows of a task besides its evaluations.
struct TaskReport {
  std::string algorithm = {};                        ///< of a search: "DDS"
  std::string surrogate = {};                        ///< the surrogate model that assists it; empty: none
  int populationSize = 0;                            ///< 0: none
  bool hasBands = false;                             ///< of simulated series
  const SensitivitySettings* sensitivity = nullptr;  ///< of a local sensitivity analysis
};

/// Why more slots than one are refused.
struct OneSlotOnly {
  std::string_view refusal;  ///< the fixed text
  std::string_view keyword;  ///< whose value it is that needs one slot
};

/// A task together with its settings: everything that a setup, a run, a restart or a report asks about it. One form per
/// task, in a file pair of its own; tasks.h lists them.
class Task {
 public:
  Task() = default;
  Task(const Task&) = delete;
  Task& operator=(const Task&) = delete;
  virtual ~Task() = default;

  virtual const TaskFacts& facts() const = 0;
  /// Its sections with their keywords, in reading order, for the schema of setups.
  virtual std::vector<const SectionRow*> sections() const = 0;
  /// Reads and checks its sections. Throws FatalError.
  virtual void read(const TaskReading& reading) = 0;
  /// Whether it calls requireScales() itself, because it may have an initial sample.
  virtual bool mayHaveInitialSample() const { return false; }

  /// "Parameter optimisation: Dynamically Dimensioned Search"
  virtual std::string description() const = 0;
  /// Further lines for the summary of the setup.
  virtual std::vector<std::string> summaryLines(std::size_t variableCount) const;

  /// Evaluations that are planned, of n variable parameters; they size the failed-run limit.
  virtual int plannedEvaluations(std::size_t variableCount) const = 0;
  /// Whether a final model run repeats the best parameter set.
  virtual bool hasFinalRun() const { return false; }
  /// Whether the results depend on the random seed.
  virtual bool drawsRandomNumbers() const { return false; }
  /// Whether it works with simulated values at the observation times, which the results then have to hold.
  virtual bool keepsSimulatedValues() const { return false; }
  /// Nothing where its batches fill several slots.
  virtual std::optional<OneSlotOnly> needsOneSlot() const { return std::nullopt; }

  /// Runs it. Throws FatalError and RunCancelled.
  virtual TaskOutcome run(const TaskContext& context) = 0;

  virtual TaskReport report() const { return {}; }

  /// Of a search, what becomes of an earlier one with a smaller budget; nothing where the budget was not raised.
  virtual std::optional<RaisedBudget> raisedBudget(const SearchHistory& history) const;
  /// Of a search: that it continues others with smaller budgets, which the run that is continued has made.
  virtual void continueFrom(std::vector<EarlierSearch> searches);
  virtual std::vector<EarlierSearch> earlierSearches() const { return {}; }

  /// Of the initial sample and of the uncertainty analysis: one setting.
  std::int32_t randomSeed = 1;
};

/// How a task ends that has nothing else to say.
inline constexpr std::string_view kEndOfTask = progress::kNormalTermination;

}  // namespace mirevo
