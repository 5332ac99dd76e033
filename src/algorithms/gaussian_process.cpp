#include "algorithms/gaussian_process.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "algorithms/lapack.h"

namespace mirevo {
namespace {

// Bounds of the hyperparameters: lengths relative to the unit cube of the parameters, noise to the signal's variance.
const double kShortest = std::log(1.0e-4);
const double kLongest = std::log(1.0e2);
const double kLeastNoise = std::log(1.0e-8);
const double kMostNoise = std::log(1.0e-1);
constexpr double kFirstStep = 1.0;
constexpr double kLastStep = 0.25;

}  // namespace

double GaussianProcess::kernel(std::span<const double> a, std::span<const double> b,
                               std::span<const double> lengths) const {
  double squares = 0.0;
  for (std::size_t j = 0; j < a.size(); ++j) {
    const double distance = (a[j] - b[j]) / lengths[j];
    squares += distance * distance;
  }
  return std::exp(-0.5 * squares);
}

double GaussianProcess::solve(const Hyperparameters& parameters) {
  const std::size_t m = points_.size();
  const std::size_t n = parameters.size() - 1;
  lengths_.resize(n);
  for (std::size_t j = 0; j < n; ++j) lengths_[j] = std::exp(parameters[j]);
  const double noise = std::exp(parameters[n]);
  std::vector<double> matrix(m * m, 0.0);
  for (std::size_t column = 0; column < m; ++column) {
    matrix[column * m + column] = 1.0 + noise;
    for (std::size_t row = column + 1; row < m; ++row) {
      matrix[column * m + row] = kernel(points_[row], points_[column], lengths_);
    }
  }
  const int order = static_cast<int>(m);
  if (!choleskyFactor(matrix.data(), order)) return std::numeric_limits<double>::infinity();

  std::vector<double> ones(m, 1.0);  // becomes K⁻¹·1
  choleskySolve(matrix.data(), order, ones.data());
  double sumOfOnes = 0.0;
  double sumOfValues = 0.0;
  for (std::size_t i = 0; i < m; ++i) {
    sumOfOnes += ones[i];
    sumOfValues += ones[i] * values_[i];
  }
  mean_ = sumOfValues / sumOfOnes;
  weights_.resize(m);
  for (std::size_t i = 0; i < m; ++i) weights_[i] = values_[i] - mean_;
  choleskySolve(matrix.data(), order, weights_.data());
  double quadratic = 0.0;
  double logDeterminant = 0.0;
  for (std::size_t i = 0; i < m; ++i) {
    quadratic += (values_[i] - mean_) * weights_[i];
    logDeterminant += 2.0 * std::log(matrix[i * m + i]);
  }
  const double variance = quadratic / static_cast<double>(m);
  if (!(variance > 0.0)) return std::numeric_limits<double>::infinity();
  return static_cast<double>(m) * std::log(variance) + logDeterminant;
}

/// The first fit tries some equal lengths, relative to the spread of each coordinate.
void GaussianProcess::startSearch(std::size_t n, std::span<const double> spread) {
  double best = std::numeric_limits<double>::infinity();
  for (const double multiple : {0.3, 1.0, 3.0, 10.0}) {
    Hyperparameters trial(n + 1, std::log(1.0e-4));
    for (std::size_t j = 0; j < n; ++j) {
      trial[j] = std::clamp(std::log(multiple * std::max(spread[j], 1.0e-12)), kShortest, kLongest);
    }
    const double likelihood = solve(trial);
    if (parameters_.empty() || likelihood < best) {
      best = likelihood;
      parameters_ = trial;
    }
  }
}

void GaussianProcess::search() {
  const std::size_t n = parameters_.size() - 1;
  double best = solve(parameters_);
  double step = kFirstStep;
  while (step >= kLastStep) {
    for (std::size_t k = 0; k <= n; ++k) {
      for (const double move : {step, -step}) {
        Hyperparameters trial = parameters_;
        trial[k] = k < n ? std::clamp(trial[k] + move, kShortest, kLongest)
                         : std::clamp(trial[k] + 2.0 * move, kLeastNoise, kMostNoise);
        const double likelihood = solve(trial);
        if (!(likelihood < best)) continue;
        best = likelihood;
        parameters_ = trial;
        break;
      }
    }
    step /= 2.0;
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
  if (parameters_.size() != n + 1) {
    parameters_.clear();
    startSearch(n, spread);
  }
  search();
  return std::isfinite(solve(parameters_));
}

double GaussianProcess::predict(std::span<const double> point) const {
  double sum = mean_;
  for (std::size_t i = 0; i < points_.size(); ++i) sum += weights_[i] * kernel(point, points_[i], lengths_);
  return sum;
}

}  // namespace mirevo
