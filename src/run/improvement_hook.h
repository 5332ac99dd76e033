#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/processes/side_command.h"
#include "run/progress/run_log.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The best evaluation, as the improvement command is told of it.
struct HookValues {
  using Named = std::vector<std::pair<std::string, double>>;

  int number = 0;
  double aggregate = 0.0;
  Named parameters;  ///< all, model scale
  Named measures;
  Named objectives;
};

/// Runs the improvement command of a setup beside the run: one at a time, the newest improvement waits, and those that
/// it replaces are skipped. Whatever becomes of it, the run goes on.
class ImprovementHook final {
 public:
  /// All must outlive the object.
  ImprovementHook(const RunConfig& config, RunLog& log) : config_(config), log_(log) {}

  /// An evaluation is the best so far.
  void improved(HookValues best);
  /// To be called often: takes note of a command that has ended and starts the one that waits. Does not wait.
  void look();
  /// At the end of the run, "finished", "cancelled" or "failed": waits for the command that runs, if the run is
  /// finished, otherwise ends it; then runs the command for the end and waits for it, after an error for ten seconds at
  /// most, once there is a kill file for two. `isOfJob`: of several processes, where a cancelled run has one second for
  /// it, and another that finds a kill file does not run it. `isCancelled`: whether there is a kill file.
  void finish(std::string_view state, const std::optional<HookValues>& best, bool isOfJob,
              const std::function<bool()>& isCancelled);

 private:
  void start(std::string_view reason, std::string_view state, const std::optional<HookValues>& best, double mostSeconds,
             bool isUrgent = false);
  void stop(bool isUrgent);
  void awaitEnd(const std::function<bool()>& isCancelled);
  double lateSeconds(bool isUrgent) const;
  void tellOf(const SideCommandEnd& end);
  void tellOfAll();
  void fail(const std::string& text);

  const RunConfig& config_;
  RunLog& log_;
  SideCommand command_;
  std::string running_;  ///< what it was started for
  double mostSeconds_ = 0.0;
  double deadline_ = 0.0;  ///< of the wait for its end
  bool isOfJob_ = false;
  std::optional<HookValues> waiting_;
  int starts_ = 0;
  int failures_ = 0;
  int skipped_ = 0;
};

/// What the command gets besides its input: its environment. The parameters are not in it if they would take more than
/// 100 kB, nor are the objectives: systems start nothing with too large a one.
std::vector<std::string> hookVariables(const RunConfig& config, std::string_view reason, std::string_view state,
                                       const std::optional<HookValues>& best);
/// Its input: a table with the columns Kind, Name and Value.
std::string hookTable(const std::optional<HookValues>& best);

}  // namespace mirevo
