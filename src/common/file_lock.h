#pragma once

#include <string>

namespace mirevo {

/// A lock that keeps two runs from working on the same files, and that the system takes away when the program ends,
/// however that happens. It is held on a file of its own (`..._lock_`), never on one of the user's: an editor replaces
/// those by renaming. The file is removed with the lock. One that a killed program has left locks nothing.
///
/// It is an open-file-description lock (fcntl), which network file systems pass on to their other hosts. Where a file
/// system has no locks, a socket of this machine that is named after the file takes their place.
class FileLock final {
 public:
  /// What is locked of a file for which several programs share one: those numbers, from 0.
  struct Range {
    int first = 0;
    int count = 1;
  };

  FileLock() = default;
  ~FileLock() { release(); }
  FileLock(const FileLock&) = delete;
  FileLock& operator=(const FileLock&) = delete;

  /// Takes the lock, waiting at most `patienceSeconds` for a program that is just ending. False when another one holds
  /// it. If the file can neither be made nor locked, true, with a warning().
  bool take(const std::string& path, Range range, double patienceSeconds);
  void release();

  /// holderOf() the lock after take() has returned false.
  const std::string& holder() const { return holder_; }
  /// After it has returned true: the file, why it could not be locked, and what follows from that; else empty.
  const std::string& warning() const { return warning_; }

  /// Whether any of the file is locked by another object of this class, in any program. Does not disturb a program that
  /// is taking the lock.
  static bool isHeld(const std::string& path);

  /// " (process 1234 on node07)", from the file of a lock that is held; empty where it does not say.
  static std::string holderOf(const std::string& path);

  /// For signal handlers that end the program: removes the files of all locks held. Async-signal-safe.
  static void removeFilesFromSignal() noexcept;

 private:
  enum class Attempt { taken, held, impossible };
  Attempt lockFile(int& file, Range range, int& error);
  bool takeSocket(Range range, int error, double deadline);
  void leaveName() const;
  void removeFile() const noexcept;
  void registerForSignals() const;

  std::string path_;
  int descriptor_ = -1;
  int socket_ = -1;
  std::string holder_;
  std::string warning_;
};

/// Longest wait for a run that is just ending.
inline constexpr double kLockPatienceSeconds = 3.0;
/// Between two looks at a lock that is held.
inline constexpr unsigned kLockPauseMicroseconds = 50'000;

}  // namespace mirevo
