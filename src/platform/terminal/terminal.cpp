#include "platform/terminal/terminal.h"

#include <algorithm>
#include <cstdlib>
#include <fcntl.h>
#include <signal.h>
#include <string>
#include <sys/ioctl.h>
#include <sys/signalfd.h>
#include <termios.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/descriptor_output.h"
#include "common/text.h"
#include "platform/signals/signal_state.h"

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

/// A job in the background must not write over what its user types; without a terminal that controls jobs there is
/// none.
bool isInBackground(int terminal) {
  const pid_t group = ::tcgetpgrp(terminal);
  return group > 0 && group != ::getpgrp();
}

/// 80 x 24 if the terminal does not say.
TerminalScreen::Size sizeOf(int terminal) {
  winsize window{};
  if (::ioctl(terminal, TIOCGWINSZ, &window) != 0 || window.ws_col == 0 || window.ws_row == 0) return {};
  return {window.ws_col, window.ws_row};
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
  return sizeOf(STDOUT_FILENO);
}

bool hasLineTerminal() {
  return ::isatty(STDERR_FILENO) == 1 && knowsControlSequences();
}

int TerminalLine::columns() {
  return std::max(1, sizeOf(STDERR_FILENO).columns - 1);
}

/// Opened once more, as standard error itself may be shared with programs that want to wait: a terminal whose
/// connection hangs accepts part of a line, and the rest of it would stop the run.
TerminalLine::TerminalLine() {
  constexpr int kFlags = O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  descriptor_ = ::open("/proc/self/fd/2", kFlags);
  if (descriptor_ >= 0) return;
  // The terminal belongs to another user, as after su. That of the session can be opened nevertheless.
  if (::tcgetsid(STDERR_FILENO) > 0) descriptor_ = ::open("/dev/tty", kFlags);
  if (descriptor_ >= 0) return;
  descriptor_ = ::fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
  mayWait_ = true;
}

TerminalLine::~TerminalLine() {
  clear();
  if (descriptor_ >= 0) ::close(descriptor_);
}

/// What a terminal does not accept at once is lost; the next line begins afresh.
void TerminalLine::write(std::string_view text) const {
  // A terminal that is ready takes one byte without waiting, whatever the descriptor's mode.
  const std::size_t length = mayWait_ ? 1 : text.size();
  while (!text.empty() && writeWhole(descriptor_, text.substr(0, length), 0).error == 0) {
    text.remove_prefix(length);
  }
}

void TerminalLine::show(std::string_view text) {
  const bool isShown = signalState.liveLineDescriptor >= 0;
  if (descriptor_ < 0) return;
  if (isInBackground(descriptor_)) {
    signalState.liveLineDescriptor = -1;  // the shell has gone on below it
    return;
  }
  if (isShown && text == shown_) return;
  signalState.liveLineDescriptor = descriptor_;  // first: a signal that comes now clears the line
  shown_ = text;
  write(fmt::format("\r{}\x1b[K", text));
}

void TerminalLine::end(std::string_view text) {
  signalState.liveLineDescriptor = -1;
  if (descriptor_ >= 0 && !isInBackground(descriptor_)) write(fmt::format("{}{}\n", kClearLine, text));
}

void TerminalLine::clear() {
  if (signalState.liveLineDescriptor.exchange(-1) >= 0) write(kClearLine);
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
