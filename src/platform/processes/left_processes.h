#pragma once

#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <sys/types.h>
#include <vector>

#include "platform/processes/process_groups.h"
#include "platform/processes/process_mark.h"

namespace mirevo {

/// A process that went on when the batch that had started it was over.
struct LeftProcess {
  pid_t id = 0;
  std::string name;
  std::string batchFile;   ///< the item of the batch that left it, as far as that is known
  std::string problem;     ///< why it could not be ended; empty if it was
  bool isOfOther = false;  ///< perhaps left by a batch of another slot
};

/// Finds and ends what a batch leaves outside its process groups, such as daemons. The program becomes the parent of
/// every process of a model that loses its own parent: whether a batch has left anything is then told by the list of
/// the program's children, whatever a process did to its session or its environment, and without a look at the other
/// processes of the machine. To which slot a process belongs is told by its mark, else by its folder, files or command
/// line; one without such a sign is ended when the batches that were running when it was seen first have ended, which
/// are not over before. Slots count from 1.
class LeftProcesses final {
 public:
  /// `isOwn`: whether a child is one that the program itself started and waits for.
  LeftProcesses(const ProcessMark& mark, std::function<bool(pid_t)> isOwn) : mark_(mark), isOwn_(std::move(isOwn)) {}
  ~LeftProcesses();
  LeftProcesses(const LeftProcesses&) = delete;
  LeftProcesses& operator=(const LeftProcesses&) = delete;

  /// Makes this program the parent; false with the system's reason when that fails. Children that it has by now are
  /// left alone.
  bool adopt(std::string& reason);
  /// To be called for one slot after another, with its process folder.
  void addSlot(const std::string& folder);

  /// A batch of the slot begins.
  void begin(int slot);
  /// To be called now and then: takes note of new children and reaps those that have ended.
  void look();
  /// Notes processes that an item of the slot's batch has left in its group and that were sent SIGKILL.
  void addKilled(int slot, const std::string& batchFile, const std::vector<FoundProcess>& processes);
  /// The program itself has ended this group of the slot's batch: what is only still dying of it was not left.
  void addEndedGroup(int slot, pid_t group) { slotAt(slot).endedGroup = group; }
  /// To be called when the slot's batch is over, until it returns true: ends (SIGKILL) what the batch has left. True
  /// when nothing is left, or nothing but what cannot be ended. `batchFile`: the last item.
  bool areGone(int slot, const std::string& batchFile, double now);
  /// What the slot's last batch has left.
  const std::vector<LeftProcess>& of(int slot) const { return slotAt(slot).left; }

  /// Ends (SIGKILL) what any slot has left, and returns when it is gone or after `seconds`.
  void endAll(double seconds);

 private:
  struct Adopted {
    std::string name;
    int slot = 0;              ///< 0: not known
    std::set<int> candidates;  ///< slots one of which it belongs to, if that is not known
    pid_t group = 0;
    bool isKilled = false;
    bool isGivenUp = false;  ///< cannot be ended, and was named
  };
  struct Slot {
    std::string folder;
    bool isRunning = false;  ///< from the batch's begin until nothing of it is left
    bool hasEnded = false;   ///< its items have
    std::optional<double> endingSince;
    pid_t endedGroup = 0;  ///< 0: the program has not ended it
    std::vector<LeftProcess> left;
  };

  Slot& slotAt(int slot) { return slots_.at(static_cast<std::size_t>(slot - 1)); }
  const Slot& slotAt(int slot) const { return slots_.at(static_cast<std::size_t>(slot - 1)); }
  std::vector<pid_t> children() const;
  bool lookOnce();
  std::optional<Adopted> describe(pid_t id) const;
  static bool belongsTo(const Adopted& process, int slot);
  bool mayBelongToRunning(const Adopted& process) const;
  bool wasEnded(pid_t group) const;
  static void giveUp(pid_t id, Adopted& process, Slot& slot, const std::string& batchFile, std::string problem);

  const ProcessMark& mark_;
  std::function<bool(pid_t)> isOwn_;
  bool isParent_ = false;
  int childrenFile_ = -1;   ///< -1 where the kernel has none
  std::set<pid_t> others_;  ///< children that are of no batch
  std::map<pid_t, Adopted> adopted_;
  std::vector<Slot> slots_;
};

/// "run.sh left a process running, which was ended: sleep (123)"; empty without any.
std::string textOfLeft(const std::vector<LeftProcess>& left);

}  // namespace mirevo
