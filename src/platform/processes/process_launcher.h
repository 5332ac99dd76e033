#pragma once

#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/processes/folder_makers.h"

namespace mirevo {

/// One item of the simulation batch; the items of a batch run one after another.
struct BatchItem {
  std::string batchFileName;  ///< absolute path in the base folder
  std::string arguments;      ///< as in the setup; split as a shell splits words
};

struct LauncherSettings {
  std::string baseFolder;                  ///< absolute; with all files of the model; copied, never written to
  std::string processFolderPrefix;         ///< absolute; the slot's folder without its number, which follows
  std::vector<BatchItem> batchItems;       ///< at least one
  std::vector<std::string> ownFiles = {};  ///< below the base folder, with their leading "/": in no other slot's folder
  int slotCount = 1;
  int firstFolderNumber = 1;                        ///< number of the folder of slot 1; those of the other slots follow
  bool useSingleThread = false;                     ///< sets the usual thread-count variables to 1 for the model
  std::function<void(std::string_view)> warn = {};  ///< takes what the user should know
  bool linksReadOnlyFiles = false;                  ///< in the folders of slots, in place of copies
  std::function<bool()> isCancelled = {};  ///< called while the folders of slots are made; true throws RunCancelled
  std::function<void(const FoldersMade&)> tellOfFolders = {};  ///< called then ten times a second, and at the end
  double graceSeconds = 2.0;  ///< between SIGTERM and SIGKILL when processes are halted
  double maxSeconds = 0.0;    ///< longest time that a slot's batch may run, all items together; 0: no limit
};

/// How a slot's batch ended.
enum class BatchStatus : std::int32_t { succeeded = 0, failed = 1 };

/// Why a batch failed.
struct BatchFailure {
  enum class Kind { none, exitCode, signal, couldNotStart, timedOut };
  Kind kind = Kind::none;
  int code = 0;        ///< exit code or signal number
  std::string detail;  ///< one line for a person, naming the batch file: "run.sh exited with code 3"
};

/// Outcome of the update of a river model's resistance numbers.
enum class ResistanceUpdate {
  updated,
  functionNotFound,
  libraryNotFound,
  writeError,
  readError,
  documentCreationFailed,
  noReadAccess,
  wrongExtension,
};

/// Starts and watches the model's processes, one batch per slot, each slot in a folder of its own. Slots count from 1.
class ProcessLauncher {
 public:
  ProcessLauncher() = default;
  ProcessLauncher(const ProcessLauncher&) = delete;
  ProcessLauncher& operator=(const ProcessLauncher&) = delete;
  virtual ~ProcessLauncher() = default;

  /// Makes every slot's process folder a copy of the base folder, with each of the own files in it or nowhere. What
  /// remains there of an earlier run is certain to be the same.
  /// False when that fails; lastError() says why.
  virtual bool initialise(const LauncherSettings& settings) = 0;
  virtual const std::string& lastError() const = 0;

  /// Makes the process folder of a slot that runs nothing once more such a copy, whatever has become of it. False when
  /// that fails; lastError() says why. `look`, if any, is called ten times a second and may throw to end it.
  virtual bool renewFolder(int slot, const std::function<void()>& look) = 0;

  /// Absolute path of the slot's folder, without a trailing separator.
  virtual std::string getProcessFolder(int slot) const = 0;

  /// Starts the slot's batch. A batch that cannot be started is reported by isExecuting() as failed.
  virtual void createProcesses(int slot) = 0;

  /// `executing` becomes 1 while the slot's batch runs, else 0; `status` is then a BatchStatus. A batch that has run
  /// too long is ended here, and so are processes that a batch leaves; it counts as executing until they are gone.
  virtual void isExecuting(int slot, std::int32_t& executing, std::int32_t& status) = 0;

  /// Why the slot's last batch failed.
  virtual BatchFailure failure(int slot) const = 0;

  /// One line if the slot's last batch left processes behind that had to be ended, else empty.
  virtual std::string leftBehind(int slot) const = 0;

  /// What the user should know of starting and ending processes since the last call, one line each.
  virtual std::vector<std::string> takeWarnings() { return {}; }

  /// The last lines that the slot's last batch printed, at most `lineCount`.
  virtual std::vector<std::string> lastOutput(int slot, int lineCount) const = 0;

  /// Waits until a running batch has changed its state, one of the descriptors has become readable, a signal arrives,
  /// or `seconds` have passed. Returns at once if there is neither a batch nor a descriptor.
  virtual void waitForChange(double seconds, std::span<const int> readable = {}) = 0;
  /// For so long the program has not looked at its batches: an item that ended meanwhile has kept the next one waiting,
  /// which does not count as time of the batch.
  virtual void excludeTime(double seconds) { static_cast<void>(seconds); }

  /// Ends every process that was started and is still running, and returns when they are gone.
  virtual void haltProcesses() = 0;

  virtual ResistanceUpdate r35UpdateResistanceNumbers(const std::string& fileName) = 0;
};

}  // namespace mirevo
