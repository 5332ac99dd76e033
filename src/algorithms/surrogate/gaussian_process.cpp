#include "algorithms/surrogate/gaussian_process.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "algorithms/numbers/lapack.h"
#include "algorithms/surrogate/quasi_newton.h"

namespace mirevo {
namespace {

// Bounds of the hyperparameters: lengths relative to the unit cube of the parameters, noise relative to the variance of
// the signal.
const double kShortest = std::log(1.0e-4);
const double kLongest = std::log(1.0e2);
const double kLeastNoise = std::log(1.0e-8);
const double kMostNoise = std::log(1.0e-1);
/// For the search for the hyperparameters: moves in their logarithms, gain in −2·log likelihood.
constexpr QuasiNewtonSettings kSearch{1.5, 0.1, 20};

}  // namespace

void GaussianProcess::notePairs() {
  const std::size_t m = points_.size();
  squares_.clear();
  for (std::size_t j = 0; j < points_.front().size(); ++j) {
    for (std::size_t column = 0; column < m; ++column) {
      for (std::size_t row = column + 1; row < m; ++row) {
        const double difference = points_[row][j] - points_[column][j];
        squares_.push_back(difference * difference);
      }
    }
  }
}

double GaussianProcess::deviance(const std::vector<double>& parameters) {
  const std::size_t m = points_.size();
  const std::size_t n = parameters.size() - 1;
  const std::size_t pairs = m * (m - 1) / 2;
  kernels_.assign(pairs, 0.0);
  lengths_.resize(n);
  for (std::size_t j = 0; j < n; ++j) {
    lengths_[j] = std::exp(parameters[j]);
    const double factor = -0.5 / (lengths_[j] * lengths_[j]);
    const double* squares = &squares_[j * pairs];
    for (std::size_t pair = 0; pair < pairs; ++pair) kernels_[pair] += factor * squares[pair];
  }
  for (double& value : kernels_) value = std::exp(value);
  noise_ = std::exp(parameters[n]);
  matrix_.assign(m * m, 0.0);
  std::size_t pair = 0;
  for (std::size_t column = 0; column < m; ++column) {
    matrix_[column * m + column] = 1.0 + noise_;
    for (std::size_t row = column + 1; row < m; ++row) matrix_[column * m + row] = kernels_[pair++];
  }
  const int order = static_cast<int>(m);
  if (!choleskyFactor(matrix_.data(), order)) return std::numeric_limits<double>::infinity();

  std::vector<double> ones(m, 1.0);  // becomes K⁻¹ times a vector of ones
  choleskySolve(matrix_.data(), order, ones.data());
  double sumOfOnes = 0.0;
  double sumOfValues = 0.0;
  for (std::size_t i = 0; i < m; ++i) {
    sumOfOnes += ones[i];
    sumOfValues += ones[i] * values_[i];
  }
  mean_ = sumOfValues / sumOfOnes;
  weights_.resize(m);
  for (std::size_t i = 0; i < m; ++i) weights_[i] = values_[i] - mean_;
  choleskySolve(matrix_.data(), order, weights_.data());
  double quadratic = 0.0;
  double logDeterminant = 0.0;
  for (std::size_t i = 0; i < m; ++i) {
    quadratic += (values_[i] - mean_) * weights_[i];
    logDeterminant += 2.0 * std::log(matrix_[i * m + i]);
  }
  variance_ = quadratic / static_cast<double>(m);
  if (!(variance_ > 0.0)) return std::numeric_limits<double>::infinity();
  return static_cast<double>(m) * std::log(variance_) + logDeterminant;
}

/// Overwrites the factor with the inverse, and the kernels with factors of the derivative; the next deviance() computes
/// both again. With G = K⁻¹ − w·wᵀ/s² and w = K⁻¹(y − mean) the derivative is the sum of the products of the entries of
/// G and of those of K's derivative (Rasmussen and Williams 2006, equation 5.9); mean and s² are at their
/// maximum-likelihood values and contribute nothing.
std::vector<double> GaussianProcess::devianceSlope() {
  const std::size_t m = points_.size();
  const std::size_t n = lengths_.size();
  const std::size_t pairs = kernels_.size();
  choleskyInverse(matrix_.data(), static_cast<int>(m));
  std::vector<double> result(n + 1, 0.0);
  std::size_t pair = 0;
  for (std::size_t column = 0; column < m; ++column) {
    result[n] += noise_ * (matrix_[column * m + column] - weights_[column] * weights_[column] / variance_);
    for (std::size_t row = column + 1; row < m; ++row, ++pair) {
      // The factor 2 accounts for both triangles.
      kernels_[pair] *= 2.0 * (matrix_[column * m + row] - weights_[column] * weights_[row] / variance_);
    }
  }
  for (std::size_t j = 0; j < n; ++j) {
    const double* squares = &squares_[j * pairs];
    double sum = 0.0;
    for (std::size_t k = 0; k < pairs; ++k) sum += kernels_[k] * squares[k];
    result[j] = sum / (lengths_[j] * lengths_[j]);
  }
  return result;
}

/// Starts from the last fit or, if they are more likely, from lengths that are equal relative to the spread of each
/// coordinate: a search that has strayed to where the likelihood is flat must not affect all later ones.
void GaussianProcess::startSearch(std::span<const double> spread) {
  const std::size_t n = spread.size();
  if (parameters_.size() != n + 1) parameters_.clear();
  double best = parameters_.empty() ? std::numeric_limits<double>::infinity() : deviance(parameters_);
  for (const double multiple : {0.3, 1.0, 3.0, 10.0}) {
    std::vector<double> trial(n + 1, std::log(1.0e-4));
    for (std::size_t j = 0; j < n; ++j) {
      trial[j] = std::clamp(std::log(multiple * std::max(spread[j], 1.0e-12)), kShortest, kLongest);
    }
    const double reached = deviance(trial);
    if (parameters_.empty() || reached < best) {
      best = reached;
      parameters_ = trial;
    }
  }
  // The likelihood says nothing about the length of a coordinate that does not vary: predictions must not depend on it.
  for (std::size_t j = 0; j < n; ++j) {
    if (!(spread[j] > 0.0)) parameters_[j] = kLongest;
  }
}

bool GaussianProcess::fit(std::span<const std::vector<double>> points, std::span<const double> values) {
  if (points.size() < 2) return false;
  points_.assign(points.begin(), points.end());
  values_.assign(values.begin(), values.end());
  const std::size_t n = points.front().size();
  std::vector<double> spread(n);
  for (std::size_t j = 0; j < n; ++j) {
    double least = points_.front()[j];
    double most = least;
    for (const auto& point : points_) {
      least = std::min(least, point[j]);
      most = std::max(most, point[j]);
    }
    spread[j] = most - least;
  }
  notePairs();
  startSearch(spread);
  Box bounds{std::vector<double>(n, kShortest), std::vector<double>(n, kLongest)};
  bounds.lower.push_back(kLeastNoise);
  bounds.upper.push_back(kMostNoise);
  const SmoothFunction function{[this](const std::vector<double>& parameters) { return deviance(parameters); },
                                [this] { return devianceSlope(); }};
  const LowPoint found = quasiNewtonSearch(function, parameters_, bounds, kSearch);
  parameters_ = found.point;
  return std::isfinite(found.value);
}

double GaussianProcess::predict(std::span<const double> point) const {
  double sum = mean_;
  for (std::size_t i = 0; i < points_.size(); ++i) {
    double squares = 0.0;
    for (std::size_t j = 0; j < point.size(); ++j) {
      const double distance = (point[j] - points_[i][j]) / lengths_[j];
      squares += distance * distance;
    }
    sum += weights_[i] * std::exp(-0.5 * squares);
  }
  return sum;
}

}  // namespace mirevo
