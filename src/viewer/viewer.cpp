#include "viewer/viewer.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/run_files.h"
#include "common/text.h"
#include "platform/terminal/front_end.h"

namespace mirevo {
namespace {

constexpr int kLookMilliseconds = 500;
constexpr int kPiecesAtATime = 64;
constexpr std::size_t kEarlierMessages = 20;  ///< shown as lines, of a run that began before the viewer
constexpr std::size_t kKeptOutput = 65'536;
constexpr char kControlC = 3;
constexpr char kControlL = 12;
constexpr char kControlZ = 26;

double secondsSince1970() {
  return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
}

}  // namespace

std::string baseNameOfSetup(std::string_view setupFile) {
  for (const std::string_view ending :
       {std::string_view(".kdx"), run_files::kLog.extension, run_files::kMessages.extension}) {
    const std::size_t length = setupFile.size() - std::min(setupFile.size(), ending.size());
    if (length > 0 && equalIgnoringCase(setupFile.substr(length), ending))
      return std::string(setupFile.substr(0, length));
  }
  return std::string(setupFile);
}

Viewer::Viewer(std::string setupFile, std::unique_ptr<RunProcess> started)
    : setupFile_(std::move(setupFile)),
      baseName_(baseNameOfSetup(setupFile_)),
      host_(hostName()),
      started_(std::move(started)),
      file_(runFilePath(baseName_, run_files::kMessages)),
      display_(openDisplay()) {
  situation_.setupName = baseName_.substr(baseName_.rfind('/') + 1);
  situation_.wasStarted = started_ != nullptr;
}

const ProgressState& Viewer::state() const {
  // Until the started run has begun its message file, the file is that of an earlier run.
  static const ProgressState kNothingYet;
  if (started_ && records_.state().origin.process != started_->process()) return kNothingYet;
  return records_.state();
}

int Viewer::watch() {
  while (!leaves_) {
    readNews();
    if (hasCaughtUp_ && !showNews()) break;
    if (isOver()) break;
    waitForNews(hasMore_);
    takeSignals();
    takeKeys();
  }
  display_->close(state(), situation_);
  sayGoodbye();
  return started_ ? started_->exitCode().value_or(0) : 0;
}

bool Viewer::showNews() {
  const bool isSeen = display_->show(state(), situation_, newMessages_);
  newMessages_.clear();
  return isSeen;
}

/// For a run that this viewer started the viewer ends with the run's process. After the end of another run a screen
/// stays until the user leaves, if there is one.
bool Viewer::isOver() const {
  if (hasMore_) return false;
  const bool hasEnded = situation_.presence == RunPresence::ended || situation_.presence == RunPresence::vanished;
  return hasEnded && (started_ || !display_->isScreen() || isUnattended());
}

void Viewer::readNews() {
  // Checked before the records are read, so that the last records of a run that has just ended are included.
  const ProgressState& before = records_.state();
  const bool isGone = started_ ? started_->exitCode().has_value()
                               : before.origin.process > 0 && before.origin.host == host_ &&
                                     ::kill(static_cast<pid_t>(before.origin.process), 0) != 0 && errno == ESRCH;
  const bool takesMessages = !display_->isScreen();
  hasMore_ = true;
  for (int piece = 0; hasMore_ && piece < kPiecesAtATime; ++piece) {
    hasMore_ = file_.readPiece(records_, takesMessages ? &newMessages_ : nullptr);
    if (!hasCaughtUp_ && newMessages_.size() > kEarlierMessages) {
      newMessages_.erase(newMessages_.begin(), newMessages_.end() - kEarlierMessages);
    }
  }
  if (!hasMore_) hasCaughtUp_ = true;
  if (started_ && records_.state().origin.process != started_->process()) newMessages_.clear();
  readRunOutput();
  situation_.now = secondsSince1970();
  judgePresence(isGone && !hasMore_);
}

void Viewer::readRunOutput() {
  if (!started_) return;
  situation_.exitCode = started_->exitCode();
  const std::string news = started_->takeOutput();
  if (news.empty()) return;
  runOutput_ += news;
  if (runOutput_.size() > kKeptOutput) runOutput_.erase(0, runOutput_.size() - kKeptOutput);
  const std::vector<std::string_view> lines = splitLines(runOutput_);
  situation_.runsLastWords = lines.empty() ? std::string_view{} : lines.back();
}

void Viewer::judgePresence(bool processIsGone) {
  const ProgressState& known = state();
  RunPresence& presence = situation_.presence;
  if (processIsGone) {
    presence = known.ending.empty() ? RunPresence::vanished : RunPresence::ended;
  } else if (!known.hasRecords) {
    presence = RunPresence::awaited;
  } else {
    presence = known.ending.empty() || started_ ? RunPresence::running : RunPresence::ended;
  }
  if (situation_.canBeCancelled()) return;
  situation_.asksToCancel = false;
  situation_.cancelRequested = false;
}

void Viewer::waitForNews(bool hasMore) const {
  const bool takesKeys = !keysEnded_ && (display_->isScreen() || hasKeyboard());
  std::array<pollfd, 3> sources{{{takesKeys ? STDIN_FILENO : -1, POLLIN, 0},
                                 {signals_.descriptor(), POLLIN, 0},
                                 {started_ ? started_->output() : -1, POLLIN, 0}}};
  ::poll(sources.data(), sources.size(), hasMore ? 0 : kLookMilliseconds);
}

void Viewer::takeSignals() {
  while (const int signal = signals_.next()) {
    if (signal == SIGHUP) leaves_ = true;
    if (signal == SIGWINCH) display_->redraw();
    if (signal == SIGCONT) display_->resume();
    if (signal == SIGINT && started_ && !display_->isScreen() && !hasKeyboard()) {
      started_->send(SIGINT);  // nobody can be asked to confirm
    } else if (signal == SIGINT) {
      takeKey(kControlC);
    }
    if (signal == SIGTERM || signal == SIGQUIT) {
      if (started_) started_->send(SIGTERM);
      leaves_ = leaves_ || !started_;
    }
  }
}

void Viewer::takeKeys() {
  if (keysEnded_ || !(display_->isScreen() || hasKeyboard())) return;
  pollfd keyboard{STDIN_FILENO, POLLIN, 0};
  if (::poll(&keyboard, 1, 0) <= 0) return;
  std::array<char, 64> keys{};
  const ssize_t count = ::read(STDIN_FILENO, keys.data(), keys.size());
  if (count < 0 && (errno == EINTR || errno == EAGAIN)) return;
  if (count <= 0) {
    keysEnded_ = true;
    leaves_ = leaves_ || display_->isScreen();  // the terminal is gone
    return;
  }
  // Cursor and function keys arrive as an escape sequence, whose letters must not count as keys.
  if (keys[0] == '\x1b') return situation_.asksToCancel ? takeKey(' ') : void();
  for (ssize_t i = 0; i < count; ++i) takeKey(keys[static_cast<std::size_t>(i)]);
}

void Viewer::takeKey(char key) {
  if (key == '\n' && !display_->isScreen()) return;
  if (situation_.asksToCancel) {
    situation_.asksToCancel = false;
    if (key == 'y' || key == 'Y') cancelRun();
    return;
  }
  situation_.problem.clear();
  if (key == 'd' || key == 'D' || (key == kControlC && !started_)) {
    leaves_ = true;
  } else if (key == 'q' || key == 'Q' || key == kControlC) {
    takeCancelKey();
  } else if (key == kControlZ) {
    display_->suspend();
  } else if (key == kControlL) {
    display_->redraw();
  }
}

/// If there is nothing to cancel, the key leaves the viewer.
void Viewer::takeCancelKey() {
  if (situation_.canBeCancelled()) {
    situation_.asksToCancel = !situation_.cancelRequested;
  } else {
    leaves_ = true;
  }
}

void Viewer::cancelRun() {
  if (situation_.presence == RunPresence::awaited) {
    // Before the run has begun, a kill file could cancel another run of the setup, for whose end it waits.
    if (started_) started_->send(SIGTERM);
    situation_.cancelRequested = true;
    return;
  }
  const std::string killFile = runFilePath(baseName_, run_files::kKill);
  const int descriptor = ::open(killFile.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0666);
  if (descriptor < 0) {
    situation_.problem = fmt::format("Unable to cancel: {}: {}", killFile, std::strerror(errno));
    return;
  }
  ::close(descriptor);
  situation_.problem.clear();
  situation_.cancelRequested = true;
}

void Viewer::sayGoodbye() const {
  if (!started_) return;
  if (started_->exitCode()) {
    std::fwrite(runOutput_.data(), 1, runOutput_.size(), stderr);
    return;
  }
  writeToOutput(
      fmt::format("The run goes on as process {}.\n  mirevo-viewer '{}'\nshows it again;\n  touch '{}'\n"
                  "cancels it.\n",
                  started_->process(), setupFile_, runFilePath(baseName_, run_files::kKill)));
}

}  // namespace mirevo
