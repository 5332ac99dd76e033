#include "algorithms/searches/cma_tests.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace mirevo {
namespace {

constexpr double kLeastStep = 1.0e-12;        ///< TolX, in units of the first step
constexpr double kLeastDifference = 1.0e-12;  ///< TolFun, in units of the least value
constexpr double kLargestGrowth = 1.0e4;      ///< TolXUp, of the longest axis
constexpr double kWorstCondition = 1.0e14;    ///< ConditionCov
constexpr int kShortestStagnation = 120;      ///< generations
constexpr std::size_t kComparedGenerations = 20;

double medianOf(std::span<const double> values) {
  std::vector<double> sorted(values.begin(), values.end());
  const auto middle = sorted.begin() + static_cast<std::ptrdiff_t>(sorted.size() / 2);
  std::nth_element(sorted.begin(), middle, sorted.end());
  return *middle;
}

}  // namespace

std::size_t CmaTests::shortHistory(std::size_t n, std::size_t lambda) {
  return 10 + (30 * n + lambda - 1) / lambda;
}

CmaTests::CmaTests(const CmaDistribution& distribution)
    : history_(shortHistory(distribution.size(), distribution.constants().weights.size())),
      startSigma_(distribution.sigma()) {
  const auto n = static_cast<double>(distribution.size());
  const auto lambda = static_cast<double>(distribution.constants().weights.size());
  mostGenerations_ = static_cast<int>(std::min(1.0e9, 100.0 + 50.0 * (n + 3.0) * (n + 3.0) / std::sqrt(lambda)));
}

void CmaTests::update(const CmaDistribution& distribution, const CmaMargin& margin, std::span<const double> values) {
  ++generation_;
  testSteps(distribution, margin);
  if (!values.empty()) testValues(values);
  if (generation_ >= mostGenerations_) reason_ = "it has made all its generations";
}

void CmaTests::testValues(std::span<const double> values) {
  bests_.push_back(values.front());
  medians_.push_back(values[values.size() / 2]);
  if (bests_.size() >= history_) {
    const auto [least, largest] =
        std::minmax_element(bests_.end() - static_cast<std::ptrdiff_t>(history_), bests_.end());
    if (*least == *largest) {
      reason_ = "the best values of its last generations are equal";
    } else if (std::max(*largest, values.back()) - *least < kLeastDifference * std::abs(*least)) {
      reason_ = "the values of its last generations hardly differ";
    }
  }
  testStagnation();
}

/// Neither the best nor the middle values are better than they were; over the last fifth of the generations, at least
/// 120 + 30 n/λ.
void CmaTests::testStagnation() {
  const std::size_t compared = std::max(bests_.size() / 5, history_ - 10 + kShortestStagnation);
  if (bests_.size() < compared) return;
  const auto hasNotImproved = [compared](std::span<const double> values) {
    const auto window = values.last(compared);
    return medianOf(window.last(kComparedGenerations)) >= medianOf(window.first(kComparedGenerations));
  };
  if (hasNotImproved(bests_) && hasNotImproved(medians_)) reason_ = "its values no longer improve";
}

void CmaTests::testSteps(const CmaDistribution& distribution, const CmaMargin& margin) {
  bool isSmall = true;
  bool isContinuous = false;
  for (std::size_t j = 0; j < distribution.size(); ++j) {
    if (margin.isInteger(j)) continue;
    isContinuous = true;
    const double step = std::max(distribution.deviation(j), distribution.pathLength(j));
    isSmall = isSmall && step < kLeastStep * startSigma_;
  }
  const auto& axes = distribution.axisLengths();
  if (isContinuous && isSmall) {
    reason_ = "its steps have become negligible";
  } else if (distribution.sigma() * *std::max_element(axes.begin(), axes.end()) > kLargestGrowth * startSigma_) {
    reason_ = "its steps have grown without limit";
  } else if (distribution.condition() > kWorstCondition) {
    reason_ = "its steps in different directions differ too much in length";
  } else if (changesNothing(distribution, margin, generation_)) {
    reason_ = "its steps are smaller than the last digits of the parameters";
  }
}

/// NoEffectAxis and NoEffectCoord: a tenth of a deviation along an axis, each axis in its turn, or a fifth of one in
/// any parameter.
bool CmaTests::changesNothing(const CmaDistribution& distribution, const CmaMargin& margin, int generation) {
  const auto& mean = distribution.mean();
  const std::size_t turn = static_cast<std::size_t>(generation) % mean.size();
  const double along = 0.1 * distribution.sigma() * distribution.axisLengths()[turn];
  bool isAxisWithout = true;
  for (std::size_t j = 0; j < mean.size(); ++j) {
    if (mean[j] != mean[j] + along * distribution.widening(j) * distribution.axis(turn)[j]) isAxisWithout = false;
    if (!margin.isInteger(j) && mean[j] == mean[j] + 0.2 * distribution.deviation(j)) return true;
  }
  return isAxisWithout;
}

}  // namespace mirevo
