#include "algorithms/distributions/parameter_distributions.h"

#include <cassert>
#include <cmath>
#include <utility>

#include "algorithms/numbers/special_functions.h"

namespace mirevo {

ParameterDistributions::ParameterDistributions(std::vector<DistributionPointer> ofParameters,
                                               std::optional<GaussianCopula> copula)
    : ofParameters_(std::move(ofParameters)), copula_(std::move(copula)) {
  assert(!copula_ || copula_->size() == size());
}

ParameterDistributions ParameterDistributions::uniform(const SearchSpace& space) {
  std::vector<DistributionPointer> made;
  for (std::size_t j = 0; j < space.size(); ++j) made.push_back(uniformDistribution(space.lower[j], space.upper[j]));
  return ParameterDistributions(std::move(made));
}

ParameterSet ParameterDistributions::setAt(std::span<const double> point) const {
  assert(point.size() == size());
  ParameterSet set(size());
  std::vector<double> scores;
  if (copula_) scores = copula_->correlated(scoresOf(point, size()));
  for (std::size_t j = 0; j < set.size(); ++j) {
    const bool isCorrelated = copula_ && copula_->isCorrelated(j);
    set[j] = isCorrelated ? ofParameters_[j]->atScore(scores[j]) : ofParameters_[j]->quantile(point[j]);
  }
  return set;
}

double ParameterDistributions::valueAt(std::size_t j, std::span<const double> point) const {
  if (!copula_ || !copula_->isCorrelated(j)) return ofParameters_[j]->quantile(point[j]);
  return ofParameters_[j]->atScore(copula_->correlatedAt(j, scoresOf(point, j)));
}

void ParameterDistributions::move(ParameterSet& set, std::size_t j, std::span<const double> point) const {
  assert(set.size() == size() && point.size() == size());
  if (!copula_ || !copula_->isCorrelated(j)) {
    set[j] = ofParameters_[j]->quantile(point[j]);
    return;
  }
  const std::vector<double> scores = scoresOf(point, size());
  for (const std::size_t k : copula_->correlatedOnes()) {
    if (k >= j) set[k] = ofParameters_[k]->atScore(copula_->correlatedAt(k, scores));
  }
}

std::vector<double> ParameterDistributions::scoresOf(std::span<const double> point, std::size_t last) const {
  std::vector<double> scores(size(), 0.0);
  for (const std::size_t k : copula_->correlatedOnes()) {
    if (k > last) break;
    int fault = 0;
    scores[k] = normalQuantile(point[k], fault);
  }
  return scores;
}

double ParameterDistributions::logDensity(std::span<const double> set) const {
  assert(set.size() == size());
  double sum = 0.0;
  for (std::size_t j = 0; j < size(); ++j) sum += ofParameters_[j]->logDensity(set[j]);
  if (!copula_ || std::isinf(sum)) return sum;
  std::vector<double> scores(size());  // those of independent parameters do not count
  for (std::size_t j = 0; j < size(); ++j) {
    if (!copula_->isCorrelated(j)) continue;
    assert(ofParameters_[j]->isContinuous());
    scores[j] = ofParameters_[j]->scoreOf(set[j]);
  }
  return sum + copula_->logDensity(scores);
}

std::optional<std::size_t> ParameterDistributions::firstWithoutDensity() const {
  for (std::size_t j = 0; j < size(); ++j) {
    if (!ofParameters_[j]->isContinuous()) return j;
  }
  return std::nullopt;
}

}  // namespace mirevo
