#include "viewer/screen_layout.h"

#include <algorithm>
#include <initializer_list>

#include <fmt/core.h>

#include "viewer/course_plot.h"

namespace mirevo {
namespace {

constexpr int kRoomyRows = 20;    ///< from this size on blank lines separate the blocks
constexpr int kWideColumns = 64;  ///< from this size on there are two facts per line
constexpr int kFewestPlotRows = 4;
constexpr int kMostPlotRows = 24;
constexpr int kNarrowColumns = 50;  ///< below this size labels and values are shortened
constexpr int kLabelColumns = 13;
constexpr int kNarrowLabelColumns = 10;
constexpr double kQuietSeconds = 60.0;

struct Fact {
  std::string label;
  std::string value;
};

/// "4 of 40", or with the noun: "4 of 40 evaluations".
std::string doneText(const ProgressState& state, std::string_view noun) {
  std::string text = fmt::format("{}", state.done);
  // The count in the message file may exceed the plan.
  const bool isBeyondPlan = state.planned && state.done > *state.planned;
  if (state.planned && !isBeyondPlan) text += fmt::format(" of {}", *state.planned);
  if (!noun.empty()) text += fmt::format(" {}{}", noun, text == "1" || text == "1 of 1" ? "" : "s");
  if (isBeyondPlan) text += fmt::format(" ({} planned)", *state.planned);
  return text;
}

/// "4 of 40, 1 failed", or with the noun: "4 of 40 evaluations, 1 failed".
std::string evaluationsText(const ProgressState& state, std::string_view noun = {}) {
  if (state.countLabel.empty()) return "none yet";
  std::string text = doneText(state, noun);
  if (state.failed > 0) text += fmt::format(", {} failed", state.failed);
  return text;
}

std::string bestText(const ProgressState& state, double now, bool isNarrow) {
  if (!state.best) return "none yet";
  std::string text = fmt::format("{} (No. {}", shortNumber(state.best->aggregate), state.best->evaluation);
  if (state.best->foundAt) {
    const double ago = now - *state.best->foundAt;
    text += fmt::format(", {} ago", isNarrow ? roughDurationText(ago) : durationText(ago));
  }
  return text + ")";
}

std::string timeLeftText(const ProgressState& state, const ViewerSituation& situation) {
  if (situation.presence != RunPresence::running || !state.secondsLeft) return "-";
  return durationText(*state.secondsLeft - (situation.now - state.lastNewsAt));
}

std::string runningForText(const ProgressState& state, const ViewerSituation& situation) {
  if (!state.origin.startedAt) return "-";
  return durationText((situation.presence == RunPresence::running ? situation.now : state.lastNewsAt) -
                      *state.origin.startedAt);
}

/// In order of importance.
std::vector<Fact> factsOf(const ProgressState& state, const ViewerSituation& situation, bool isNarrow) {
  const bool isRunning = situation.presence == RunPresence::running;
  return {{isNarrow ? "Runs" : "Evaluations", evaluationsText(state)},
          {isNarrow ? "Best" : "Best so far", bestText(state, situation.now, isNarrow)},
          {"Time left", timeLeftText(state, situation)},
          {"Speed", state.perSecond ? speedText(*state.perSecond) : "-"},
          {isRunning ? isNarrow ? "Running" : "Running for" : "Ran for", runningForText(state, situation)}};
}

/// "running, no news for 2 h" if evaluations came faster before.
std::string presenceText(const ProgressState& state, const ViewerSituation& situation) {
  switch (situation.presence) {
    case RunPresence::awaited:
      return situation.wasStarted ? "starting" : "waiting";
    case RunPresence::vanished:
      return "gone";
    case RunPresence::ended:
      return "ended";
    case RunPresence::running:
      break;
  }
  const std::string text = situation.cancelRequested ? "cancelling" : "running";
  const double quiet = situation.now - state.lastNewsAt;
  const double usual = state.perSecond && *state.perSecond > 0.0 ? 3.0 / *state.perSecond : 0.0;
  return quiet > std::max(kQuietSeconds, usual) ? fmt::format("{}, no news for {}", text, durationText(quiet)) : text;
}

/// The first text that fits, or the last.
std::string firstThatFits(std::initializer_list<std::string_view> texts, int width) {
  for (const std::string_view text : texts) {
    if (displayWidth(text) <= width) return std::string(text);
  }
  return std::string(*(texts.end() - 1));
}

ScreenLine lastLine(const ViewerSituation& situation, int width) {
  if (situation.asksToCancel) {
    return {firstThatFits({kCancelQuestion, "Cancel the run? y cancels, else goes on", "Cancel? y/n"}, width),
            LineStyle::alarm};
  }
  if (!situation.problem.empty()) return {situation.problem, LineStyle::alarm};
  if (!situation.canBeCancelled()) return {"d leave", LineStyle::keys};
  if (situation.cancelRequested) {
    return {firstThatFits({"Cancelling: the run ends its model runs and closes its files.   d leave",
                           "Cancelling ...   d leave", "d leave"},
                          width),
            LineStyle::keys};
  }
  return {firstThatFits({"q cancel the run   d leave, the run goes on", "q cancel run   d leave", "q cancel d leave"},
                        width),
          LineStyle::keys};
}

/// Collects the lines of a screen, each cut to its width.
class Screen {
 public:
  Screen(ScreenSize size, CharacterSet characters) : size_(size), characters_(characters) {}

  int columns() const { return size_.columns; }
  CharacterSet characters() const { return characters_; }
  /// Rows that are still free, except the one for the keys.
  int freeRows() const { return size_.rows - 1 - static_cast<int>(lines_.size()); }
  void add(std::string_view text, LineStyle style = LineStyle::plain) {
    if (freeRows() > 0) lines_.push_back({fitted(printable(text, characters_), size_.columns, characters_), style});
  }
  void addGap() {
    if (size_.rows >= kRoomyRows) add("");
  }
  std::vector<ScreenLine> finish(const ScreenLine& last) {
    while (freeRows() > 0) lines_.emplace_back();
    lines_.push_back({fitted(printable(last.text, characters_), size_.columns, characters_), last.style});
    return std::move(lines_);
  }

 private:
  ScreenSize size_;
  CharacterSet characters_;
  std::vector<ScreenLine> lines_;
};

void addHeading(Screen& screen, const ProgressState& state, const ViewerSituation& situation) {
  const std::string right = fitted(presenceText(state, situation), screen.columns(), screen.characters());
  const std::string_view name = state.title.empty() ? std::string_view(situation.setupName) : state.title;
  const int left = screen.columns() - displayWidth(right) - 2;
  std::string line;
  if (left > 3) line = padded(printable(name, screen.characters()), left, screen.characters()) + "  ";
  screen.add(line + right, LineStyle::heading);
  const std::string outcome = outcomeText(state, situation);
  if (!outcome.empty()) {
    screen.add(outcome, state.ending == progress::kNormalTermination ? LineStyle::good : LineStyle::alarm);
  }
  const bool hasRoom = screen.freeRows() > 7 || (outcome.empty() && screen.freeRows() > 5);
  if (!state.task.empty() && hasRoom) screen.add(state.task);
}

/// The records of a run end with 100 per cent whatever the reason; for a run that was cut short this is computed from
/// its evaluations instead.
std::optional<double> percentReached(const ProgressState& state) {
  const bool wasCutShort = !state.ending.empty() && state.ending != progress::kNormalTermination;
  if (!wasCutShort) return state.percent;
  if (state.planned.value_or(0) < 1) return std::nullopt;
  return std::min(100.0, 100.0 * static_cast<double>(state.done) / static_cast<double>(*state.planned));
}

void addBar(Screen& screen, const ProgressState& state) {
  const std::optional<double> reached = percentReached(state);
  const std::string percent = reached ? fmt::format("{:5.1f} %", *reached) : "    - %";
  const bool isUtf8 = screen.characters() == CharacterSet::utf8;
  const int frame = isUtf8 ? 0 : 2;
  const int columns = screen.columns() - static_cast<int>(percent.size()) - 1 - frame;
  if (columns < 4) return screen.add(percent, LineStyle::bar);
  const int filled = static_cast<int>(columns * reached.value_or(0.0) / 100.0);
  std::string bar;
  for (int column = 0; column < columns; ++column) {
    if (isUtf8) {
      bar += column < filled ? "\u2588" : "\u2591";
    } else {
      bar += column < filled ? '#' : '.';
    }
  }
  screen.add((isUtf8 ? bar : "[" + bar + "]") + " " + percent, LineStyle::bar);
}

void addFacts(Screen& screen, const ProgressState& state, const ViewerSituation& situation) {
  const bool isNarrow = screen.columns() < kNarrowColumns;
  const std::vector<Fact> facts = factsOf(state, situation, isNarrow);
  const auto textOf = [isNarrow](const Fact& fact) {
    return fmt::format("{:<{}}{}", fact.label, isNarrow ? kNarrowLabelColumns : kLabelColumns, fact.value);
  };
  if (screen.columns() < kWideColumns) {
    for (const Fact& fact : facts) screen.add(textOf(fact));
    return;
  }
  const int half = screen.columns() / 2;
  const auto addPair = [&](const Fact& left, const Fact& right) {
    screen.add(padded(textOf(left), half - 1, screen.characters()) + " " + textOf(right));
  };
  addPair(facts[0], facts[2]);
  addPair(facts[3], facts[4]);
  screen.add(textOf(facts[1]));
}

void addMessages(Screen& screen, const ProgressState& state) {
  const bool hasRoutine = !state.isLatestMessageNotice && screen.freeRows() > 0;
  const int room = screen.freeRows() - (hasRoutine ? 1 : 0);
  const std::size_t shown = std::min(state.notices.size(), static_cast<std::size_t>(std::max(0, room)));
  for (std::size_t i = state.notices.size() - shown; i < state.notices.size(); ++i) {
    const bool isAlarm =
        state.notices[i].find(progress::kFailed) != std::string::npos || state.notices[i].starts_with("Error");
    screen.add(state.notices[i], isAlarm ? LineStyle::alarm : LineStyle::plain);
  }
  if (hasRoutine) screen.add(state.latestMessage, LineStyle::faint);
}

}  // namespace

std::string outcomeText(const ProgressState& state, const ViewerSituation& situation) {
  if (situation.presence == RunPresence::ended) return state.ending;
  if (situation.presence != RunPresence::vanished) return {};
  if (situation.exitCode) return fmt::format("The run ended with exit code {}", *situation.exitCode);
  return fmt::format("The run is gone without saying how it ended; process {} was its own", state.origin.process);
}

std::vector<ScreenLine> layoutScreen(const ProgressState& state, const ViewerSituation& situation, ScreenSize size,
                                     CharacterSet characters) {
  size.columns = std::max(1, size.columns);
  size.rows = std::max(1, size.rows);
  Screen screen(size, characters);
  addHeading(screen, state, situation);
  if (situation.presence == RunPresence::awaited) {
    screen.addGap();
    screen.add(situation.wasStarted ? "The run is starting." : kNoRunYet);
    if (!situation.runsLastWords.empty()) screen.add(situation.runsLastWords, LineStyle::alarm);
    return screen.finish(lastLine(situation, size.columns));
  }
  screen.addGap();
  addBar(screen, state);
  screen.addGap();
  addFacts(screen, state, situation);
  screen.addGap();
  // Two thirds of the free rows; if there are few, all but two for messages.
  const int left = screen.freeRows();
  const int plotRows = std::min(kMostPlotRows, std::max(left * 2 / 3, std::min(left - 2, 6)));
  if (plotRows >= kFewestPlotRows) {
    const auto plot = plotCourse(state.course, state.done, size.columns, plotRows, characters);
    for (const std::string& line : plot) screen.add(line);
    if (!plot.empty()) screen.addGap();
  }
  addMessages(screen, state);
  return screen.finish(lastLine(situation, size.columns));
}

std::string progressLine(const ProgressState& state, const ViewerSituation& situation) {
  std::string line = evaluationsText(state, "evaluation");
  if (const auto percent = percentReached(state)) line += fmt::format(", {:.1f} %", *percent);
  if (state.best) line += ", best so far " + bestText(state, situation.now, false);
  if (state.perSecond) line += ", " + speedText(*state.perSecond);
  if (situation.presence == RunPresence::running && state.secondsLeft) {
    line += ", " + timeLeftText(state, situation) + " left";
  }
  return line;
}

std::string liveLine(const ProgressState& state, const ViewerSituation& situation, int width, CharacterSet characters) {
  const std::string elapsed = state.origin.startedAt ? runningForText(state, situation) + ": " : std::string();
  const std::string task = printable(state.task, characters);
  if (state.countLabel.empty()) return fitted(firstThatFits({elapsed + task, task}, width), width, characters);
  const std::string runs = doneText(state, "run");
  const std::string withFailed = evaluationsText(state, "run");
  const std::string best = state.best ? ", best " + shortNumber(state.best->aggregate) : std::string();
  const bool isTimeKnown = situation.presence == RunPresence::running && state.secondsLeft;
  const std::string left = isTimeKnown ? ", " + timeLeftText(state, situation) + " left" : std::string();
  const std::string core = withFailed + best;
  const std::string count = std::to_string(state.done);
  // A number that is cut would be another one.
  return firstThatFits({elapsed + core + left, core + left, core, withFailed, runs, doneText(state, ""), count, ""},
                       width);
}

}  // namespace mirevo
