#include "evaluation/run_times.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <numeric>

namespace mirevo {
namespace {

/// Runs that are remembered, and their values: more cost more than they tell.
constexpr std::size_t kMostRuns = 512;
constexpr std::size_t kMostValues = 100'000;
constexpr std::size_t kMostGroups = 8;
constexpr std::size_t kRunsPerGroup = 24;
constexpr std::size_t kMostEffects = 8;
/// Below this standard deviation of the logarithms the order of starting changes nothing.
constexpr double kLeastDeviation = 0.05;
/// With which a parameter without effect is taken for one that has an effect, all parameters together.
constexpr double kChance = 0.05;
/// Shorter times are those of starting a process.
constexpr double kLeastSeconds = 1e-4;

/// The runs divided into groups of equal size by the values of a parameter.
class Groups {
 public:
  Groups(std::span<const double> values, std::size_t groupCount) : groups_(values.size()), means_(groupCount, 0.0) {
    std::vector<double> sorted(values.begin(), values.end());
    std::ranges::sort(sorted);
    std::vector<double> bounds;
    for (std::size_t g = 1; g < groupCount; ++g) bounds.push_back(sorted[g * sorted.size() / groupCount]);
    sizes_.assign(groupCount, 0);
    for (std::size_t i = 0; i < values.size(); ++i) {
      const auto group = static_cast<std::size_t>(std::ranges::upper_bound(bounds, values[i]) - bounds.begin());
      groups_[i] = static_cast<std::uint8_t>(group);
      ++sizes_[group];
      means_[group] += values[i];
    }
    for (std::size_t g = 0; g < groupCount; ++g) {
      if (sizes_[g] > 0) means_[g] /= static_cast<double>(sizes_[g]);
    }
  }

  /// The sum of squares of `rest` that the means of the groups explain.
  double explained(std::span<const double> rest) const {
    const std::vector<double> sums = sumsOf(rest);
    double squares = 0.0;
    for (std::size_t g = 0; g < sums.size(); ++g) {
      if (sizes_[g] > 0) squares += sums[g] * sums[g] / static_cast<double>(sizes_[g]);
    }
    return squares;
  }
  RunTimes::Effect effect(std::size_t parameter, std::span<const double> rest) const {
    RunTimes::Effect effect{parameter, {}, {}};
    const std::vector<double> sums = sumsOf(rest);
    for (std::size_t g = 0; g < sums.size(); ++g) {
      if (sizes_[g] == 0 || (!effect.values.empty() && !(means_[g] > effect.values.back()))) continue;
      effect.values.push_back(means_[g]);
      effect.logs.push_back(sums[g] / static_cast<double>(sizes_[g]));
    }
    return effect;
  }

 private:
  std::vector<double> sumsOf(std::span<const double> rest) const {
    std::vector<double> sums(sizes_.size(), 0.0);
    for (std::size_t i = 0; i < rest.size(); ++i) sums[groups_[i]] += rest[i];
    return sums;
  }

  std::vector<std::uint8_t> groups_;  ///< by run
  std::vector<double> means_;         ///< of the parameter's values, by group
  std::vector<std::size_t> sizes_;
};

/// The sum of squares, as a multiple of the variance, that a parameter without effect explains so rarely that this
/// happens among all with kChance at most: the tail of chi-squared, Laurent and Massart (2000), Annals of Statistics
/// 28, lemma 1.
double chanceLimit(std::size_t groupCount, std::size_t parameterCount) {
  const auto freedom = static_cast<double>(groupCount - 1);
  const double rarity = std::log(static_cast<double>(parameterCount) / kChance);
  return freedom + 2.0 * std::sqrt(freedom * rarity) + 2.0 * rarity;
}

}  // namespace

void RunTimes::add(std::span<const double> set, double seconds) {
  ++count_;
  if (set.empty()) return;
  const std::size_t most = std::min(kMostRuns, kMostValues / set.size());
  if (most < kFewest) return;
  if (runs_.size() == most) runs_.pop_front();
  runs_.push_back({{set.begin(), set.end()}, std::log(std::max(seconds, kLeastSeconds))});
}

std::vector<RunTimes::Effect> RunTimes::effects() const {
  std::vector<Effect> effects;
  if (runs_.size() < kFewest) return effects;
  const auto n = static_cast<double>(runs_.size());
  std::vector<double> rest;
  for (const Run& run : runs_) rest.push_back(run.log);
  const double mean = std::accumulate(rest.begin(), rest.end(), 0.0) / n;
  for (double& each : rest) each -= mean;
  double squares = std::inner_product(rest.begin(), rest.end(), rest.begin(), 0.0);
  if (squares < n * kLeastDeviation * kLeastDeviation) return effects;

  const std::size_t parameterCount = runs_.front().set.size();
  const std::size_t groupCount = std::clamp<std::size_t>(runs_.size() / kRunsPerGroup, 2, kMostGroups);
  std::vector<Groups> groups;
  std::vector<double> values(runs_.size());
  for (std::size_t j = 0; j < parameterCount; ++j) {
    std::ranges::transform(runs_, values.begin(), [j](const Run& run) { return run.set[j]; });
    groups.emplace_back(values, groupCount);
  }
  while (effects.size() < kMostEffects) {
    std::size_t best = 0;
    double most = 0.0;
    for (std::size_t j = 0; j < parameterCount; ++j) {
      const double explained = groups[j].explained(rest);
      if (explained > most) {
        most = explained;
        best = j;
      }
    }
    if (most * n <= chanceLimit(groupCount, parameterCount) * squares) break;
    effects.push_back(groups[best].effect(best, rest));
    for (std::size_t i = 0; i < rest.size(); ++i) rest[i] -= effects.back().at(runs_[i].set[best]);
    const double left = std::inner_product(rest.begin(), rest.end(), rest.begin(), 0.0);
    if (!(left < squares)) break;
    squares = left;
  }
  return effects;
}

double RunTimes::Effect::at(double value) const {
  if (values.size() < 2) return logs.empty() ? 0.0 : logs.front();
  const auto above = static_cast<std::size_t>(std::ranges::lower_bound(values, value) - values.begin());
  const std::size_t right = std::clamp<std::size_t>(above, 1, values.size() - 1);
  const double slope = (logs[right] - logs[right - 1]) / (values[right] - values[right - 1]);
  return logs[right] + slope * (value - values[right]);
}

double expectedLog(std::span<const RunTimes::Effect> effects, std::span<const double> set) {
  double sum = 0.0;
  for (const RunTimes::Effect& effect : effects) sum += effect.at(set[effect.parameter]);
  return sum;
}

}  // namespace mirevo
