#pragma once

#include <optional>
#include <string>
#include <vector>

#include "viewer/display_text.h"
#include "viewer/progress_state.h"

namespace mirevo {

/// How it stands with the run that a viewer looks at.
enum class RunPresence {
  awaited,  ///< there is no message file of it yet
  running,
  vanished,  ///< its process is gone, and it has not said how it ended
  ended
};

/// What the viewer itself adds to the state of the run.
struct ViewerSituation {
  std::string setupName;  ///< in place of a title that is not known
  RunPresence presence = RunPresence::awaited;
  bool wasStarted = false;       ///< by this viewer
  bool asksToCancel = false;     ///< the question is on the screen
  bool cancelRequested = false;  ///< the kill file was made
  std::string problem;           ///< why it could not be made
  std::string runsLastWords;     ///< the latest line that a started run has printed
  std::optional<int> exitCode;   ///< of a started run that has ended
  double now = 0.0;              ///< seconds since 1970

  /// A started run can be cancelled from its first moment on, another one once it is there.
  bool canBeCancelled() const {
    return presence == RunPresence::running || (presence == RunPresence::awaited && wasStarted);
  }
};

struct ScreenSize {
  int columns = 80;
  int rows = 24;
};

enum class LineStyle { plain, heading, bar, faint, good, alarm, keys };

struct ScreenLine {
  std::string text;
  LineStyle style = LineStyle::plain;
};

/// The screen: at most `size.rows` lines of at most `size.columns` columns, the keys in the last one. What matters less
/// is left out first where there is little room.
std::vector<ScreenLine> layoutScreen(const ProgressState& state, const ViewerSituation& situation, ScreenSize size,
                                     CharacterSet characters);

/// The same in one line, for an output that is no screen.
std::string progressLine(const ProgressState& state, const ViewerSituation& situation);

/// How the run ended, or that it is gone; empty while it is neither.
std::string outcomeText(const ProgressState& state, const ViewerSituation& situation);

/// Of a setup that has no message file yet.
inline constexpr std::string_view kNoRunYet = "No run of this setup so far; waiting for one.";

/// The question before a run is cancelled.
inline constexpr std::string_view kCancelQuestion =
    "Cancel the run? Finished evaluations are kept. y cancels, any other key goes on";

}  // namespace mirevo
