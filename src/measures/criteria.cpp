#include "measures/criteria.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <functional>
#include <limits>
#include <numeric>

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// NaN instead of infinity.
double ratio(double numerator, double denominator) {
  const double value = numerator / denominator;
  return std::isfinite(value) ? value : kNaN;
}

/// As how many values the one at this place counts.
double countAt(std::span<const double> weights, std::size_t place) {
  return weights.empty() ? 1.0 : weights[place] * weights[place];
}

/// As how many pairs all of them count.
double countOf(ValuePairs pairs) {
  if (pairs.weights.empty()) return static_cast<double>(pairs.observed.size());
  return std::inner_product(pairs.weights.begin(), pairs.weights.end(), pairs.weights.begin(), 0.0);
}

double sumOf(std::span<const double> values, std::span<const double> weights) {
  double sum = 0.0;
  for (std::size_t i = 0; i < values.size(); ++i) sum += countAt(weights, i) * values[i];
  return sum;
}

/// The sum of what `term` makes of each pair.
template <class Term>
double sumOver(ValuePairs pairs, const Term& term) {
  double sum = 0.0;
  for (std::size_t i = 0; i < pairs.observed.size(); ++i) {
    sum += countAt(pairs.weights, i) * term(pairs.simulated[i], pairs.observed[i]);
  }
  return sum;
}

/// The sum of the squared deviations from the mean: exactly 0 for values that are all the same, whose mean may be
/// rounded.
double squaredDeviations(std::span<const double> values, std::span<const double> weights) {
  if (std::adjacent_find(values.begin(), values.end(), std::not_equal_to<>()) == values.end()) return 0.0;
  const double mean = meanOf(values, weights);
  double sum = 0.0;
  for (std::size_t i = 0; i < values.size(); ++i) {
    sum += countAt(weights, i) * ((values[i] - mean) * (values[i] - mean));
  }
  return sum;
}

double simulatedMean(ValuePairs pairs) {
  return meanOf(pairs.simulated, pairs.weights);
}

double observedMean(ValuePairs pairs) {
  return meanOf(pairs.observed, pairs.weights);
}

double simulatedDeviations(ValuePairs pairs) {
  return squaredDeviations(pairs.simulated, pairs.weights);
}

double observedDeviations(ValuePairs pairs) {
  return squaredDeviations(pairs.observed, pairs.weights);
}

double pearson(ValuePairs pairs) {
  const double ofSimulated = simulatedMean(pairs);
  const double ofObserved = observedMean(pairs);
  const double products = sumOver(pairs, [&](double s, double o) { return (s - ofSimulated) * (o - ofObserved); });
  // The root of the product: exactly 1 for two equal series.
  const double r = ratio(products, std::sqrt(simulatedDeviations(pairs) * observedDeviations(pairs)));
  return std::clamp(r, -1.0, 1.0);
}

std::vector<double> inDescendingOrder(std::span<const double> values) {
  std::vector<double> sorted(values.begin(), values.end());
  std::sort(sorted.begin(), sorted.end(), std::greater<>());
  return sorted;
}

double percent(double simulated, double observed) {
  return 100.0 * ratio(simulated - observed, observed);
}

/// The integral over the times, linear between them.
double volumeOf(std::span<const double> values, std::span<const double> times, std::span<const std::size_t> breaks) {
  double volume = 0.0;
  for (std::size_t i = 1; i < values.size(); ++i) {
    if (std::binary_search(breaks.begin(), breaks.end(), i)) continue;
    volume += (times[i] - times[i - 1]) * (values[i] + values[i - 1]) / 2.0;
  }
  return volume;
}

/// The value of a duration curve at an exceedance probability; beyond its ends that of the end.
double valueAtExceedance(std::span<const double> curve, double probability) {
  const double last = static_cast<double>(curve.size()) - 1.0;
  const double place = std::clamp(probability * (static_cast<double>(curve.size()) + 1.0) - 1.0, 0.0, last);
  const double before = std::floor(place);
  const double left = curve[static_cast<std::size_t>(before)];
  if (before == last) return left;
  return left + (place - before) * (curve[static_cast<std::size_t>(before) + 1] - left);
}

double middleSlope(std::span<const double> values, double epsilon) {
  constexpr double kUpper = 0.2;
  constexpr double kLower = 0.7;
  const std::vector<double> curve = inDescendingOrder(values);
  return std::log(valueAtExceedance(curve, kUpper) + epsilon) - std::log(valueAtExceedance(curve, kLower) + epsilon);
}

double lowVolume(std::span<const double> values, double epsilon) {
  constexpr double kFrom = 0.7;
  const std::vector<double> curve = inDescendingOrder(values);
  const double smallest = std::log(curve.back() + epsilon);
  double volume = 0.0;
  for (std::size_t i = 0; i < curve.size(); ++i) {
    const double probability = (static_cast<double>(i) + 1.0) / (static_cast<double>(curve.size()) + 1.0);
    if (probability > kFrom) volume += std::log(curve[i] + epsilon) - smallest;
  }
  return volume;
}

double highVolume(std::span<const double> values) {
  constexpr double kBelow = 0.02;
  const std::vector<double> curve = inDescendingOrder(values);
  double volume = curve.front();
  for (std::size_t i = 1; i < curve.size(); ++i) {
    const double probability = (static_cast<double>(i) + 1.0) / (static_cast<double>(curve.size()) + 1.0);
    if (probability < kBelow) volume += curve[i];
  }
  return volume;
}

}  // namespace

double meanOf(std::span<const double> values, std::span<const double> weights) {
  return sumOf(values, weights) / countOf({values, values, weights});
}

double nashSutcliffe(ValuePairs pairs) {
  return 1.0 - ratio(sumOfSquaredErrors(pairs), observedDeviations(pairs));
}

KlingGupta klingGupta(ValuePairs pairs) {
  KlingGupta found;
  found.correlation = pearson(pairs);
  found.variability = ratio(std::sqrt(simulatedDeviations(pairs)), std::sqrt(observedDeviations(pairs)));
  found.meanRatio = ratio(simulatedMean(pairs), observedMean(pairs));
  found.variationRatio = ratio(found.variability, found.meanRatio);
  const auto efficiency = [&](double spread) {
    return 1.0 - std::hypot(found.correlation - 1.0, spread - 1.0, found.meanRatio - 1.0);
  };
  found.efficiency2009 = efficiency(found.variability);
  found.efficiency2012 = efficiency(found.variationRatio);
  return found;
}

double klingGuptaNonParametric(ValuePairs pairs) {
  const double ofSimulated = meanOf(pairs.simulated);
  const double ofObserved = meanOf(pairs.observed);
  const std::vector<double> simulatedCurve = inDescendingOrder(pairs.simulated);
  const std::vector<double> observedCurve = inDescendingOrder(pairs.observed);
  const double distance = sumOver({simulatedCurve, observedCurve}, [&](double s, double o) {
    return std::abs(ratio(s, ofSimulated) - ratio(o, ofObserved));
  });
  const double alikeness = 1.0 - 0.5 * distance / static_cast<double>(pairs.observed.size());
  const std::vector<double> simulatedRanks = ranksOf(pairs.simulated);
  const std::vector<double> observedRanks = ranksOf(pairs.observed);
  const double spearman = pearson({simulatedRanks, observedRanks});
  return 1.0 - std::hypot(spearman - 1.0, alikeness - 1.0, ratio(ofSimulated, ofObserved) - 1.0);
}

double percentBias(ValuePairs pairs) {
  return percent(sumOf(pairs.simulated, pairs.weights), sumOf(pairs.observed, pairs.weights));
}

double meanAbsoluteError(ValuePairs pairs) {
  return ratio(sumOver(pairs, [](double s, double o) { return std::abs(s - o); }), countOf(pairs));
}

double rootMeanSquareError(ValuePairs pairs) {
  return std::sqrt(ratio(sumOfSquaredErrors(pairs), countOf(pairs)));
}

double standardisedRootMeanSquareError(ValuePairs pairs) {
  return std::sqrt(ratio(sumOfSquaredErrors(pairs), observedDeviations(pairs)));
}

double sumOfSquaredErrors(ValuePairs pairs) {
  if (pairs.observed.empty()) return kNaN;
  return sumOver(pairs, [](double s, double o) { return (s - o) * (s - o); });
}

double indexOfAgreement(ValuePairs pairs) {
  const double mean = observedMean(pairs);
  const double largest = sumOver(pairs, [mean](double s, double o) {
    const double reach = std::abs(s - mean) + std::abs(o - mean);
    return reach * reach;
  });
  return 1.0 - ratio(sumOfSquaredErrors(pairs), largest);
}

double peakError(ValuePairs pairs) {
  if (pairs.observed.empty()) return kNaN;
  return percent(*std::max_element(pairs.simulated.begin(), pairs.simulated.end()),
                 *std::max_element(pairs.observed.begin(), pairs.observed.end()));
}

double peakTimeError(ValuePairs pairs, std::span<const double> times) {
  if (pairs.observed.empty()) return kNaN;
  const auto peakTime = [times](std::span<const double> values) {
    return times[static_cast<std::size_t>(std::max_element(values.begin(), values.end()) - values.begin())];
  };
  return peakTime(pairs.simulated) - peakTime(pairs.observed);
}

double volumeError(ValuePairs pairs, std::span<const double> times, std::span<const std::size_t> breaks) {
  return percent(volumeOf(pairs.simulated, times, breaks), volumeOf(pairs.observed, times, breaks));
}

double highFlowBias(ValuePairs pairs) {
  if (pairs.observed.empty()) return kNaN;
  return percent(highVolume(pairs.simulated), highVolume(pairs.observed));
}

double middleSlopeBias(ValuePairs pairs, double epsilon) {
  if (pairs.observed.empty()) return kNaN;
  return percent(middleSlope(pairs.simulated, epsilon), middleSlope(pairs.observed, epsilon));
}

double lowFlowBias(ValuePairs pairs, double epsilon) {
  if (pairs.observed.empty()) return kNaN;
  const double observed = lowVolume(pairs.observed, epsilon);
  return 100.0 * ratio(observed - lowVolume(pairs.simulated, epsilon), observed);
}

std::vector<double> ranksOf(std::span<const double> values) {
  std::vector<std::size_t> order(values.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::sort(order.begin(), order.end(), [values](std::size_t a, std::size_t b) { return values[a] < values[b]; });
  std::vector<double> ranks(values.size());
  for (std::size_t first = 0; first < order.size();) {
    std::size_t end = first + 1;
    while (end < order.size() && values[order[end]] == values[order[first]]) ++end;
    const double rank = (static_cast<double>(first) + 1.0 + static_cast<double>(end)) / 2.0;
    for (; first < end; ++first) ranks[order[first]] = rank;
  }
  return ranks;
}

}  // namespace mirevo
