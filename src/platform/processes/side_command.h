#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/processes/helper_process.h"

namespace mirevo {

/// What is run beside the program.
struct SideCommandCall {
  std::string command;                 ///< for /bin/sh
  std::string folder;                  ///< in which it works; absolute
  std::string input;                   ///< what it reads on standard input
  std::vector<std::string> variables;  ///< "NAME=value", in the place of those that it inherits
  double mostSeconds = 0.0;            ///< after which it is ended
  double graceSeconds = 2.0;           ///< then, from SIGTERM to SIGKILL
};

/// How it came to its end.
struct SideCommandEnd {
  enum class Kind : std::int32_t { exited, signalled, timedOut, stopped, couldNotStart, lost };
  Kind kind = Kind::lost;
  std::int32_t code = 0;  ///< exit code, signal or error number
  double seconds = 0.0;   ///< that it took
  std::string output;     ///< the last that it printed, at most 2000 bytes

  bool isGood() const { return kind == Kind::exited && code == 0; }
  /// "exited with code 3", "was ended because it ran longer than 60 seconds"
  std::string text(double mostSeconds) const;
};

/// A command that runs beside the program, one at a time. A helper process starts and watches it, and ends all that it
/// leaves, so that the program never waits for it, nothing of it is taken for a model's, and nothing is left of it when
/// the program ends, however that ends. On Linux only.
class SideCommand final {
 public:
  SideCommand() = default;
  /// Ends it.
  ~SideCommand();
  SideCommand(const SideCommand&) = delete;
  SideCommand& operator=(const SideCommand&) = delete;

  /// Starts it; nothing must be running. False, with the reason, when that fails.
  bool start(const SideCommandCall& call, std::string& reason);
  bool isRunning() const { return isRunning_; }
  /// How it has ended, once; empty while it runs. Does not wait.
  std::optional<SideCommandEnd> take();
  /// Ends it: SIGTERM, and SIGKILL so much later. take() then tells of it.
  void stop(double graceSeconds = 2.0);
  /// Leaves it to its helper process, which goes on ending it, beyond the end of the program if need be: something that
  /// waits for a lost network drive may never be gone.
  void abandon();

 private:
  HelperProcess helper_;
  bool isRunning_ = false;
};

}  // namespace mirevo
