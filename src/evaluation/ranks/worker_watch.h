#pragma once

#include <functional>
#include <optional>
#include <set>
#include <vector>

#include "platform/jobs/job.h"

namespace mirevo {

/// What the master knows of its workers' being there: who runs which set since when, and who is lost, as its process
/// has ended or as it has been silent for too long while it had a set. A worker that was silent may come back.
class WorkerWatch {
 public:
  using Clock = std::function<double()>;

  /// Longest step in which a silence grows: of a time in which the master itself was stopped or did something else, no
  /// more counts.
  static constexpr double kLongestStep = 1.0;

  /// A set that a worker has.
  struct Held {
    int number = 0;      ///< of the evaluation
    double since = 0.0;  ///< by the clock
  };

  /// `silenceLimit`: seconds after which a worker that has a set is lost; 0: never.
  WorkerWatch(Job& job, double silenceLimit, Clock clock);

  double silenceLimit() const { return silenceLimit_; }

  /// The worker has this set from now on.
  void handOut(int rank, int number);
  /// The worker has answered and has no set any more; which one it was.
  std::optional<Held> takeBack(int rank);
  const std::optional<Held>& heldBy(int rank) const { return worker(rank).held; }
  double secondsSince(double time) const { return clock_() - time; }

  /// A message of the worker has come. True if it was lost until now.
  bool hear(int rank);

  /// Workers that are lost since the last call. To be called often.
  std::vector<int> findLost();
  bool isLost(int rank) const { return worker(rank).isLost; }
  /// Whether the process of a lost worker is known to have ended; otherwise it is silent.
  bool hasEnded(int rank) const { return worker(rank).hasEnded; }
  /// The ranks of all that are lost.
  std::set<int> lost() const;

 private:
  struct Worker {
    std::optional<Held> held;
    double silence = 0.0;  ///< s, since its last message or since it has the set
    bool isLost = false;
    bool hasEnded = false;
  };

  Worker& worker(int rank) { return workers_.at(static_cast<std::size_t>(rank - 1)); }
  const Worker& worker(int rank) const { return workers_.at(static_cast<std::size_t>(rank - 1)); }

  Job& job_;
  double silenceLimit_;
  Clock clock_;
  double lastLook_;
  std::vector<Worker> workers_;  ///< of ranks 1, 2, ...
};

}  // namespace mirevo
