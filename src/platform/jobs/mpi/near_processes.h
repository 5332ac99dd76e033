#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <string_view>

namespace mirevo {

/// The other processes of a job that run on this machine: their end is seen at once, and they can be ended.
class NearProcesses {
 public:
  NearProcesses() = default;
  NearProcesses(const NearProcesses&) = delete;
  NearProcesses& operator=(const NearProcesses&) = delete;
  ~NearProcesses();

  /// What a process tells the others of itself, to be found by them: the system that it runs on and its number.
  static std::string introduction();

  /// Takes up the process of `rank`, which has introduced itself so, if it is on this machine.
  void meet(int rank, std::string_view introduction);

  /// Whether that process is on this machine and has ended.
  bool hasEnded(int rank) const;
  /// Kills it if it is on this machine; false if it is not.
  bool kill(int rank) const;
  /// Kills all of them. Async-signal-safe.
  void killAll() const;
  std::size_t count() const { return descriptors_.size(); }

 private:
  std::map<int, int> descriptors_;  ///< a pidfd each, which never comes to mean another process; by rank
};

}  // namespace mirevo
