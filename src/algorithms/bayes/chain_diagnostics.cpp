#include "algorithms/bayes/chain_diagnostics.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <limits>
#include <numeric>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/special_functions.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// The halves of the chains without their means, and the variances of the classic analysis.
struct Halves {
  std::vector<std::vector<double>> centred;
  std::size_t length = 0;  ///< n
  double within = 0.0;     ///< W
  double total = 0.0;      ///< var+ = (n - 1) / n W + B / n
};

Halves halvesOf(std::span<const std::vector<double>> chains) {
  Halves halves;
  halves.length = chains.empty() ? 0 : chains.front().size() / 2;
  const std::size_t n = halves.length;
  if (n < 2) return halves;
  const auto size = static_cast<double>(n);
  std::vector<double> means;
  for (const std::vector<double>& chain : chains) {
    // Of an odd number the first value is left out.
    for (const std::size_t first : {chain.size() - 2 * n, chain.size() - n}) {
      const auto begin = chain.begin() + static_cast<std::ptrdiff_t>(first);
      std::vector<double> half(begin, begin + static_cast<std::ptrdiff_t>(n));
      means.push_back(std::accumulate(half.begin(), half.end(), 0.0) / size);
      double squares = 0.0;
      for (double& value : half) {
        value -= means.back();
        squares += value * value;
      }
      halves.within += squares / (size - 1.0);
      halves.centred.push_back(std::move(half));
    }
  }
  const auto count = static_cast<double>(means.size());
  halves.within /= count;
  const double mean = std::accumulate(means.begin(), means.end(), 0.0) / count;
  double between = 0.0;  // B / n
  for (const double own : means) between += (own - mean) * (own - mean) / (count - 1.0);
  halves.total = (size - 1.0) / size * halves.within + between;
  return halves;
}

std::vector<double> sortedValues(std::span<const std::vector<double>> chains) {
  std::vector<double> sorted;
  for (const std::vector<double>& chain : chains) sorted.insert(sorted.end(), chain.begin(), chain.end());
  std::ranges::sort(sorted);
  return sorted;
}

/// The normal quantile at (rank - 3/8) / (values + 1/4) of each value; equal values share the mean of their ranks.
std::vector<std::vector<double>> normalDeviates(std::span<const std::vector<double>> chains) {
  const std::vector<double> sorted = sortedValues(chains);
  const double count = static_cast<double>(sorted.size()) + 0.25;
  std::vector<std::vector<double>> deviates(chains.begin(), chains.end());
  for (std::vector<double>& chain : deviates) {
    for (double& value : chain) {
      const auto [first, last] = std::equal_range(sorted.begin(), sorted.end(), value);
      const auto before = static_cast<double>(first - sorted.begin());
      const double rank = before + 0.5 * (1.0 + static_cast<double>(last - first));
      int fault = 0;
      value = normalQuantile((rank - 0.375) / count, fault);
    }
  }
  return deviates;
}

/// The sum of x_i x_(i + lag). Several sums side by side keep the processor from waiting for each addition: all the
/// time of a check is spent here.
double productAt(std::span<const double> values, std::size_t lag) {
  constexpr std::size_t kSums = 8;
  std::array<double, kSums> sums{};
  const std::size_t count = values.size() - lag;
  const double* const ahead = values.data() + lag;
  std::size_t i = 0;
  for (; i + kSums <= count; i += kSums) {
    for (std::size_t k = 0; k < kSums; ++k) sums[k] += values[i + k] * ahead[i + k];
  }
  for (; i < count; ++i) sums[0] += values[i] * ahead[i];
  return std::accumulate(sums.begin(), sums.end(), 0.0);
}

}  // namespace

double splitRHat(std::span<const std::vector<double>> chains) {
  const Halves halves = halvesOf(chains);
  if (halves.length < 2 || !(halves.total > 0.0)) return kNaN;
  return std::sqrt(halves.total / halves.within);  // infinite where each half stands still
}

double effectiveSampleSize(std::span<const std::vector<double>> chains) {
  const Halves halves = halvesOf(chains);
  const std::size_t n = halves.length;
  if (n < 2 || !(halves.total > 0.0)) return kNaN;
  const auto count = static_cast<double>(halves.centred.size());
  const auto correlationAt = [&](std::size_t lag) {
    double sum = 0.0;
    for (const std::vector<double>& half : halves.centred) {
      sum += productAt(half, lag) / static_cast<double>(n);
    }
    // The mean autocovariance with the divisor n - 1 of W at lag 0.
    const double covariance = sum / count * static_cast<double>(n) / static_cast<double>(n - 1);
    return 1.0 - (halves.within - covariance) / halves.total;
  };
  // Sums of neighbouring pairs are positive and fall; the first that does not ends the sequence.
  double sum = 0.0;
  double least = std::numeric_limits<double>::infinity();
  for (std::size_t lag = 0; lag + 1 < n; lag += 2) {
    const double pair = correlationAt(lag) + correlationAt(lag + 1);
    if (!(pair > 0.0)) break;
    least = std::min(least, pair);
    sum += least;
  }
  const double draws = count * static_cast<double>(n);
  // Where neighbours are anticorrelated, no more than this is claimed.
  const double time = std::max(2.0 * sum - 1.0, 1.0 / std::log10(std::max(draws, 10.0)));
  return draws / time;
}

double largestRHat(std::span<const std::vector<double>> chains) {
  const double ofValues = splitRHat(chains);
  if (std::isnan(ofValues)) return kNaN;
  const double median = sortedQuantile(sortedValues(chains), 0.5);
  std::vector<std::vector<double>> distances(chains.begin(), chains.end());
  for (std::vector<double>& chain : distances) {
    for (double& value : chain) value = std::abs(value - median);
  }
  const double ofWidths = splitRHat(normalDeviates(distances));
  const double largest = std::max(ofValues, splitRHat(normalDeviates(chains)));
  return std::isnan(ofWidths) ? largest : std::max(largest, ofWidths);  // NaN: all values are equally far off
}

double leastEffectiveSampleSize(std::span<const std::vector<double>> chains) {
  double least = effectiveSampleSize(chains);
  if (std::isnan(least)) return kNaN;
  least = std::min(least, effectiveSampleSize(normalDeviates(chains)));
  const std::vector<double> sorted = sortedValues(chains);
  for (const double probability : {0.05, 0.95}) {
    const double quantile = sortedQuantile(sorted, probability);
    std::vector<std::vector<double>> below(chains.begin(), chains.end());
    for (std::vector<double>& chain : below) {
      for (double& value : chain) value = value <= quantile ? 1.0 : 0.0;
    }
    const double size = effectiveSampleSize(below);
    if (!std::isnan(size)) least = std::min(least, size);  // not where most values are equal
  }
  return least;
}

}  // namespace mirevo
