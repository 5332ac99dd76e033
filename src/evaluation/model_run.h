#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/equal_measures.h"
#include "evaluation/evaluation_result.h"
#include "evaluation/folder_damage.h"
#include "evaluation/known_results.h"
#include "evaluation/model_description.h"
#include "evaluation/output_reader.h"
#include "evaluation/reading_process.h"
#include "evaluation/saved_files.h"
#include "evaluation/shown_runs.h"
#include "parameters/parameter_model.h"
#include "parameters/template_file.h"
#include "platform/processes/process_launcher.h"
#include "platform/processes/shared_targets.h"

namespace mirevo {

/// Model runs in slots: writes the input, starts the batch, and turns its output into a result. Used by the local loop
/// and by an MPI worker (which has slot 1 only).
class ModelRunner final {
 public:
  /// Reads and checks the templates and opens the observed series (all before any folder is made), then lets the
  /// launcher make the slots' folders; with a slot count of 0 (the MPI master, which runs no model) the launcher is not
  /// used. Throws FatalError.
  ModelRunner(ModelDescription description, ParameterModel& parameters, ObjectiveAggregator& aggregator,
              ProcessLauncher& launcher, const LauncherSettings& launcherSettings);
  ModelRunner(const ModelRunner&) = delete;  // the reader refers to the description
  ModelRunner& operator=(const ModelRunner&) = delete;

  /// Why the set cannot be run; empty if it can.
  std::optional<EvaluationFailure> findUnrunnable(std::span<const double> set);

  /// By what further model runs are judged.
  void setStandard(RunStandard standard) { output_->setStandard(std::move(standard)); }

  /// To be called before a model run in the slot: if the run before it has damaged the process folder, makes that anew,
  /// with a line in `warnings`. Returns why the slot cannot be used any more: this failed, or the run in the folder
  /// that was made anew has damaged it again. Empty if it can. `look` is called ten times a second while the folder is
  /// made, and may throw to end that.
  std::optional<FolderDamage> renewIfDamaged(int slot, std::vector<std::string>& warnings,
                                             const std::function<void()>& look = {});

  /// Builds the full parameter vector, removes the results of the slot's last run, writes the parameter files and
  /// starts the batch; or returns why the set is not run. `number`: of the evaluation; `isFinal`: of the best set of a
  /// search, which is run once more. Throws FatalError when a file cannot be removed or written.
  std::optional<EvaluationFailure> prepareModelRun(std::span<const double> set, int slot, int number,
                                                   bool isFinal = false);

  /// The result of the slot's batch, which must have ended; its number is 0. Faults of the model run give a failed
  /// result: files that cannot be read in what is left of the time of a model run among them. `look` is called about
  /// ten times a second while files are read, and may throw to end it. Throws FatalError if the setup or the
  /// observations are at fault.
  EvaluationResult collect(int slot, std::function<void()> look = {});
  /// The same, in a process of its own if that is worth it: empty while the files are read, or have to wait for others
  /// that are; to be called again then, when one of readingSockets() is readable.
  std::optional<EvaluationResult> collectBeside(int slot, const std::function<void()>& look);
  std::vector<int> readingSockets() const;
  bool isBeingRead(int slot) const { return slots_.at(static_cast<std::size_t>(slot - 1)).reading != nullptr; }
  /// Ends the processes that read; their results are lost.
  void endReading();
  /// Results that take less time to be read are read in this process, as starting another one would take as long; 0:
  /// none are.
  void readBesideFrom(double seconds) { leastSecondsBeside_ = seconds; }

  /// Keeps the output files of the slot's run, which belongs to evaluation `number`; adds those that could
  /// not be kept to `result`, with warnings. To be called before the slot's next run.
  /// `repeatedMeasures`: of the row that the evaluation has already, if its model was run again beside it; files are
  /// then kept only if the run has the same, and none of those that are there is replaced.
  void keepOutputFiles(int slot, int number, EvaluationResult& result,
                       std::span<const double> repeatedMeasures = {}) const;
  /// Notes in the result that none of them was kept, and why.
  void noteUnkeptFiles(EvaluationResult& result, std::string_view reason) const;

  /// Keeps a copy of the slot's folder after a failed run; adds a line to `warnings` when that is not possible.
  void keepFailedFolder(int slot, int number, std::vector<std::string>& warnings) const;

  /// A result with the failed-run value in every field.
  EvaluationResult failedResult(EvaluationFailure failure) const { return output_->failedResult(std::move(failure)); }

  ObjectiveAggregator& aggregator() { return aggregator_; }
  ProcessLauncher& launcher() { return launcher_; }
  /// What is read of model runs and observations.
  OutputReader& output() { return *output_; }
  const std::vector<ParameterTemplate>& templates() const { return templates_; }
  /// A check for a model that ignores its parameters, for the evaluations of a run.
  EqualMeasures equalMeasures() const;
  /// The sets of a run, none of which is run twice; knows nothing if the model is to be run for every set.
  KnownResults knownResults() const;
  /// What the user should know of links in the model's folder, and templateDoubts() of all templates.
  const std::vector<std::string>& warnings() const { return warnings_; }

 private:
  /// A process that starts, takes memory and ends costs about what reading 12 MB of text does, 20 ms.
  static constexpr double kLeastSecondsBeside = 0.05;

  /// Paths of one slot's copies of the model's files.
  struct SlotFiles {
    std::vector<std::string> parameterFiles;  ///< in the order of ModelDescription::parameterFiles
    OutputFiles output;
    bool isUsed = false;                      ///< a model has run in the folder
    bool isCleared = false;                   ///< it has no results of an earlier run, as has just been seen to
    bool isRenewed = false;                   ///< it was made anew, and no run has left it whole since
    double started = 0.0;                     ///< when the model run was, by runTimeClock() - readingSeconds_
    std::optional<double> ended;              ///< when its end was seen, likewise, until it is collected
    std::unique_ptr<ReadingProcess> reading;  ///< its results, now
  };

  FolderNeeds folderNeeds(const LauncherSettings& settings) const;
  void requireFilesInBaseFolder() const;
  void writeConvertedTemplates(int slot) const;
  static std::optional<FolderDamage> removeResults(const SlotFiles& files);
  void readTemplates();
  /// The failure of a set with a value that a template has no form for; empty when all can be written.
  std::optional<EvaluationFailure> findUnwritable(std::span<const double> modelValues) const;
  /// The part of a path in the base folder that follows it, with its leading "/".
  std::string belowBase(const std::string& file) const;
  std::string slotPath(const std::string& baseFile, int slot) const;
  void updateResistanceNumbers(const std::string& path);
  RunReading read(int slot);
  EvaluationResult complete(int slot, RunReading reading);
  bool isWorthProcess() const;
  bool mayStartReading(const SlotFiles& files) const;
  bool startReading(int slot);
  double secondsToRead(const SlotFiles& files) const;
  void beginReading(int slot, std::function<void()> look);
  std::optional<EvaluationFailure> findBatchFailure(int slot) const;

  ModelDescription description_;
  ParameterModel& parameters_;
  ObjectiveAggregator& aggregator_;
  ProcessLauncher& launcher_;
  std::string processFolderPrefix_;
  FolderNeeds needs_;
  std::vector<ParameterTemplate> templates_;  ///< one per parameter file
  std::vector<std::string> convertedTexts_;   ///< one per parameter file: that of a converted numeric-ID template
  std::vector<std::string> warnings_;
  std::optional<OutputReader> output_;  ///< once the templates have been read
  double maxSeconds_ = 0.0;             ///< of a model run; 0: no limit
  double readingSeconds_ = 0.0;         ///< that the results of model runs have kept this process so far
  /// Of the last two successful model runs, the seconds that reading took; one alone may have been held up.
  std::array<double, 2> lastReadings_{std::numeric_limits<double>::infinity(), 0.0};
  double lastStart_ = 0.0;  ///< seconds that starting a process that reads took
  double leastSecondsBeside_ = kLeastSecondsBeside;
  SavedFiles savedFiles_;
  SharedTargets sharedTargets_;  ///< looked at again after the first model run
  ShownRuns shownRuns_;
  std::vector<SlotFiles> slots_;
};

}  // namespace mirevo
