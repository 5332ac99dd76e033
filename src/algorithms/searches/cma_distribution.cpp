#include "algorithms/searches/cma_distribution.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>
#include <utility>

#include "algorithms/numbers/special_functions.h"

namespace mirevo {
namespace {

/// Steps as long as the range of a parameter need not become longer.
constexpr double kWidestSigma = 1.0;

double effectiveMass(std::span<const double> weights) {
  double sum = 0.0;
  double squares = 0.0;
  for (const double w : weights) {
    sum += w;
    squares += w * w;
  }
  return squares > 0.0 ? sum * sum / squares : 0.0;
}

double lengthOfVector(std::span<const double> vector) {
  return std::sqrt(std::inner_product(vector.begin(), vector.end(), vector.begin(), 0.0));
}

double normalDeviate(UniformGenerator& random) {
  int fault = 0;
  return normalQuantile(random.next(), fault);
}

}  // namespace

std::size_t cmaPopulationSize(std::size_t n) {
  return 4 + static_cast<std::size_t>(3.0 * std::log(static_cast<double>(n)));
}

CmaConstants cmaConstants(std::size_t n, std::size_t lambda) {
  CmaConstants made;
  const auto dimension = static_cast<double>(n);
  std::vector<double>& w = made.weights;
  for (std::size_t i = 1; i <= lambda; ++i) {
    w.push_back(std::log(0.5 * (static_cast<double>(lambda) + 1.0)) - std::log(static_cast<double>(i)));
  }
  made.parents = lambda / 2;
  const std::span<double> best = std::span(w).first(made.parents);
  const std::span<double> others = std::span(w).subspan(made.parents);
  const double mu = made.muEff = effectiveMass(best);
  const double muOthers = effectiveMass(others);
  made.cSigma = (mu + 2.0) / (dimension + mu + 5.0);
  made.dSigma = 1.0 + 2.0 * std::max(0.0, std::sqrt((mu - 1.0) / (dimension + 1.0)) - 1.0) + made.cSigma;
  made.cc = (4.0 + mu / dimension) / (dimension + 4.0 + 2.0 * mu / dimension);
  made.c1 = 2.0 / ((dimension + 1.3) * (dimension + 1.3) + mu);
  made.cMu = std::min(1.0 - made.c1, 2.0 * (0.25 + mu + 1.0 / mu - 2.0) / ((dimension + 2.0) * (dimension + 2.0) + mu));

  const double positive = std::accumulate(best.begin(), best.end(), 0.0);
  const double negative = -std::accumulate(others.begin(), others.end(), 0.0);
  const double most = std::min({1.0 + made.c1 / made.cMu, 1.0 + 2.0 * muOthers / (mu + 2.0),
                                (1.0 - made.c1 - made.cMu) / (dimension * made.cMu)});
  for (double& value : best) value /= positive;
  for (double& value : others) value *= negative > 0.0 ? most / negative : 0.0;
  return made;
}

CmaDistribution::CmaDistribution(std::vector<double> mean, double sigma, std::size_t lambda)
    : constants_(cmaConstants(mean.size(), lambda)),
      mean_(std::move(mean)),
      sigma_(sigma),
      covariance_(mean_.size() * mean_.size(), 0.0),
      widening_(mean_.size(), 1.0),
      sigmaPath_(mean_.size(), 0.0),
      path_(mean_.size(), 0.0) {
  for (std::size_t j = 0; j < size(); ++j) covariance_[j * size() + j] = 1.0;
  const auto n = static_cast<double>(size());
  expectedLength_ = std::sqrt(n) * (1.0 - 1.0 / (4.0 * n) + 1.0 / (21.0 * n * n));
  decompose();
}

std::vector<double> CmaDistribution::drawStep(UniformGenerator& random) const {
  std::vector<double> step(size(), 0.0);
  for (std::size_t k = 0; k < size(); ++k) {
    const double along = axisLengths_[k] * normalDeviate(random);
    const std::span<const double> direction = axis(k);
    for (std::size_t j = 0; j < size(); ++j) step[j] += along * direction[j];
  }
  return step;
}

std::vector<double> CmaDistribution::pointOf(std::span<const double> step) const {
  std::vector<double> point(size());
  for (std::size_t j = 0; j < size(); ++j) point[j] = mean_[j] + sigma_ * widening_[j] * step[j];
  return point;
}

std::vector<double> CmaDistribution::stepTo(std::span<const double> point) const {
  std::vector<double> step(size());
  for (std::size_t j = 0; j < size(); ++j) step[j] = (point[j] - mean_[j]) / (sigma_ * widening_[j]);
  return step;
}

std::vector<double> CmaDistribution::whitened(std::span<const double> step) const {
  std::vector<double> along(size());
  for (std::size_t k = 0; k < size(); ++k) {
    const std::span<const double> direction = axis(k);
    along[k] = std::inner_product(step.begin(), step.end(), direction.begin(), 0.0) / axisLengths_[k];
  }
  return along;
}

double CmaDistribution::lengthOf(std::span<const double> step) const {
  return lengthOfVector(whitened(step));
}

void CmaDistribution::limitLength(std::vector<double>& step) const {
  const auto n = static_cast<double>(step.size());
  const double most = std::sqrt(n) + 2.0 * n / (n + 2.0);
  const double length = lengthOf(step);
  if (length <= most) return;
  for (double& value : step) value *= most / length;
}

double CmaDistribution::deviation(std::size_t j) const {
  return sigma_ * widening_[j] * std::sqrt(variance(j));
}

double CmaDistribution::pathLength(std::size_t j) const {
  return sigma_ * std::abs(path_[j]);
}

double CmaDistribution::condition() const {
  const auto [least, largest] = std::minmax_element(eigen_.values.begin(), eigen_.values.end());
  return *least > 0.0 ? *largest / *least : std::numeric_limits<double>::infinity();
}

void CmaDistribution::widen() {
  if (sigma_ >= kWidestSigma) return;
  sigma_ *= std::exp(0.2 + constants_.cSigma / constants_.dSigma);
}

void CmaDistribution::update(std::span<const std::vector<double>* const> ranked) {
  const CmaConstants& c = constants_;
  ++generation_;
  std::vector<double> mean(size(), 0.0);  // y_w
  for (std::size_t i = 0; i < c.parents; ++i) {
    for (std::size_t j = 0; j < size(); ++j) mean[j] += c.weights[i] * (*ranked[i])[j];
  }
  for (std::size_t j = 0; j < size(); ++j) mean_[j] += sigma_ * widening_[j] * mean[j];

  const std::vector<double> along = whitened(mean);
  const double gain = std::sqrt(c.cSigma * (2.0 - c.cSigma) * c.muEff);
  for (double& value : sigmaPath_) value *= 1.0 - c.cSigma;
  for (std::size_t k = 0; k < size(); ++k) {
    const std::span<const double> direction = axis(k);
    for (std::size_t j = 0; j < size(); ++j) sigmaPath_[j] += gain * along[k] * direction[j];
  }
  const double length = lengthOfVector(sigmaPath_);
  const double bias = std::sqrt(1.0 - std::pow(1.0 - c.cSigma, 2.0 * generation_));
  // h_σ: a long p_σ means that σ is still growing, and p_c waits for it.
  const bool isPathMoving = length / bias < (1.4 + 2.0 / (static_cast<double>(size()) + 1.0)) * expectedLength_;
  const double pathGain = isPathMoving ? std::sqrt(c.cc * (2.0 - c.cc) * c.muEff) : 0.0;
  for (std::size_t j = 0; j < size(); ++j) path_[j] = (1.0 - c.cc) * path_[j] + pathGain * mean[j];

  updateCovariance(ranked, isPathMoving);
  sigma_ *= std::exp(std::min(1.0, c.cSigma / c.dSigma * (length / expectedLength_ - 1.0)));
  const double gap = 1.0 / (10.0 * static_cast<double>(size()) * (c.c1 + c.cMu));
  if (generation_ - decomposedAt_ >= gap) decompose();
}

void CmaDistribution::updateCovariance(std::span<const std::vector<double>* const> ranked, bool isPathMoving) {
  const CmaConstants& c = constants_;
  const std::size_t n = size();
  const double sum = std::accumulate(c.weights.begin(), c.weights.end(), 0.0);
  const double lost = isPathMoving ? 0.0 : c.cc * (2.0 - c.cc);
  const double kept = 1.0 + c.c1 * lost - c.c1 - c.cMu * sum;
  for (double& value : covariance_) value *= kept;
  const auto addProduct = [this, n](std::span<const double> y, double weight) {
    for (std::size_t i = 0; i < n; ++i) {
      const double scaled = weight * y[i];
      for (std::size_t j = 0; j <= i; ++j) covariance_[i * n + j] += scaled * y[j];
    }
  };
  addProduct(path_, c.c1);
  for (std::size_t i = 0; i < ranked.size(); ++i) {
    double weight = c.weights[i];
    if (weight < 0.0) {
      // So scaled, negative weights cannot take away more variance than there is.
      const double length = lengthOf(*ranked[i]);
      weight *= static_cast<double>(n) / std::max(length * length, std::numeric_limits<double>::min());
    }
    addProduct(*ranked[i], c.cMu * weight);
  }
  for (std::size_t i = 0; i < n; ++i) {
    for (std::size_t j = 0; j < i; ++j) covariance_[j * n + i] = covariance_[i * n + j];
  }
}

void CmaDistribution::decompose() {
  eigen_ = decomposeSymmetric(covariance_, size());
  decomposedAt_ = generation_;
  axisLengths_.assign(size(), 0.0);
  for (std::size_t k = 0; k < size(); ++k) {
    axisLengths_[k] = std::sqrt(std::max(eigen_.values[k], std::numeric_limits<double>::min()));
  }
}

}  // namespace mirevo
