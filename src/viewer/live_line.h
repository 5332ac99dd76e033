#pragma once

#include <string_view>

#include "platform/terminal/terminal.h"
#include "viewer/display_text.h"
#include "viewer/progress_records.h"

namespace mirevo {

/// The line in which a run that was started on a terminal shows how it is going, for users who have started no viewer:
/// what a viewer reads from the message file is told to it directly. Changes a few times a second at most.
class LiveLine final {
 public:
  LiveLine();

  /// Takes a record of the run, as it is in the message file; an empty one says that time has passed. After the last
  /// one the line is left on the terminal as it is then.
  void take(std::string_view record);

 private:
  void show();

  ProgressRecords records_;
  TerminalLine line_;
  CharacterSet characters_;
  double shownAt_ = 0.0;
  bool hasEnded_ = false;
};

/// Whether a run started now shows the line: standard error is a terminal on which it can be drawn, and neither
/// progress nor anybody to watch is unwanted. `destination`: the value of VOLK_PROGRESS. With "STDOUT" the messages are
/// enough where they come on a terminal, too.
bool wantsLiveLine(std::string_view destination);

}  // namespace mirevo
