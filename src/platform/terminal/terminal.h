#pragma once

#include <csignal>
#include <memory>
#include <string>
#include <string_view>

namespace mirevo {

/// Whether standard input and output are the same terminal, on which whole screens can be drawn: TERM is set and not
/// "dumb", and this process is in the foreground.
bool hasScreenTerminal();

/// Whether standard input is a terminal that may be read: this process is in the foreground.
bool hasKeyboard();

/// Whether the environment asks for a locale with UTF-8 characters (LC_ALL, LC_CTYPE, LANG, in this order).
bool wantsUtf8();

/// Whether to write in colour to a terminal: NO_COLOR is unset or empty, and TERM is set and not "dumb".
bool wantsColour();

/// Whether one line of standard error can be rewritten in place: it is a terminal, and TERM is set and not "dumb".
bool hasLineTerminal();

/// A line of the terminal on standard error that is rewritten in place. Messages of showMessage() and of signal
/// handlers take its place; the next show() puts it below them.
class TerminalLine final {
 public:
  TerminalLine();
  ~TerminalLine();
  TerminalLine(const TerminalLine&) = delete;
  TerminalLine& operator=(const TerminalLine&) = delete;

  /// Columns that a text may take; the last column of the terminal stays free, so that the line never wraps.
  static int columns();
  /// Replaces the line, unless it is shown already. Nothing is shown while this process is in the background or the
  /// terminal is stopped.
  void show(std::string_view text);
  /// Replaces the line by `text`, which stays.
  void end(std::string_view text);
  void clear();

 private:
  void write(std::string_view text) const;

  int descriptor_ = -1;   ///< of the terminal; -1: nothing is shown
  bool mayWait_ = false;  ///< a write of more than the terminal accepts would wait
  std::string shown_;
};

/// Writes the whole text to standard output; false when its reader has gone.
bool writeToOutput(std::string_view text);

/// A terminal in full-screen mode. Keys are read at once and without echo, including Ctrl-C and Ctrl-Z; the previous
/// content is restored at the end. Screens are drawn with the control sequences of ECMA-48 and those of the alternate
/// screen, which all terminals in use understand, so that no terminal library is needed.
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
  /// 80 x 24 if the terminal does not say.
  static Size size();

 private:
  struct Settings;
  std::unique_ptr<Settings> before_;
  bool isEntered_ = false;
};

/// The signals that a viewer acts on. They are blocked for the rest of the process and read one by one from a
/// descriptor that poll(2) can wait for, so that none of them interrupts the viewer.
class SignalQueue final {
 public:
  SignalQueue();
  ~SignalQueue();
  SignalQueue(const SignalQueue&) = delete;
  SignalQueue& operator=(const SignalQueue&) = delete;

  /// Blocks these signals before there is a queue, so that none is missed. Returns the signals blocked until then.
  static sigset_t block();

  int descriptor() const { return descriptor_; }
  /// The number of the next signal; 0 when there is none.
  int next() const;

 private:
  int descriptor_ = -1;
};

}  // namespace mirevo
