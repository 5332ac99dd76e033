#pragma once

#include <atomic>
#include <memory>
#include <span>
#include <string>
#include <sys/types.h>
#include <vector>

namespace mirevo {

/// A command prepared once, so that starting it allocates nothing.
class SpawnCommand final {
 public:
  /// `file` is executed in `folder` with these arguments; both paths are absolute.
  SpawnCommand(std::string file, std::string folder, std::vector<std::string> arguments);
  SpawnCommand(SpawnCommand&&) = default;
  SpawnCommand& operator=(SpawnCommand&&) = default;
  SpawnCommand(const SpawnCommand&) = delete;
  SpawnCommand& operator=(const SpawnCommand&) = delete;
  ~SpawnCommand() = default;

  const std::string& file() const { return *file_; }
  const std::string& folder() const { return *folder_; }
  /// Null-terminated `argv` with the file first; and the same after "/bin/sh".
  char* const* argv() const { return shellArgv_.data() + 1; }
  char* const* shellArgv() const { return shellArgv_.data(); }

 private:
  // Pointers, so that those in `shellArgv_` stay valid when the command is moved.
  std::unique_ptr<std::string> file_;
  std::unique_ptr<std::string> folder_;
  std::unique_ptr<std::vector<std::string>> arguments_;
  std::vector<char*> shellArgv_;
};

/// What a new process is given besides its command.
struct SpawnSurroundings {
  char* const* environment = nullptr;        ///< null-terminated
  int standardInput = -1;                    ///< descriptor above 2
  int standardOutput = -1;                   ///< descriptor above 2; standard error as well
  std::atomic<pid_t>* groupEntry = nullptr;  ///< receives the group before the command can start a process of its own
  std::span<const int> ignoredSignals = {};  ///< by this program, see ignoredSignals()
};

/// The signals that this process ignores, as its children would, too.
std::vector<int> ignoredSignals();

/// A process that was started, or why it was not.
struct SpawnedProcess {
  pid_t id = -1;           ///< also its process group
  int pidfd = -1;          ///< close-on-exec; -1 where the kernel has none
  int error = 0;           ///< errno; 0 if it was started
  std::string failedStep;  ///< what failed: "started", "entered its folder"
};

/// Starts the command in a process group of its own with default signal handling, no descriptor above 2, and SIGKILL on
/// the death of this process. A file with an execute bit is executed (by /bin/sh if it has no "#!" line), any other is
/// passed to /bin/sh.
SpawnedProcess spawnProcess(const SpawnCommand& command, const SpawnSurroundings& surroundings);

}  // namespace mirevo
