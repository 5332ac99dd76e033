#include "platform/terminal/terminal.h"

#include <cstdlib>
#include <signal.h>
#include <string>
#include <sys/ioctl.h>
#include <sys/signalfd.h>
#include <termios.h>
#include <unistd.h>

#include "common/descriptor_output.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kEnterScreen = "\x1b[?1049h\x1b[?25l";  ///< alternate screen, no cursor
constexpr std::string_view kLeaveScreen = "\x1b[?25h\x1b[?1049l";

std::string_view environmentValue(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? std::string_view{} : std::string_view(value);
}

bool knowsControlSequences() {
  const std::string_view type = environmentValue("TERM");
  return !type.empty() && type != "dumb";
}

sigset_t queuedSignals() {
  sigset_t signals;
  ::sigemptyset(&signals);
  for (const int number : {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGWINCH, SIGCONT, SIGCHLD}) ::sigaddset(&signals, number);
  return signals;
}

}  // namespace

bool hasKeyboard() {
  return ::isatty(STDIN_FILENO) == 1 && ::tcgetpgrp(STDIN_FILENO) == ::getpgrp();
}

bool hasScreenTerminal() {
  return hasKeyboard() && ::isatty(STDOUT_FILENO) == 1 && knowsControlSequences();
}

bool wantsUtf8() {
  for (const char* name : {"LC_ALL", "LC_CTYPE", "LANG"}) {
    const std::string locale = toLowerAscii(environmentValue(name));
    if (locale.empty()) continue;
    return locale.find("utf-8") != std::string::npos || locale.find("utf8") != std::string::npos;
  }
  return false;
}

bool wantsColour() {
  return environmentValue("NO_COLOR").empty() && knowsControlSequences();
}

bool writeToOutput(std::string_view text) {
  return writeWhole(STDOUT_FILENO, text).error == 0;
}

struct TerminalScreen::Settings {
  termios values{};
  bool areKnown = false;
};

TerminalScreen::TerminalScreen() : before_(std::make_unique<Settings>()) {
  before_->areKnown = ::tcgetattr(STDIN_FILENO, &before_->values) == 0;
  enter();
}

TerminalScreen::~TerminalScreen() {
  leave();
}

void TerminalScreen::enter() {
  if (before_->areKnown) {
    termios values = before_->values;
    values.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO | ISIG | IEXTEN);
    values.c_iflag &= ~static_cast<tcflag_t>(IXON | ICRNL);
    values.c_cc[VMIN] = 1;
    values.c_cc[VTIME] = 0;
    ::tcsetattr(STDIN_FILENO, TCSAFLUSH, &values);
  }
  writeToOutput(kEnterScreen);
  isEntered_ = true;
}

void TerminalScreen::leave() {
  if (!isEntered_) return;
  writeToOutput(kLeaveScreen);
  if (before_->areKnown) ::tcsetattr(STDIN_FILENO, TCSAFLUSH, &before_->values);
  isEntered_ = false;
}

TerminalScreen::Size TerminalScreen::size() {
  winsize window{};
  if (::ioctl(STDOUT_FILENO, TIOCGWINSZ, &window) != 0 || window.ws_col == 0 || window.ws_row == 0) return {};
  return {window.ws_col, window.ws_row};
}

SignalQueue::SignalQueue() {
  block();
  const sigset_t signals = queuedSignals();
  descriptor_ = ::signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK);
  ::signal(SIGPIPE, SIG_IGN);  // writing to an output that nobody reads any more fails instead
}

sigset_t SignalQueue::block() {
  const sigset_t signals = queuedSignals();
  sigset_t before;
  ::sigprocmask(SIG_BLOCK, &signals, &before);
  return before;
}

SignalQueue::~SignalQueue() {
  if (descriptor_ >= 0) ::close(descriptor_);
}

int SignalQueue::next() const {
  signalfd_siginfo information{};
  const ssize_t size = ::read(descriptor_, &information, sizeof information);
  return size == static_cast<ssize_t>(sizeof information) ? static_cast<int>(information.ssi_signo) : 0;
}

}  // namespace mirevo
