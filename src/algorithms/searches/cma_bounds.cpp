#include "algorithms/searches/cma_bounds.h"

#include <algorithm>
#include <cmath>

namespace mirevo {
namespace {

double distanceOutside(double value) {
  return value < 0.0 ? value : value > 1.0 ? value - 1.0 : 0.0;
}

/// The distance between the quartiles of values, which are sorted.
double interquartileRange(std::vector<double>& values) {
  std::sort(values.begin(), values.end());
  const std::size_t quarter = values.size() / 4;
  return values[values.size() - 1 - quarter] - values[quarter];
}

double meanVariance(const CmaDistribution& distribution) {
  double sum = 0.0;
  for (std::size_t j = 0; j < distribution.size(); ++j) sum += distribution.variance(j);
  return sum / static_cast<double>(distribution.size());
}

}  // namespace

std::vector<double> CmaBounds::repaired(std::vector<double> point) {
  for (double& value : point) value = std::clamp(value, 0.0, 1.0);
  return point;
}

double CmaBounds::typicalSpread() const {
  std::vector<double> sorted(spreads_.begin(), spreads_.end());
  std::sort(sorted.begin(), sorted.end());
  return sorted[sorted.size() / 2];
}

void CmaBounds::adapt(const CmaDistribution& distribution, std::vector<double> values) {
  const auto n = static_cast<double>(distribution.size());
  const auto lambda = static_cast<double>(distribution.constants().weights.size());
  const double sigma = distribution.sigma();
  if (values.size() > 1) {
    const double spread = interquartileRange(values) / (sigma * sigma * meanVariance(distribution));
    if (spread > 0.0 && std::isfinite(spread)) spreads_.push_back(spread);
    if (static_cast<double>(spreads_.size()) > 20.0 + 3.0 * n / lambda) spreads_.pop_front();
  }
  bool isOutside = false;
  for (const double value : distribution.mean()) isOutside = isOutside || distanceOutside(value) != 0.0;
  if (!isOutside || spreads_.empty()) return;
  if (!areSet_) {
    weights_.assign(weights_.size(), 2.0 * typicalSpread());
    areSet_ = true;
  }
  const double mu = distribution.constants().muEff;
  for (std::size_t j = 0; j < weights_.size(); ++j) {
    const double far = 3.0 * distribution.deviation(j) * std::max(1.0, std::sqrt(n) / mu);
    if (std::abs(distanceOutside(distribution.mean()[j])) > far) {
      weights_[j] *= std::pow(1.1, std::max(1.0, mu / (10.0 * n)));
    }
  }
}

double CmaBounds::penalty(std::span<const double> point, const CmaDistribution& distribution) const {
  if (!areSet_) return 0.0;
  const auto n = static_cast<double>(point.size());
  double meanLog = 0.0;
  for (std::size_t j = 0; j < point.size(); ++j) meanLog += std::log(distribution.variance(j)) / n;
  double sum = 0.0;
  for (std::size_t j = 0; j < point.size(); ++j) {
    const double distance = distanceOutside(point[j]);
    if (distance == 0.0) continue;
    const double scale = std::exp(0.9 * (std::log(distribution.variance(j)) - meanLog));
    sum += weights_[j] * distance * distance / scale;
  }
  return sum / n;
}

}  // namespace mirevo
