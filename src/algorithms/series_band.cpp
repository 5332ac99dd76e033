#include "algorithms/series_band.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <utility>

namespace mirevo {

namespace {

constexpr double kTail = 0.05;

void keepSmallest(std::vector<double>& heap, double value, std::size_t keep) {
  if (heap.size() == keep) {
    if (!(value < heap.front())) return;
    std::pop_heap(heap.begin(), heap.end());
    heap.back() = value;
  } else {
    heap.push_back(value);
  }
  std::push_heap(heap.begin(), heap.end());
}

/// The type 7 quantile at kTail of `count` values, of which `heap` holds the smallest.
double lowerQuantile(std::vector<double> heap, std::size_t count) {
  if (count == 0) return std::numeric_limits<double>::quiet_NaN();
  std::sort_heap(heap.begin(), heap.end());
  const double position = static_cast<double>(count - 1) * kTail;
  const auto below = static_cast<std::size_t>(position);
  const std::size_t above = std::min(below + 1, count - 1);
  assert(above < heap.size());
  return heap[below] + (position - std::floor(position)) * (heap[above] - heap[below]);
}

}  // namespace

SeriesBand::SeriesBand(std::vector<double> observed, std::size_t largestCount)
    : observed_(std::move(observed)),
      keep_(static_cast<std::size_t>(static_cast<double>(largestCount) * kTail) + 2),
      counts_(observed_.size(), 0),
      smallest_(observed_.size()),
      negatedLargest_(observed_.size()) {}

void SeriesBand::add(std::span<const double> simulated) {
  assert(simulated.size() == observed_.size());
  for (std::size_t t = 0; t < observed_.size() && t < simulated.size(); ++t) {
    if (!std::isfinite(simulated[t])) continue;
    ++counts_[t];
    keepSmallest(smallest_[t], simulated[t], keep_);
    keepSmallest(negatedLargest_[t], -simulated[t], keep_);
  }
}

SeriesBand::Bounds SeriesBand::bounds() const {
  Bounds bounds;
  std::size_t inside = 0;
  for (std::size_t t = 0; t < observed_.size(); ++t) {
    bounds.lower.push_back(lowerQuantile(smallest_[t], counts_[t]));
    bounds.upper.push_back(-lowerQuantile(negatedLargest_[t], counts_[t]));
    if (std::isnan(observed_[t]) || counts_[t] == 0) continue;
    ++bounds.observationCount;
    if (observed_[t] >= bounds.lower[t] && observed_[t] <= bounds.upper[t]) ++inside;
  }
  bounds.shareInside = bounds.observationCount == 0
                           ? std::numeric_limits<double>::quiet_NaN()
                           : static_cast<double>(inside) / static_cast<double>(bounds.observationCount);
  return bounds;
}

}  // namespace mirevo
