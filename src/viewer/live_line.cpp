#include "viewer/live_line.h"

#include <chrono>
#include <unistd.h>

#include "common/clock.h"
#include "platform/terminal/front_end.h"
#include "viewer/screen_layout.h"

namespace mirevo {
namespace {

constexpr double kPauseSeconds = 0.25;

double secondsSince1970() {
  return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
}

}  // namespace

LiveLine::LiveLine() : characters_(wantsUtf8() ? CharacterSet::utf8 : CharacterSet::ascii) {}

void LiveLine::take(std::string_view record) {
  if (hasEnded_) return;
  if (!record.empty()) records_.feed(record, secondsSince1970());
  hasEnded_ = !records_.state().ending.empty();
  if (!hasEnded_ && runTimeClock() - shownAt_ < kPauseSeconds) return;
  shownAt_ = runTimeClock();
  show();
}

void LiveLine::show() {
  const ProgressState& state = records_.state();
  ViewerSituation situation;
  situation.presence = hasEnded_ ? RunPresence::ended : RunPresence::running;
  situation.now = secondsSince1970();
  const std::string text = liveLine(state, situation, TerminalLine::columns(), characters_);
  if (!hasEnded_) {
    line_.show(text);
  } else if (state.countLabel.empty()) {
    line_.clear();  // it came to no evaluation
  } else {
    line_.end(text);
  }
}

bool wantsLiveLine(std::string_view destination) {
  if (destination == "NONE" || isUnattended() || !hasLineTerminal()) return false;
  return destination != "STDOUT" || ::isatty(STDOUT_FILENO) != 1;
}

}  // namespace mirevo
