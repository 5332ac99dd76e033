#include "viewer/display.h"

#include <array>
#include <signal.h>

#include "platform/terminal/terminal.h"

namespace mirevo {
namespace {

constexpr double kProgressLineSeconds = 60.0;

std::string_view styleSequence(LineStyle style) {
  switch (style) {
    case LineStyle::heading:
      return "\x1b[1m";
    case LineStyle::bar:
      return "\x1b[36m";
    case LineStyle::good:
      return "\x1b[32m";
    case LineStyle::alarm:
      return "\x1b[31m";
    case LineStyle::faint:
    case LineStyle::keys:
      return "\x1b[2m";
    case LineStyle::plain:
      break;
  }
  return {};
}

/// Redraws only if something has changed, so that a slow connection is not kept busy.
class ScreenDisplay final : public Display {
 public:
  bool isScreen() const override { return true; }

  bool show(const ProgressState& state, const ViewerSituation& situation, const std::vector<std::string>&) override {
    const TerminalScreen::Size size = TerminalScreen::size();
    const std::string text =
        screenText(layoutScreen(state, situation, {size.columns, size.rows}, characters_), withColour_);
    if (text == shown_) return true;
    shown_ = text;
    return writeToOutput(text);
  }

  void suspend() override {
    screen_.leave();
    ::raise(SIGTSTP);
    screen_.enter();
    redraw();
  }

  void resume() override {
    if (hasKeyboard()) screen_.enter();
    redraw();
  }

  void redraw() override { shown_.clear(); }

  void close(const ProgressState& state, const ViewerSituation& situation) override {
    const TerminalScreen::Size size = TerminalScreen::size();
    std::vector<ScreenLine> lines = layoutScreen(state, situation, {size.columns, size.rows - 1}, characters_);
    screen_.leave();
    lines.pop_back();  // the line of the keys
    while (!lines.empty() && lines.back().text.empty()) lines.pop_back();
    std::string text;
    for (const ScreenLine& line : lines) text.append(line.text).append("\n");
    writeToOutput(text);
  }

 private:
  TerminalScreen screen_;
  CharacterSet characters_ = wantsUtf8() ? CharacterSet::utf8 : CharacterSet::ascii;
  bool withColour_ = wantsColour();
  std::string shown_;
};

/// One line per message, and once a minute the progress of the run if it has changed.
class LineDisplay final : public Display {
 public:
  bool isScreen() const override { return false; }

  bool show(const ProgressState& state, const ViewerSituation& situation,
            const std::vector<std::string>& newMessages) override {
    std::string text;
    const bool isAwaited = situation.presence == RunPresence::awaited && !situation.wasStarted;
    if (isAwaited && !wasAwaited_) text.append(kNoRunYet).append("\n");
    wasAwaited_ = isAwaited;
    for (const std::string& message : newMessages) text.append(printable(message, characters_)).append("\n");
    const bool isDue = situation.now - progressShownAt_ >= kProgressLineSeconds && state.done != evaluationsShown_;
    // That of a run that has ended comes at the close.
    if (!state.countLabel.empty() && isDue && state.ending.empty()) {
      text.append("-- ").append(progressLine(state, situation)).append("\n");
      progressShownAt_ = situation.now;
      evaluationsShown_ = state.done;
    }
    if (situation.asksToCancel && !asked_) text.append(kCancelQuestion).append(" (and Enter)\n");
    asked_ = situation.asksToCancel;
    if (!situation.problem.empty() && situation.problem != problemShown_) text.append(situation.problem).append("\n");
    problemShown_ = situation.problem;
    return text.empty() || writeToOutput(text);
  }

  void suspend() override {}
  void resume() override {}
  void redraw() override {}

  void close(const ProgressState& state, const ViewerSituation& situation) override {
    std::string text;
    const bool isNew = progressShownAt_ == 0.0 || state.done != evaluationsShown_;
    if (!state.countLabel.empty() && isNew) text.append("-- ").append(progressLine(state, situation)).append("\n");
    const std::string outcome = outcomeText(state, situation);
    if (!outcome.empty()) text.append("-- ").append(printable(outcome, characters_)).append("\n");
    writeToOutput(text);
  }

 private:
  CharacterSet characters_ = wantsUtf8() ? CharacterSet::utf8 : CharacterSet::ascii;
  double progressShownAt_ = 0.0;
  std::int64_t evaluationsShown_ = 0;
  bool wasAwaited_ = false;
  bool asked_ = false;
  std::string problemShown_;
};

}  // namespace

std::string screenText(const std::vector<ScreenLine>& lines, bool withColour) {
  std::string text = "\x1b[H";
  for (std::size_t i = 0; i < lines.size(); ++i) {
    const std::string_view style = withColour ? styleSequence(lines[i].style) : std::string_view{};
    if (i > 0) text += "\r\n";
    // Cleared before it is written: after a line that fills the row the cursor is still on its last column.
    text.append("\x1b[2K").append(style).append(lines[i].text);
    if (!style.empty()) text += "\x1b[0m";
  }
  return text;
}

std::unique_ptr<Display> openDisplay() {
  if (hasScreenTerminal()) return std::make_unique<ScreenDisplay>();
  return std::make_unique<LineDisplay>();
}

}  // namespace mirevo
