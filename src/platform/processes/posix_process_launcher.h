#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <sys/types.h>
#include <utility>
#include <vector>

#include "common/clock.h"
#include "common/file_lock.h"
#include "platform/processes/child_guard.h"
#include "platform/processes/left_processes.h"
#include "platform/processes/process_groups.h"
#include "platform/processes/process_launcher.h"
#include "platform/processes/process_mark.h"
#include "platform/processes/spawn_process.h"

namespace mirevo {

/// Runs batches as processes of this machine. Each item of a batch is a process group of its own; the output of the
/// batch goes to `mirevo_batch.log` in the slot's folder. When the first process of an item ends, the rest of its group
/// is ended. A process that has left the group (a daemon) may serve later items, and is ended when the batch is over,
/// which counts as executing until it is gone. No process of a batch outlives this program, however it ends.
class PosixProcessLauncher final : public ProcessLauncher {
 public:
  /// Seconds from an arbitrary origin, never decreasing.
  using MonotonicClock = std::function<double()>;

  explicit PosixProcessLauncher(MonotonicClock clock = runTimeClock) : clock_(std::move(clock)) {}
  ~PosixProcessLauncher() override;

  bool initialise(const LauncherSettings& settings) override;
  const std::string& lastError() const override { return lastError_; }
  bool renewFolder(int slot, const std::function<void()>& look) override;
  std::string getProcessFolder(int slot) const override;
  void createProcesses(int slot) override;
  void isExecuting(int slot, std::int32_t& executing, std::int32_t& status) override;
  BatchFailure failure(int slot) const override;
  std::string leftBehind(int slot) const override;
  std::vector<std::string> takeWarnings() override { return std::exchange(warnings_, {}); }
  std::vector<std::string> lastOutput(int slot, int lineCount) const override;
  void waitForChange(double seconds, std::span<const int> readable = {}) override;
  void excludeTime(double seconds) override;
  void haltProcesses() override;
  ResistanceUpdate r35UpdateResistanceNumbers(const std::string& fileName) override;

 private:
  struct Slot {
    std::string folder;
    bool isMade = false;                 ///< the folder, by this run
    std::vector<SpawnCommand> commands;  ///< one per batch item
    std::size_t item = 0;                ///< the item that runs, or ran last
    pid_t group = 0;                     ///< also its first process, which is not reaped yet; 0 while no item runs
    int pidfd = -1;                      ///< of that process; -1 where the kernel has none
    bool isEnding = false;               ///< no item runs, and what the batch has left may not be gone yet
    std::string mark;                    ///< in the environment of its processes
    double started = 0.0;                ///< when the batch began
    double unseen = 0.0;                 ///< seconds without a look at the batch, since the last one
    std::optional<double> overdue;       ///< when it was sent SIGTERM because it ran too long
    std::optional<double> heldBack;      ///< until when its end is not told, see holdBack()
    int log = -1;  ///< open for the whole run, so that a model run that prints nothing creates no file
    BatchFailure failure;
  };

  Slot& slotAt(int slot) { return slots_.at(static_cast<std::size_t>(slot - 1)); }
  const Slot& slotAt(int slot) const { return slots_.at(static_cast<std::size_t>(slot - 1)); }
  int numberOf(const Slot& slot) const { return static_cast<int>(&slot - slots_.data()) + 1; }
  void lockFolders(const LauncherSettings& settings);
  void makeFolders(const LauncherSettings& settings);
  void prepareSlot(const LauncherSettings& settings, int number,
                   const std::vector<std::vector<std::string>>& arguments);
  void prepareEnvironment(bool useSingleThread);
  void startGuard();
  bool renewLog(Slot& slot);
  void startItem(Slot& slot);
  void finishItem(Slot& slot, int code, int status);
  void holdBack(Slot& slot);
  void endOverdue(Slot& slot);
  bool isBusy(const Slot& slot) const { return slot.group > 0 || slot.isEnding || slot.heldBack; }
  double secondsToLook(const Slot& slot) const;
  void endRestOfGroup(Slot& slot);
  void haltGroups();
  void closeDescriptors();
  std::atomic<pid_t>& groupEntry(const Slot& slot) const;

  std::string lastError_;
  std::string baseFolder_;
  std::string processFolderPrefix_;
  std::vector<std::string> ownFiles_;
  bool linksReadOnlyFiles_ = false;
  FileLock lock_;  ///< on the process folders
  MonotonicClock clock_;
  double graceSeconds_ = 0.0;
  double maxSeconds_ = 0.0;
  std::vector<Slot> slots_;
  ProcessMark mark_;
  std::vector<std::string> environmentTexts_;
  std::vector<char*> environment_;  ///< the last but one is the slot's mark
  int nullInput_ = -1;
  std::vector<int> ignoredSignals_;
  std::unique_ptr<ProcessGroupTable> groups_;
  std::unique_ptr<ChildGuard> guard_;
  std::unique_ptr<LeftProcesses> left_;
  std::function<void(std::string_view)> warn_;
  std::vector<std::string> warnings_;
};

}  // namespace mirevo
