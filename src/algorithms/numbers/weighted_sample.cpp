#include "algorithms/numbers/weighted_sample.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <numeric>
#include <tuple>
#include <utility>

namespace mirevo {
namespace {

constexpr double kNoValue = std::numeric_limits<double>::quiet_NaN();
/// Of a sum of weights: 0.05 of 20 equal ones is the first, whichever way the sum was rounded.
constexpr double kRounding = 1e-12;

}  // namespace

void WeightedQuantiles::take(std::span<const double> values, std::span<const double> weights) {
  assert(values.size() == weights.size());
  values_.clear();
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (std::isfinite(values[i]) && weights[i] > 0.0) values_.push_back({values[i], weights[i], i});
  }
  // Of equal values in a fixed order, so that the sums are the same bits wherever they are made.
  std::sort(values_.begin(), values_.end(),
            [](const Value& a, const Value& b) { return std::tie(a.value, a.index) < std::tie(b.value, b.index); });
  double sum = 0.0;
  for (Value& value : values_) value.weight = sum += value.weight;
}

double WeightedQuantiles::at(double probability) const {
  if (values_.empty()) return kNoValue;
  const double wanted = (probability - kRounding) * values_.back().weight;
  const auto found = std::lower_bound(values_.begin(), values_.end(), wanted,
                                      [](const Value& value, double sum) { return value.weight < sum; });
  return (found == values_.end() ? values_.back() : *found).value;
}

double WeightedQuantiles::shareUpTo(double limit) const {
  if (values_.empty()) return kNoValue;
  const auto behind = std::upper_bound(values_.begin(), values_.end(), limit,
                                       [](double value, const Value& other) { return value < other.value; });
  return behind == values_.begin() ? 0.0 : std::prev(behind)->weight / values_.back().weight;
}

SampleSummary summariseWeighted(std::span<const double> values, std::span<const double> weights) {
  WeightedQuantiles quantiles;
  quantiles.take(values, weights);
  SampleSummary summary;
  summary.count = quantiles.count();
  summary.mean = summary.standardDeviation = kNoValue;
  std::transform(kSummaryProbabilities.begin(), kSummaryProbabilities.end(), summary.quantiles.begin(),
                 [&](double probability) { return quantiles.at(probability); });
  double sum = 0.0;
  double squares = 0.0;
  double mean = 0.0;
  double moment = 0.0;  // about the mean of the values so far
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (!std::isfinite(values[i]) || !(weights[i] > 0.0)) continue;
    sum += weights[i];
    squares += weights[i] * weights[i];
    const double difference = values[i] - mean;
    mean += weights[i] / sum * difference;
    moment += weights[i] * difference * (values[i] - mean);
  }
  if (summary.count == 0) return summary;
  summary.mean = mean;
  const double divisor = sum - squares / sum;
  if (summary.count > 1 && divisor > 0.0) summary.standardDeviation = std::sqrt(moment / divisor);
  return summary;
}

namespace {

/// (x - mean) sqrt(weight) of each column, of length 1; NaN where it is constant.
std::vector<std::vector<double>> scaledColumns(std::span<const std::vector<double>> columns,
                                               std::span<const double> weights) {
  const double sum = std::accumulate(weights.begin(), weights.end(), 0.0);
  std::vector<std::vector<double>> scaled;
  for (const std::vector<double>& column : columns) {
    double mean = 0.0;
    for (std::size_t i = 0; i < column.size(); ++i) mean += weights[i] / sum * column[i];
    std::vector<double> one(column.size());
    for (std::size_t i = 0; i < column.size(); ++i) one[i] = (column[i] - mean) * std::sqrt(weights[i] / sum);
    const double length = std::sqrt(std::inner_product(one.begin(), one.end(), one.begin(), 0.0));
    const auto largest =
        std::max_element(column.begin(), column.end(), [](double a, double b) { return std::abs(a) < std::abs(b); });
    // What is left of a constant column is rounding.
    const bool isConstant = column.empty() || length <= kRounding * std::abs(*largest);
    for (double& value : one) value = isConstant ? kNoValue : value / length;
    scaled.push_back(std::move(one));
  }
  return scaled;
}

}  // namespace

std::vector<PairCorrelation> largestWeightedCorrelations(std::span<const std::vector<double>> columns,
                                                         std::span<const double> weights) {
  return largestCorrelations(SampleCorrelations::ofScaled(scaledColumns(columns, weights)), kMostLargeCorrelations);
}

std::vector<std::vector<double>> weightedCorrelations(std::span<const std::vector<double>> columns,
                                                      std::span<const double> weights) {
  const std::vector<std::vector<double>> scaled = scaledColumns(columns, weights);
  std::vector<std::vector<double>> matrix(columns.size(), std::vector<double>(columns.size(), 1.0));
  for (std::size_t i = 0; i < columns.size(); ++i) {
    for (std::size_t j = 0; j < i; ++j) {
      const double value = std::inner_product(scaled[i].begin(), scaled[i].end(), scaled[j].begin(), 0.0);
      matrix[i][j] = matrix[j][i] = std::isnan(value) ? value : std::clamp(value, -1.0, 1.0);
    }
  }
  return matrix;
}

double effectiveCount(std::span<const double> weights) {
  const double squares = std::inner_product(weights.begin(), weights.end(), weights.begin(), 0.0);
  return squares > 0.0 ? 1.0 / squares : 0.0;
}

double distributionDistance(std::span<const double> values, std::span<const double> weights,
                            std::span<const double> drawn) {
  WeightedQuantiles distribution;
  distribution.take(values, weights);
  std::vector<double> others(drawn.begin(), drawn.end());
  std::erase_if(others, [](double value) { return !std::isfinite(value); });
  std::sort(others.begin(), others.end());
  if (distribution.count() == 0 || others.empty()) return kNoValue;
  // Both are steps: the largest distance is at a value of either of them, and the weighted values may be some of drawn.
  double distance = 0.0;
  const auto compareAt = [&](double value) {
    const auto upTo = std::upper_bound(others.begin(), others.end(), value) - others.begin();
    const double share = static_cast<double>(upTo) / static_cast<double>(others.size());
    distance = std::max(distance, std::abs(distribution.shareUpTo(value) - share));
  };
  for (const double value : others) compareAt(value);
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (std::isfinite(values[i]) && weights[i] > 0.0) compareAt(values[i]);
  }
  return distance;
}

double chanceDistance(double effective, std::size_t count) {
  constexpr double kOneInTwenty = 1.358;
  return kOneInTwenty * std::sqrt(1.0 / effective + 1.0 / static_cast<double>(count));
}

}  // namespace mirevo
