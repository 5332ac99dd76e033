#pragma once

#include <string>

namespace mirevo {

/// A lock held while a setup is being run: a second run of it at the same time would use the same process folders and
/// write the same files. The lock ends with the process, however that ends, and leaves nothing on disk.
class RunLock final {
 public:
  RunLock() = default;
  ~RunLock();
  RunLock(const RunLock&) = delete;
  RunLock& operator=(const RunLock&) = delete;

  /// Takes the lock of a setup file, waiting at most `patienceSeconds` for a run that is just ending. False when
  /// another run holds it. If the file cannot be read or locked, true: reading the setup gives the better message.
  bool take(const std::string& setupFile, double patienceSeconds);

  /// Whether a run of the setup file is going on. Does not block a run that is starting.
  static bool isHeld(const std::string& setupFile);

 private:
  int descriptor_ = -1;
};

}  // namespace mirevo
