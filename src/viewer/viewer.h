#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/terminal/terminal.h"
#include "viewer/display.h"
#include "viewer/message_file.h"
#include "viewer/run_process.h"

namespace mirevo {

/// Shows a run to a person until it ends or the person leaves. It reads the run's message file, and makes its kill file
/// when that is asked for and confirmed; nothing else of it reaches the run.
class Viewer final {
 public:
  /// `setupFile` as given on the command line, with or without ".kdx". `started` is the run that came with the viewer,
  /// null for one that goes on its own.
  Viewer(std::string setupFile, std::unique_ptr<RunProcess> started);

  /// The exit code: that of the started run when it was watched to its end, else 0.
  int watch();

 private:
  void readNews();
  /// False when nobody sees it any more.
  bool showNews();
  void readRunOutput();
  void judgePresence(bool processIsGone);
  bool isOver() const;
  void takeSignals();
  void takeKeys();
  void takeKey(char key);
  void takeCancelKey();
  void cancelRun();
  void waitForNews(bool hasMore) const;
  const ProgressState& state() const;
  void sayGoodbye() const;

  std::string setupFile_;
  std::string baseName_;  ///< the run's files begin with it
  std::string host_;
  std::unique_ptr<RunProcess> started_;
  MessageFile file_;
  ProgressRecords records_;
  ViewerSituation situation_;
  SignalQueue signals_;
  std::unique_ptr<Display> display_;
  std::vector<std::string> newMessages_;
  std::string runOutput_;     ///< of the started run, its end when it is long
  bool hasCaughtUp_ = false;  ///< with what the file held when the viewer began; nothing is shown before
  bool hasMore_ = false;
  bool keysEnded_ = false;
  bool leaves_ = false;
};

/// The path of a setup without ".kdx"; the run's log or message file stands for it as well.
std::string baseNameOfSetup(std::string_view setupFile);

}  // namespace mirevo
