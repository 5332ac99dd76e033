#include "algorithms/searches/cma_margin.h"

#include <algorithm>
#include <cmath>
#include <numbers>

#include "algorithms/numbers/special_functions.h"

namespace mirevo {
namespace {

double probabilityBelow(double deviate) {
  return 0.5 * std::erfc(-deviate / std::numbers::sqrt2);
}

/// The deviate that is exceeded with probability p.
double deviateFor(double p) {
  int fault = 0;
  return -normalQuantile(std::clamp(p, 1.0e-300, 0.5), fault);
}

/// A mean between the first and the last value: both neighbours get half of the margin at least.
void keepNeighbours(CmaDistribution& distribution, std::size_t j, double below, double above, double margin) {
  const double mean = distribution.mean()[j];
  const double deviation = distribution.deviation(j);
  const double least = 0.5 * margin;
  const double pBelow = probabilityBelow((below - mean) / deviation);
  const double pAbove = probabilityBelow((mean - above) / deviation);
  if (pBelow >= least && pAbove >= least) return;
  const double pMiddle = 1.0 - pBelow - pAbove;
  const double raisedBelow = std::max(least, pBelow);
  const double raisedAbove = std::max(least, pAbove);
  // What the raised ones have too much is taken from all three in proportion to what they have beyond the margin.
  const double excess = 1.0 - raisedBelow - raisedAbove - pMiddle;
  const double free = raisedBelow + raisedAbove + pMiddle - 3.0 * least;
  const double zBelow = deviateFor(raisedBelow + excess / free * (raisedBelow - least));
  const double zAbove = deviateFor(raisedAbove + excess / free * (raisedAbove - least));
  distribution.setMean(j, (below * zAbove + above * zBelow) / (zAbove + zBelow));
  distribution.setWidening(j, distribution.widening(j) * (above - below) / (deviation * (zAbove + zBelow)));
}

}  // namespace

void CmaMargin::keepOpen(CmaDistribution& distribution) const {
  const auto n = static_cast<double>(distribution.size());
  const double margin = 1.0 / (n * static_cast<double>(distribution.constants().weights.size()));
  for (std::size_t j = 0; j < stepCounts_.size(); ++j) {
    const double borders = std::round(stepCounts_[j]) - 1.0;  // borders between two values
    if (borders < 1.0) continue;
    const double mean = distribution.mean()[j];
    const double value = std::floor(mean * stepCounts_[j]);  // counted from 0
    if (value >= 1.0 && value < borders) {
      keepNeighbours(distribution, j, value / stepCounts_[j], (value + 1.0) / stepCounts_[j], margin);
      continue;
    }
    const bool isFirst = value < 1.0;
    const double border = (isFirst ? 1.0 : borders) / stepCounts_[j];
    const double farthest = distribution.deviation(j) * deviateFor(margin);
    if (std::abs(mean - border) > farthest) distribution.setMean(j, isFirst ? border - farthest : border + farthest);
  }
}

}  // namespace mirevo
