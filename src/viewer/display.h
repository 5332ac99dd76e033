#pragma once

#include <memory>
#include <string>
#include <vector>

#include "viewer/screen_layout.h"

namespace mirevo {

/// Where a viewer shows a run: a terminal's screen, or lines one after another.
class Display {
 public:
  Display() = default;
  Display(const Display&) = delete;
  Display& operator=(const Display&) = delete;
  virtual ~Display() = default;

  /// Whether the user can look at it for as long as he likes, so that a run that has ended stays in view.
  virtual bool isScreen() const = 0;
  /// Shows the state; `newMessages` have come since the last time. False when nobody can see it any more.
  virtual bool show(const ProgressState& state, const ViewerSituation& situation,
                    const std::vector<std::string>& newMessages) = 0;
  /// Stops this process as the terminal's user wants it, until he continues it.
  virtual void suspend() = 0;
  /// Takes the terminal anew, after this process was stopped and the shell had it meanwhile.
  virtual void resume() = 0;
  /// Draws everything again at the next show(), whatever has become of the screen.
  virtual void redraw() = 0;
  /// Gives the terminal back, and leaves there how things stand.
  virtual void close(const ProgressState& state, const ViewerSituation& situation) = 0;
};

/// The screen where standard output is a terminal that can show one, else lines.
std::unique_ptr<Display> openDisplay();

/// The bytes that draw `lines`, one for every row of the screen.
std::string screenText(const std::vector<ScreenLine>& lines, bool withColour);

}  // namespace mirevo
