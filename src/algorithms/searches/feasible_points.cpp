#include "algorithms/searches/feasible_points.h"

#include <algorithm>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"

namespace mirevo {

ParameterSet drawUniformly(std::span<const double> lower, std::span<const double> upper, UniformGenerator& random) {
  ParameterSet set(lower.size());
  for (std::size_t j = 0; j < set.size(); ++j) {
    const double value = lower[j] + random.next() * (upper[j] - lower[j]);
    set[j] = std::clamp(value, lower[j], upper[j]);
  }
  return set;
}

void FeasiblePoints::noteAsKnown(const ParameterSet& point) {
  if (!known_) known_ = point;
}

std::optional<ParameterSet> FeasiblePoints::drawWithin(const SearchBounds& bounds, UniformGenerator& random) {
  for (int i = 0; i < kMostSampleDraws && drawsLeft_ > 0; ++i, --drawsLeft_) {
    ParameterSet point = drawUniformly(bounds.lower, bounds.upper, random);
    if (contain(point)) return point;
  }
  return std::nullopt;
}

void FeasiblePoints::replaceInSample(std::vector<ParameterSet>& sample, std::size_t first, const SearchBounds& bounds,
                                     UniformGenerator& random) {
  if (!feasibility_.isTested()) return;
  std::vector<std::size_t> unusable;
  for (std::size_t i = 0; i < sample.size(); ++i) {
    if (contain(sample[i])) {
      noteAsKnown(sample[i]);
    } else if (i >= first) {
      unusable.push_back(i);
    }
  }
  const bool hasInitial = bounds.initial.size() == bounds.size();
  if (hasInitial && contain(bounds.initial)) noteAsKnown(bounds.initial);
  const int before = drawsLeft_;
  std::vector<std::size_t> remaining;
  for (const std::size_t i : unusable) {
    if (auto point = drawWithin(bounds, random)) {
      noteAsKnown(*point);
      sample[i] = *std::move(point);
    } else {
      remaining.push_back(i);
    }
  }
  while (!known_ && drawsLeft_ > 0) known_ = drawWithin(bounds, random);
  if (!known_) {
    const ParameterSet& last = sample.empty() ? bounds.initial : sample.back();
    fatalError(
        feasibility_.noSetMessage(),
        fmt::format("{} sets drawn between the bounds cannot be run{}; one of them: {}",
                    unusable.size() + static_cast<std::size_t>(before - drawsLeft_),
                    hasInitial ? ", nor can the initial values" : "", feasibility_.violation(last).value_or("")));
  }
  for (const std::size_t i : remaining) sample[i] = towards(std::move(sample[i]), *known_);
  replacedCount_ += static_cast<int>(unusable.size());
}

ParameterSet FeasiblePoints::draw(const std::function<ParameterSet()>& drawPoint, std::span<const double> origin) {
  ParameterSet point = drawPoint();
  if (contain(point)) return point;
  for (int i = 0; i < kMostRedraws; ++i) {
    point = drawPoint();
    if (!contain(point)) continue;
    ++replacedCount_;
    return point;
  }
  return drawnBack(std::move(point), {origin});
}

ParameterSet FeasiblePoints::drawnBack(ParameterSet point, std::initializer_list<std::span<const double>> origins) {
  if (contain(point)) return point;
  ++replacedCount_;
  const auto* const origin =
      std::find_if(origins.begin(), origins.end(), [this](std::span<const double> each) { return contain(each); });
  if (origin != origins.end()) return towards(std::move(point), *origin);
  return known_ ? towards(std::move(point), *known_) : point;
}

std::optional<ParameterSet> FeasiblePoints::shortened(ParameterSet point, std::span<const double> origin,
                                                      int mostHalvings) {
  if (contain(point)) return point;
  ++replacedCount_;
  if (!halve(point, origin, mostHalvings)) return std::nullopt;
  return point;
}

bool FeasiblePoints::halve(ParameterSet& point, std::span<const double> origin, int mostHalvings) const {
  for (int halving = 0; halving < mostHalvings; ++halving) {
    for (std::size_t j = 0; j < point.size(); ++j) point[j] = origin[j] + 0.5 * (point[j] - origin[j]);
    if (contain(point)) return true;
  }
  return false;
}

ParameterSet FeasiblePoints::towards(ParameterSet point, std::span<const double> origin) {
  if (halve(point, origin, kMostHalvings)) return point;
  ++returnedCount_;
  return {origin.begin(), origin.end()};
}

}  // namespace mirevo
