#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <vector>

#include "algorithms/numbers/least_squares.h"
#include "algorithms/numbers/search_bounds.h"

namespace mirevo {

/// The sum of squared residuals of a linearised model: p parameters at `set`, whose columns are scaled to length 1
/// (Marquardt 1963, doi:10.1137/0111030), so that lambda and the singular values are those of the scaled columns.
class GlmLinearModel final {
 public:
  /// `jacobian`: p columns as long as `residuals`. A column of zeros holds its parameter.
  GlmLinearModel(std::vector<std::vector<double>> jacobian, std::span<const double> residuals,
                 std::span<const double> set, const SearchBounds& bounds, double smallestSingularValue);

  /// The set that minimises the damped sum of squares within the bounds: a parameter whose step would leave them stops
  /// at the bound, and the others are solved for anew. One at a bound whose gradient leads back in is freed again.
  std::vector<double> setFor(double lambda);
  /// A set to which setFor() has led, moved once more to undo what the run there has shown that the linear model lacks:
  /// `lack` is its residuals less those of the linear model. The set itself if the move would be no correction.
  std::vector<double> correctedSet(double lambda, std::span<const double> set,
                                   std::span<const std::vector<double>> jacobian, std::span<const double> lack);
  /// The sum of squares that the linear model has there.
  double sumOfSquaresAt(std::span<const double> set) const;
  /// The largest cosine of the angle between the residuals and a column whose parameter is free to move downhill: 0 at
  /// a minimum.
  double largestCosine() const;

 private:
  double stepTo(std::size_t j, double value) const { return (value - set_[j]) * lengths_[j]; }
  const SingularValues& decomposed(const std::vector<bool>& isFree);
  std::vector<double> stepOf(const std::vector<bool>& isFree, const std::vector<double>& fixed, double lambda);

  std::vector<double> set_;
  SearchBounds bounds_;
  double smallestSingularValue_;
  std::vector<double> lengths_;  ///< of the columns
  TriangularSystem system_;      ///< of the scaled columns, with the negative residuals on the right side
  double sumOfSquares_ = 0.0;
  std::map<std::vector<bool>, SingularValues> decomposed_;  ///< by which parameters are free
};

}  // namespace mirevo
