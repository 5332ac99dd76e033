#include "algorithms/distributions/gaussian_copula.h"

#include <algorithm>
#include <cmath>
#include <numbers>

#include <fmt/format.h>

#include "algorithms/numbers/lapack.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/fatal_error.h"

namespace mirevo {
namespace {

/// Below it the inverse of the matrix, and with it the density, has fewer than half of the digits of a number.
constexpr double kLeastEigenvalue = 1.0e-8;
constexpr double kEigenvalueError = 1.0e-6;  ///< of smallestEigenvalue()

/// The Cholesky factor of R - shift I, column by column; empty if that is not positive definite.
std::vector<double> factorOf(std::span<const std::vector<double>> correlations, double shift) {
  const std::size_t n = correlations.size();
  std::vector<double> matrix(n * n);
  for (std::size_t j = 0; j < n; ++j) {
    for (std::size_t i = 0; i < n; ++i) matrix[j * n + i] = correlations[i][j] - (i == j ? shift : 0.0);
  }
  if (!choleskyFactor(matrix.data(), static_cast<int>(n))) matrix.clear();
  return matrix;
}

/// Those that are furthest from 0, as it is among them that a contradiction is to be sought.
std::string largestText(std::span<const std::vector<double>> correlations, std::span<const std::string> names) {
  std::string text;
  for (const auto& [i, j] : largestEntries(correlations)) {
    if (correlations[i][j] == 0.0) break;
    text += fmt::format("{}{} and {} {:.6g}", text.empty() ? "" : ", ", names[i], names[j], correlations[i][j]);
  }
  return text;
}

[[noreturn]] void refuse(std::span<const std::vector<double>> correlations, std::span<const std::string> names) {
  const double smallest = smallestEigenvalue(correlations);
  const std::string largest = largestText(correlations, names);
  if (smallest < -kEigenvalueError) {
    fatalError("Error: Correlations of the parameters are not positive definite",
               fmt::format("no distribution can have all of them: the smallest eigenvalue of their matrix is {:.4g}, "
                           "expected above 0; the largest are {}\nIt would be positive if all were multiplied by a "
                           "factor below {:.4g}; or correct those that contradict each other",
                           smallest, largest, 1.0 / (1.0 - smallest)));
  }
  fatalError("Error: Correlations of the parameters are not positive definite",
             fmt::format("with them a parameter is a function of others, but for rounding: the smallest eigenvalue of "
                         "their matrix is 0, expected {:g} or more; the largest are {}\nMultiply all by 0.999, or make "
                         "the parameter one with Parameter_Type = 2, whose equation has the others",
                         kLeastEigenvalue, largest));
}

}  // namespace

GaussianCopula::GaussianCopula(std::vector<std::vector<double>> correlations, std::span<const std::string> names)
    : correlations_(std::move(correlations)), isCorrelated_(correlations_.size()) {
  const std::size_t n = size();
  if (factorOf(correlations_, kLeastEigenvalue).empty()) refuse(correlations_, names);
  const std::vector<double> factor = factorOf(correlations_, 0.0);
  for (std::size_t i = 0; i < n; ++i) {
    for (std::size_t j = 0; j <= i; ++j) factor_.push_back(factor[j * n + i]);
    logOfRoot_ += std::log(factor_.back());
    for (std::size_t j = 0; j < n; ++j) isCorrelated_[i] = isCorrelated_[i] || (j != i && correlations_[i][j] != 0.0);
    if (isCorrelated_[i]) correlatedOnes_.push_back(i);
  }
}

std::vector<double> GaussianCopula::correlated(std::span<const double> independent) const {
  std::vector<double> scores(independent.begin(), independent.end());
  for (const std::size_t i : correlatedOnes_) scores[i] = correlatedAt(i, independent);
  return scores;
}

double GaussianCopula::correlatedAt(std::size_t i, std::span<const double> independent) const {
  if (!isCorrelated_[i]) return independent[i];
  const double* row = &factor_[i * (i + 1) / 2];
  double score = 0.0;
  for (const std::size_t j : correlatedOnes_) {
    if (j > i) break;
    score += row[j] * independent[j];
  }
  return score;
}

double GaussianCopula::logDensity(std::span<const double> scores) const {
  std::vector<double> independent(size());  // L^-1 z
  double difference = 0.0;                  // z'(R^-1 - I)z
  for (const std::size_t i : correlatedOnes_) {
    const double* row = &factor_[i * (i + 1) / 2];
    double rest = scores[i];
    for (const std::size_t j : correlatedOnes_) {
      if (j >= i) break;
      rest -= row[j] * independent[j];
    }
    independent[i] = rest / row[i];
    difference += independent[i] * independent[i] - scores[i] * scores[i];
  }
  return -0.5 * difference - logOfRoot_;
}

double smallestEigenvalue(std::span<const std::vector<double>> correlations) {
  double low = -static_cast<double>(correlations.size());  // |r| <= 1
  double high = 1.0;                                       // the mean of the eigenvalues
  while (high - low > 1.0e-7) {
    const double middle = 0.5 * (low + high);
    (factorOf(correlations, middle).empty() ? high : low) = middle;
  }
  return 0.5 * (low + high);
}

double ofRankCorrelation(double rankCorrelation) {
  return 2.0 * std::sin(std::numbers::pi * rankCorrelation / 6.0);
}

double rankCorrelationOf(double correlation) {
  return 6.0 / std::numbers::pi * std::asin(correlation / 2.0);
}

}  // namespace mirevo
