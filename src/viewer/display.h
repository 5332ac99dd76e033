#pragma once

#include <memory>
#include <string>
#include <vector>

#include "viewer/screen_layout.h"

namespace mirevo {

/// Where a viewer shows a run: on a terminal's screen, or as lines one after another.
class Display {
 public:
  Display() = default;
  Display(const Display&) = delete;
  Display& operator=(const Display&) = delete;
  virtual ~Display() = default;

  /// Whether it is a screen, on which a run that has ended stays in view until the user leaves.
  virtual bool isScreen() const = 0;
  /// Shows the state; `newMessages` are those since the last call. False when nobody can see it any more.
  virtual bool show(const ProgressState& state, const ViewerSituation& situation,
                    const std::vector<std::string>& newMessages) = 0;
  /// Suspends this process (Ctrl-Z) until the user continues it.
  virtual void suspend() = 0;
  /// Takes the terminal back after this process was suspended.
  virtual void resume() = 0;
  /// Makes the next show() draw the whole screen.
  virtual void redraw() = 0;
  /// Restores the terminal and leaves the final state of the run on it.
  virtual void close(const ProgressState& state, const ViewerSituation& situation) = 0;
};

/// The screen if standard input and output are a terminal that can show one, else lines.
std::unique_ptr<Display> openDisplay();

/// The bytes that draw `lines`, one for every row of the screen.
std::string screenText(const std::vector<ScreenLine>& lines, bool withColour);

}  // namespace mirevo
