#pragma once

#include <string>

namespace mirevo {

/// Held while a setup is being run: a second run of it at the same time would work in the same process folders and
/// write the same files. Ends with the process, however it ends, and leaves nothing on disk.
class RunLock final {
 public:
  RunLock() = default;
  ~RunLock();
  RunLock(const RunLock&) = delete;
  RunLock& operator=(const RunLock&) = delete;

  /// Takes the lock of a setup file, waiting at most `patienceSeconds` for a run that is just ending. False when
  /// another run holds it. A file that cannot be read or locked counts as taken by nobody: reading it says more.
  bool take(const std::string& setupFile, double patienceSeconds);

  /// Whether a run of the setup file is going on just now. Asks without taking the lock from a run that begins.
  static bool isHeld(const std::string& setupFile);

 private:
  int descriptor_ = -1;
};

}  // namespace mirevo
