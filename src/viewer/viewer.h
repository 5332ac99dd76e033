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

/// Shows a run until it ends or the user leaves. It reads the run's message file and creates its kill file when the
/// user asks for that and confirms; it affects the run in no other way.
class Viewer final {
 public:
  /// `setupFile` as given on the command line, with or without ".kdx". `started` is the run that was started with the
  /// viewer, null for any other.
  Viewer(std::string setupFile, std::unique_ptr<RunProcess> started);

  /// Returns the exit code: that of the started run if it was watched to its end, else 0.
  int watch();

 private:
  void readNews();
  /// False when nobody can see it any more.
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
  std::string baseName_;  ///< the beginning of the paths of the run's files
  std::string host_;
  std::unique_ptr<RunProcess> started_;
  MessageFile file_;
  ProgressRecords records_;
  ViewerSituation situation_;
  SignalQueue signals_;
  std::unique_ptr<Display> display_;
  std::vector<std::string> newMessages_;
  std::string runOutput_;     ///< of the started run; its last part if it is long
  bool hasCaughtUp_ = false;  ///< with what the file held when the viewer started; nothing is shown before
  bool hasMore_ = false;
  bool keysEnded_ = false;
  bool leaves_ = false;
};

/// The path of a setup without ".kdx"; `setupFile` may also be the run's log or message file.
std::string baseNameOfSetup(std::string_view setupFile);

}  // namespace mirevo
