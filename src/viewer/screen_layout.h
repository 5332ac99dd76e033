#pragma once

#include <optional>
#include <string>
#include <vector>

#include "viewer/display_text.h"
#include "viewer/progress_state.h"

namespace mirevo {

/// State of the run that a viewer shows.
enum class RunPresence {
  awaited,  ///< it has no message file yet
  running,
  vanished,  ///< its process is gone without having said how it ended
  ended
};

/// What the viewer adds to the state of the run.
struct ViewerSituation {
  std::string setupName;  ///< shown while the title is not known
  RunPresence presence = RunPresence::awaited;
  bool wasStarted = false;       ///< by this viewer
  bool asksToCancel = false;     ///< the question is on the screen
  bool cancelRequested = false;  ///< the kill file was created
  std::string problem;           ///< why it could not be created
  std::string runsLastWords;     ///< the latest line printed by a run that this viewer started
  std::optional<int> exitCode;   ///< of a run that this viewer started and that has ended
  double now = 0.0;              ///< seconds since 1970

  /// A run that this viewer started can be cancelled from its first moment on, another one while it is running.
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

/// The screen: at most `size.rows` lines of at most `size.columns` columns, with the keys in the last one. Where there
/// is little room the less important lines are left out first.
std::vector<ScreenLine> layoutScreen(const ProgressState& state, const ViewerSituation& situation, ScreenSize size,
                                     CharacterSet characters);

/// The same in one line, for an output that is not a screen.
std::string progressLine(const ProgressState& state, const ViewerSituation& situation);

/// The most important of it in at most `width` columns, for the line that a run shows of itself: time elapsed, runs,
/// the best, and the time left where it is known. Where there is little room whole facts are left out.
std::string liveLine(const ProgressState& state, const ViewerSituation& situation, int width, CharacterSet characters);

/// How the run ended, or that it is gone; empty otherwise.
std::string outcomeText(const ProgressState& state, const ViewerSituation& situation);

/// For a setup that has no message file yet.
inline constexpr std::string_view kNoRunYet = "No run of this setup so far; waiting for one.";

/// The question before a run is cancelled.
inline constexpr std::string_view kCancelQuestion =
    "Cancel the run? Finished evaluations are kept. y cancels, any other key goes on";

}  // namespace mirevo
