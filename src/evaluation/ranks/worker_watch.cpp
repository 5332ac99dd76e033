#include "evaluation/ranks/worker_watch.h"

#include <algorithm>
#include <utility>

namespace mirevo {
namespace {

/// Time between two looks at all workers: with many of them messages come more often.
constexpr double kLookSeconds = 0.1;

}  // namespace

WorkerWatch::WorkerWatch(Job& job, double silenceLimit, Clock clock)
    : job_(job),
      silenceLimit_(silenceLimit),
      clock_(std::move(clock)),
      lastLook_(clock_()),
      workers_(static_cast<std::size_t>(job.processCount() - 1)) {}

void WorkerWatch::handOut(int rank, int number) {
  worker(rank).held = Held{number, clock_()};
  worker(rank).silence = 0.0;
}

std::optional<WorkerWatch::Held> WorkerWatch::takeBack(int rank) {
  return std::exchange(worker(rank).held, std::nullopt);
}

bool WorkerWatch::hear(int rank) {
  worker(rank).silence = 0.0;
  // The last messages of a process may come when its end is known.
  return !worker(rank).hasEnded && std::exchange(worker(rank).isLost, false);
}

std::vector<int> WorkerWatch::findLost() {
  std::vector<int> found;
  const double step = clock_() - lastLook_;
  if (step < kLookSeconds) return found;
  lastLook_ += step;
  for (int rank = 1; rank <= static_cast<int>(workers_.size()); ++rank) {
    Worker& each = worker(rank);
    const bool wasLost = each.isLost;
    each.hasEnded = each.hasEnded || job_.hasEnded(rank);
    if (each.held) each.silence += std::min(step, kLongestStep);
    each.isLost = wasLost || each.hasEnded || (each.held && silenceLimit_ > 0.0 && each.silence >= silenceLimit_);
    if (each.isLost && !wasLost) found.push_back(rank);
  }
  return found;
}

std::set<int> WorkerWatch::lost() const {
  std::set<int> ranks;
  for (int rank = 1; rank <= static_cast<int>(workers_.size()); ++rank) {
    if (worker(rank).isLost) ranks.insert(rank);
  }
  return ranks;
}

}  // namespace mirevo
