#include "algorithms/bayes/chain_diagnostics.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <limits>
#include <numeric>

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
      double ofHalf = 0.0;
      for (std::size_t i = 0; i + lag < n; ++i) ofHalf += half[i] * half[i + lag];
      sum += ofHalf / static_cast<double>(n);
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

}  // namespace mirevo
