#include "run/improvement_hook.h"

#include <algorithm>
#include <iterator>
#include <set>
#include <unistd.h>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr double kFailedSeconds = 10.0;  ///< longest time of the command at the end of a run that has failed
constexpr double kCancelledSeconds = 2.0;
/// The same of a job, which a kill file ends within five seconds. Its workers have two and a half to end their models,
/// and the command has its time meanwhile.
constexpr double kCancelledJobSeconds = 1.0;
constexpr double kGraceSeconds = 2.0;  ///< from SIGTERM to SIGKILL
constexpr double kUrgentGraceSeconds = 0.2;
/// Longest wait for a command beyond its time: what waits for a lost network drive cannot be ended.
constexpr double kLateSeconds = 5.0;
constexpr double kLateJobSeconds = 0.5;
constexpr std::size_t kMostVariableBytes = 100'000;
constexpr std::string_view kParameterFront = "MIREVO_PARAMETER_";
constexpr std::string_view kObjectiveFront = "MIREVO_OBJECTIVE_";
constexpr int kMostFailuresShown = 20;
constexpr unsigned kPauseMicroseconds = 5000;

/// A name as the end of that of an environment variable: letters, digits and "_".
std::string variableName(std::string_view name) {
  std::string text(name);
  for (char& c : text) {
    const bool isAllowed = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
    if (!isAllowed) c = '_';
  }
  return text;
}

/// Of names that would be the same all but the first get a number. None, if all would take too much.
void addVariables(std::string_view front, const HookValues::Named& values, std::vector<std::string>& variables) {
  std::set<std::string> used;
  std::vector<std::string> added;
  std::size_t size = 0;
  for (const auto& [name, value] : values) {
    const std::string stem = variableName(name);
    std::string unique = stem;
    for (int number = 2; !used.insert(unique).second; ++number) unique = fmt::format("{}_{}", stem, number);
    added.push_back(fmt::format("{}{}={}", front, unique, formatReal(value)));
    size += added.back().size() + 1;
  }
  if (size <= kMostVariableBytes) std::move(added.begin(), added.end(), std::back_inserter(variables));
}

}  // namespace

std::vector<std::string> hookVariables(const RunConfig& config, std::string_view reason, std::string_view state,
                                       const std::optional<HookValues>& best) {
  std::vector<std::string> variables{
      fmt::format("MIREVO_REASON={}", reason),
      fmt::format("MIREVO_STATE={}", state),
      "MIREVO_SETUP=" + config.setupFile,
      "MIREVO_FOLDER=" + config.setupFolder,
      "MIREVO_NAME=" + config.setupName,
      "MIREVO_EVALUATION=" + (best ? std::to_string(best->number) : std::string()),
      "MIREVO_AGGREGATE=" + (best ? formatReal(best->aggregate) : std::string()),
      "MIREVO_VALUES=/dev/stdin",
  };
  if (!best) return variables;
  addVariables(kParameterFront, best->parameters, variables);
  addVariables(kObjectiveFront, best->objectives, variables);
  return variables;
}

std::string hookTable(const std::optional<HookValues>& best) {
  DataTable table;
  table.columns = {"Kind", "Name", "Value"};
  const auto add = [&table](const char* kind, const HookValues::Named& values) {
    for (const auto& [name, value] : values) table.rows.push_back({std::string(kind), name, value});
  };
  if (best) {
    add("parameter", best->parameters);
    add("measure", best->measures);
    add("objective", best->objectives);
    add("aggregate", {{"Aggregate", best->aggregate}});
  }
  return dataTableText(table);
}

void ImprovementHook::improved(HookValues best) {
  look();
  if (!command_.isRunning()) return start("improvement", "running", std::move(best), config_.improvementCommandTime);
  if (waiting_) ++skipped_;
  waiting_ = std::move(best);
}

void ImprovementHook::look() {
  if (const auto end = command_.take()) tellOf(*end);
  if (command_.isRunning() || !waiting_) return;
  const std::optional<HookValues> next = std::exchange(waiting_, std::nullopt);
  start("improvement", "running", next, config_.improvementCommandTime);
}

void ImprovementHook::finish(std::string_view state, const std::optional<HookValues>& best, bool isOfJob,
                             const std::function<bool()>& isCancelled) {
  isOfJob_ = isOfJob;
  if (std::exchange(waiting_, std::nullopt)) ++skipped_;  // the end has the same set
  if (state != "finished") stop(state == "cancelled");
  awaitEnd(isCancelled);
  const bool isUrgent = state == "cancelled" || isCancelled();
  if (isUrgent && isOfJob_ && state != "cancelled") {  // the wait for the workers may have taken the five seconds
    log_.warning("The improvement command was not run at the end of the run, because of the kill file");
    return tellOfAll();
  }
  double limit = config_.improvementCommandTime;
  if (state == "failed") limit = std::min(limit, kFailedSeconds);
  if (isUrgent) limit = std::min(limit, isOfJob_ ? kCancelledJobSeconds : kCancelledSeconds);
  start("end", state, best, limit, isUrgent);
  // A kill file that is there already leaves it its time.
  awaitEnd(isUrgent ? std::function<bool()>() : isCancelled);
  tellOfAll();
}

void ImprovementHook::tellOfAll() {
  log_.line(fmt::format("The improvement command was run {}, {} of them failed{}",
                        countText(static_cast<std::size_t>(starts_), "time"), failures_,
                        skipped_ == 0 ? std::string()
                                      : fmt::format("; {} skipped, as a newer one waited",
                                                    countText(static_cast<std::size_t>(skipped_), "improvement was",
                                                              "improvements were"))));
}

void ImprovementHook::start(std::string_view reason, std::string_view state, const std::optional<HookValues>& best,
                            double mostSeconds, bool isUrgent) {
  running_ = reason == "end" ? "at the end of the run" : fmt::format("for evaluation No. {}", best->number);
  mostSeconds_ = mostSeconds;
  const double grace = isUrgent ? kUrgentGraceSeconds : kGraceSeconds;
  deadline_ = runTimeClock() + mostSeconds + grace + lateSeconds(isUrgent);
  std::vector<std::string> variables = hookVariables(config_, reason, state, best);
  if (++starts_ == 1 && best && !best->parameters.empty() &&
      std::none_of(variables.begin(), variables.end(),
                   [](const std::string& variable) { return variable.starts_with(kParameterFront); })) {
    log_.line(fmt::format(
        "The improvement command gets the parameters by its table alone, as {} variables would take more than {} kB",
        best->parameters.size(), kMostVariableBytes / 1000));
  }
  std::string reasonOfFailure;
  const SideCommandCall call{config_.improvementCommand, config_.setupFolder, hookTable(best),
                             std::move(variables),       mostSeconds,         grace};
  if (!command_.start(call, reasonOfFailure)) {
    fail(fmt::format("The improvement command {} could not be started: {}", running_, reasonOfFailure));
  }
}

double ImprovementHook::lateSeconds(bool isUrgent) const {
  return isUrgent && isOfJob_ ? kLateJobSeconds : kLateSeconds;
}

void ImprovementHook::stop(bool isUrgent) {
  const double grace = isUrgent ? kUrgentGraceSeconds : kGraceSeconds;
  command_.stop(grace);
  deadline_ = std::min(deadline_, runTimeClock() + grace + lateSeconds(isUrgent));
}

void ImprovementHook::awaitEnd(const std::function<bool()>& isCancelled) {
  bool isStopped = false;
  while (command_.isRunning()) {
    if (const auto end = command_.take()) return tellOf(*end);
    if (!isStopped && isCancelled && isCancelled()) {
      isStopped = true;
      stop(true);
    }
    if (runTimeClock() > deadline_) {
      command_.abandon();
      return fail(fmt::format("The improvement command {} does not end, and is not waited for any longer", running_));
    }
    ::usleep(kPauseMicroseconds);
  }
}

void ImprovementHook::tellOf(const SideCommandEnd& end) {
  std::string text =
      fmt::format("The improvement command {} {} after {:.1f} s", running_, end.text(mostSeconds_), end.seconds);
  if (end.isGood()) return log_.line(text);
  for (const std::string_view line : splitLines(end.output)) text += "\n   " + onOneLine(line);
  fail(text);
}

/// Of a closed log a warning still comes to the user, a line does not.
void ImprovementHook::fail(const std::string& text) {
  if (++failures_ == 1 || log_.isClosed()) {
    log_.warning(text);
  } else if (failures_ <= kMostFailuresShown) {
    log_.line(text);
  }
}

}  // namespace mirevo
