#include "run/improvement_hook.h"

#include <algorithm>
#include <set>
#include <unistd.h>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr double kEarlySeconds = 10.0;  ///< longest time of the command at the end of a run that is not finished
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

/// Of names that would be the same all but the first get a number.
void addVariables(std::string_view front, const HookValues::Named& values, std::vector<std::string>& variables) {
  std::set<std::string> used;
  for (const auto& [name, value] : values) {
    const std::string stem = variableName(name);
    std::string unique = stem;
    for (int number = 2; !used.insert(unique).second; ++number) unique = fmt::format("{}_{}", stem, number);
    variables.push_back(fmt::format("{}{}={}", front, unique, formatReal(value)));
  }
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
  addVariables("MIREVO_PARAMETER_", best->parameters, variables);
  addVariables("MIREVO_OBJECTIVE_", best->objectives, variables);
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

void ImprovementHook::finish(std::string_view state, const std::optional<HookValues>& best,
                             const std::function<bool()>& isCancelled) {
  const bool isFinished = state == "finished";
  if (std::exchange(waiting_, std::nullopt)) ++skipped_;  // the end has the same set
  if (!isFinished) command_.stop();
  awaitEnd(isCancelled);
  const double limit = config_.improvementCommandTime;
  start("end", state, best, isFinished ? limit : std::min(limit, kEarlySeconds));
  // The kill file that has ended the run is still there.
  awaitEnd(isFinished ? isCancelled : std::function<bool()>());
  log_.line(fmt::format("The improvement command was run {}, {} of them failed{}",
                        countText(static_cast<std::size_t>(starts_), "time"), failures_,
                        skipped_ == 0 ? std::string()
                                      : fmt::format("; {} skipped, as a newer one waited",
                                                    countText(static_cast<std::size_t>(skipped_), "improvement was",
                                                              "improvements were"))));
}

void ImprovementHook::start(std::string_view reason, std::string_view state, const std::optional<HookValues>& best,
                            double mostSeconds) {
  running_ = reason == "end" ? "at the end of the run" : fmt::format("for evaluation No. {}", best->number);
  mostSeconds_ = mostSeconds;
  ++starts_;
  std::string reasonOfFailure;
  const SideCommandCall call{config_.improvementCommand, config_.setupFolder, hookTable(best),
                             hookVariables(config_, reason, state, best), mostSeconds};
  if (!command_.start(call, reasonOfFailure)) {
    fail(fmt::format("The improvement command {} could not be started: {}", running_, reasonOfFailure));
  }
}

void ImprovementHook::awaitEnd(const std::function<bool()>& isCancelled) {
  while (command_.isRunning()) {
    if (const auto end = command_.take()) return tellOf(*end);
    if (isCancelled && isCancelled()) command_.stop();
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

void ImprovementHook::fail(const std::string& text) {
  if (++failures_ == 1) {
    log_.warning(text);
  } else if (failures_ <= kMostFailuresShown) {
    log_.line(text);
  }
}

}  // namespace mirevo
