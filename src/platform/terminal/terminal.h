#pragma once

#include <csignal>
#include <memory>
#include <string_view>

namespace mirevo {

/// Whether standard input and output are one terminal on which whole screens can be drawn: TERM is set and not "dumb",
/// and this process is in its foreground.
bool hasScreenTerminal();

/// Whether standard input is a terminal that may be read: this process is in its foreground.
bool hasKeyboard();

/// Whether the environment asks for a locale with UTF-8 characters (LC_ALL, LC_CTYPE, LANG, in this order).
bool wantsUtf8();

/// Whether colour is welcome on a terminal: NO_COLOR is not set, or empty, and TERM is set and not "dumb".
bool wantsColour();

/// Writes to standard output, whole; false when nobody takes it any more.
bool writeToOutput(std::string_view text);

/// The terminal while it shows screens: keys come at once and without echo, Ctrl-C and Ctrl-Z among them, and what it
/// showed before comes back in the end. Drawn with the control sequences of ECMA-48 and of the alternate screen, which
/// every terminal program of today knows; a terminal library would decide no more than these for us.
class TerminalScreen final {
 public:
  TerminalScreen();
  ~TerminalScreen();
  TerminalScreen(const TerminalScreen&) = delete;
  TerminalScreen& operator=(const TerminalScreen&) = delete;

  void enter();
  void leave();

  struct Size {
    int columns = 80;
    int rows = 24;
  };
  /// 80 x 24 where the terminal does not say.
  static Size size();

 private:
  struct Settings;
  std::unique_ptr<Settings> before_;
  bool isEntered_ = false;
};

/// The signals that a viewer lives by, taken in order from a descriptor that poll(2) can wait for, so that none of them
/// interrupts it. Blocks them for the rest of the process.
class SignalQueue final {
 public:
  SignalQueue();
  ~SignalQueue();
  SignalQueue(const SignalQueue&) = delete;
  SignalQueue& operator=(const SignalQueue&) = delete;

  /// Blocks them ahead of time, so that none is missed before there is a queue. Returns what was blocked before.
  static sigset_t block();

  int descriptor() const { return descriptor_; }
  /// The next one, 0 when there is none.
  int next() const;

 private:
  int descriptor_ = -1;
};

}  // namespace mirevo
