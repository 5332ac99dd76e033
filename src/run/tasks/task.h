#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/analyses/evaluated_sample.h"
#include "algorithms/searches/search_method.h"
#include "common/data_table.h"
#include "common/parameter_set.h"
#include "common/progress_messages.h"
#include "common/run_files.h"
#include "common/settings/keyword_row.h"
#include "evaluation/evaluator.h"
#include "measures/kept_steps.h"
#include "measures/objective_functions.h"
#include "measures/observed_series.h"
#include "measures/output_measure.h"
#include "measures/validation_period.h"
#include "parameters/feasibility.h"
#include "parameters/parameter_fields.h"
#include "parameters/search_space.h"
#include "run/access/setup_access.h"
#include "run/progress/run_log.h"

namespace mirevo {

class ParameterDistributions;
struct SensitivitySettings;
struct DreamSettings;
struct SobolSettings;

/// A form of a task and the keyword that selects it.
struct TaskForm {
  std::string_view section = {};  ///< "SENSITIVITY_ANALYSIS"; empty: the task has one form only
  std::string_view keyword = {};  ///< "Sensitivity_Type"
  CodeName name = {};             ///< one of the codes of the keyword
};

/// What is true of a task whatever its settings.
struct TaskFacts {
  CodeName name;              ///< in setups; the name is also used in the run record and the report: "optimisation"
  std::string_view longName;  ///< "parameter optimisation"
  ResultFileNames resultFiles;
  /// Of a task of several forms, each a Task of its own, the one that this is, as in `Sensitivity_Type = 'Morris'`. All
  /// have the same name and results, and share the section with the keyword that chooses among them.
  TaskForm form = {};
};

/// What a task may use while it reads its sections.
struct TaskReading {
  const SetupSection& target;
  std::span<const ModelParameter> parameters;
  std::span<const SetupSection> parameterSections;  ///< one per parameter
  std::span<const InternalConstraint> constraints;
  std::size_t variableCount = 0;
  /// Refuses an aggregation method whose scales are neither given in the setup nor determined from an initial sample.
  std::function<void(bool hasInitialSample)> requireScales;
  EvaluationPeriod period = {};
  std::string filePrefix = {};  ///< folder and name of the setup: the beginning of the paths of the run's files
  std::span<const OutputMeasure> measures = {};
  std::span<const ObjectiveFunction> objectives = {};
};

/// What was expected instead of so many sets of n parameters, all of which are in memory; empty if they fit into it.
std::optional<std::string> tooManySets(std::int64_t sets, std::size_t n);
/// The same of a task that has but a part of its sets in memory.
std::optional<std::string> tooManySets(std::int64_t sets);

/// What is known of sets that will be evaluated although they cannot be run, before the first model run.
struct SetDoubt {
  std::string text;
  bool endsRun = false;  ///< more of them than may fail: the run will end before it is complete
};

/// What a task uses when it runs.
struct TaskContext {
  const SearchSpace& space;
  std::span<const ModelParameter> parameters;
  std::span<const OutputMeasure> measures;
  std::span<const ObjectiveFunction> objectives;
  Evaluator& evaluator;
  RunLog& log;
  /// Called with what a search has found, before the final model run repeats its best parameter set. May be empty.
  std::function<void(const SearchSummary&)> searchEnded = {};
  std::string filePrefix = {};  ///< folder and name of the setup: the beginning of the paths of the run's files
  /// The observations whose simulated values are kept; needed if the task keepsSimulatedValues().
  std::span<const ObservedSeries> observedSeries = {};
  ParameterFields fields = {};
  /// The aggregate of the objective functions' values. May be empty.
  std::function<double(std::span<const double> objectiveValues)> aggregate = {};
  Feasibility feasibility = {};  ///< which sets can be run, of a model with constraints or equations
  /// Shows the user a warning that the log receives as well. May be empty.
  std::function<void(std::string_view)> warnUser = {};
  /// The parameters that are not variable, for values of the variable ones on the model scale, "K = 3 (fixed)". May be
  /// empty.
  std::function<std::vector<std::string>(std::span<const double> variable)> otherParameters = {};
  /// SimulatedValuesFile::columns(), if the task readsSimulatedValues().
  SimulatedColumns simulatedColumns = {};
  std::span<const ValidationPeriod> validationPeriods = {};
  /// The evaluations of an earlier run with the same parameters, output measures and objective functions, by the path
  /// of its result file. Throws FatalError. May be empty.
  std::function<EarlierSample(const std::string& resultFile)> earlierSample = {};
  /// The observations in validation periods, if the task keepsSimulatedValues().
  std::span<const ValidationObservations> validationObservations = {};
  AggregationMethod aggregationMethod = AggregationMethod::none;
};

/// A file beside the results.
struct TaskFile {
  std::string path;
  std::string content;
};

/// How a task ended and what it found.
struct TaskOutcome {
  std::string terminationMessage;
  std::vector<std::string> report = {};  ///< for people, at the end of the result file; already in the log
  std::vector<DataTable> tables = {};    ///< for programs, one file each
  std::vector<TaskFile> files = {};
};

/// What a report shows of a task besides its evaluations.
struct TaskReport {
  std::string algorithm = {};                             ///< the name of the search: "DDS"; empty: none
  std::string surrogate = {};                             ///< the surrogate model that assists it; empty: none
  int populationSize = 0;                                 ///< 0: none
  bool hasBands = false;                                  ///< it writes bands of simulated series
  bool isGlue = false;                                    ///< it writes the weights of GLUE
  const SensitivitySettings* sensitivity = nullptr;       ///< for a local sensitivity analysis, else null
  bool hasMorris = false;                                 ///< it writes the table of a Morris screening
  const SobolSettings* sobol = nullptr;                   ///< for Sobol' indices, else null
  const DreamSettings* chains = nullptr;                  ///< of Markov chains, else null
  const ParameterDistributions* distributions = nullptr;  ///< from which the sets were drawn; null: none
  std::vector<std::string> runNames = {};  ///< of the evaluations, from the first on; empty where one has none
};

/// Why more than one slot is refused.
struct OneSlotOnly {
  std::string_view refusal;  ///< the fixed text
  std::string_view keyword;  ///< the keyword whose value requires one slot
  std::string advice;        ///< what makes several model runs at a time in its place
};

/// A task together with its settings: everything that a setup, a run, a restart or a report asks about it. One class
/// per task, in a file pair of its own; tasks.cpp lists them.
class Task {
 public:
  Task() = default;
  Task(const Task&) = delete;
  Task& operator=(const Task&) = delete;
  virtual ~Task() = default;

  virtual const TaskFacts& facts() const = 0;
  /// Its sections with their keywords, in reading order, for the schema of setups.
  virtual std::vector<const SectionRow*> sections() const = 0;
  /// The paths of those that a setup needs, as far as that can be told before they are read; `target` holds them.
  virtual std::vector<std::string> neededSections(const SetupSection& target) const;
  /// Reads and checks its sections. Throws FatalError.
  virtual void read(const TaskReading& reading) = 0;
  /// The values that its sections give for a parameter, by its 0-based position; runs get them exactly.
  virtual std::vector<double> givenValues(std::size_t parameter) const;
  /// Whether it may have an initial sample; if so, read() calls requireScales().
  virtual bool mayHaveInitialSample() const { return false; }

  /// "Parameter optimisation: Dynamically Dimensioned Search"
  virtual std::string description() const = 0;
  /// Further lines for the summary of the setup.
  virtual std::vector<std::string> summaryLines(const SearchSpace& space) const;
  /// Warnings for the log about settings that work but may not be meant.
  virtual std::vector<std::string> warnings(const SearchSpace& /*space*/) const { return {}; }

  /// Number of planned evaluations, once its sections are read, on which the failed-run limit is based.
  virtual int plannedEvaluations() const = 0;
  /// Number of slots that it can use.
  virtual int mostAtOnce() const { return plannedEvaluations(); }
  /// Whether a final model run repeats the best parameter set.
  virtual bool hasFinalRun() const { return false; }
  /// Whether the results depend on the random seed.
  virtual bool drawsRandomNumbers() const { return false; }
  /// Whether it uses the simulated values at the observation times.
  virtual bool keepsSimulatedValues() const { return false; }
  /// Whether it reads them from disk when all evaluations have ended; results then do not hold them.
  virtual bool readsSimulatedValues() const { return false; }
  /// Whether it uses them at the simulated steps, too.
  virtual std::optional<KeptSteps> keptSteps() const { return std::nullopt; }
  virtual SeriesPrecision keptPrecision() const { return SeriesPrecision::single; }
  /// How many of its evaluations, the first ones, are shown with their series one beside another; 0: none.
  virtual int shownRuns() const { return 0; }
  /// Whether the model is run for every set, even if it was run for an equal one.
  virtual bool runsEverySet() const { return false; }
  /// Whether it uses the output measures in 64 bits, which the results then must hold.
  virtual bool usesExactMeasures() const { return false; }
  /// Empty if its batches fill several slots.
  virtual std::optional<OneSlotOnly> needsOneSlot() const { return std::nullopt; }

  /// Throws FatalError if run() would before its first model run, as there is no parameter set that can be run. Takes
  /// nothing from the random numbers of run().
  virtual void requireSets(const SearchSpace& /*space*/, const Feasibility& /*feasibility*/) const {}

  /// Throws FatalError if run() would before its first model run, as its settings do not fit the observations, which
  /// are those of TaskContext::observedSeries.
  virtual void requireObservations(const SearchSpace& /*space*/, std::span<const OutputMeasure> /*measures*/,
                                   std::span<const ObjectiveFunction> /*objectives*/,
                                   std::span<const ObservedSeries> /*observed*/) const {}

  /// What run() will warn of before its first model run: sets that will be evaluated although they cannot be run.
  virtual std::vector<SetDoubt> setDoubts(const SearchSpace& /*space*/, const Feasibility& /*feasibility*/) const {
    return {};
  }
  /// For a check of the setup whose initial values cannot be run: a set that can, of those that run() may evaluate.
  /// Empty where there is none, and for a task that evaluates the initial values.
  virtual std::optional<ParameterSet> trialSet(const SearchSpace& /*space*/, const Feasibility& /*feasibility*/) const {
    return std::nullopt;
  }
  /// Whether sets are judged by their aggregate alone.
  virtual bool judgesByAggregate() const { return true; }
  /// The result file of an earlier run whose evaluations it takes, TaskContext::earlierSample; empty: none.
  virtual std::string earlierResultFile() const { return {}; }

  /// Runs it. Throws FatalError and RunCancelled.
  virtual TaskOutcome run(const TaskContext& context) = 0;

  /// What can be said of the evaluations `made` when an error or a cancellation has ended run(); nothing is logged.
  /// Empty if nothing can, and for a task without statistics.
  virtual std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& /*context*/,
                                                       const UnfinishedBatch& /*made*/) const {
    return std::nullopt;
  }

  /// Of a task whose unfinishedOutcome() is of other evaluations than the successful ones of `made`, how many these
  /// are: those of batches that came to their end, say.
  virtual std::optional<int> unfinishedEvaluations(const UnfinishedBatch& /*made*/) const { return std::nullopt; }

  virtual TaskReport report() const { return {}; }

  /// For a search, what becomes of an earlier one with a smaller budget; empty if the budget was not raised.
  virtual std::optional<RaisedBudget> raisedBudget(const SearchHistory& history) const;
  /// Tells a search which searches with smaller budgets, made by the earlier run, it continues.
  virtual void continueFrom(const std::vector<EarlierSearch>& searches);
  virtual std::vector<EarlierSearch> earlierSearches() const { return {}; }

  /// One setting for the initial sample and the uncertainty analysis.
  std::int32_t randomSeed = 1;
};

/// The termination message of a task that has none of its own.
inline constexpr std::string_view kEndOfTask = progress::kNormalTermination;

}  // namespace mirevo
