#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <vector>

#include "algorithms/numbers/least_squares.h"
#include "algorithms/numbers/row_space.h"
#include "algorithms/numbers/search_bounds.h"

namespace mirevo {

/// An inequality linearised at the set of the model: margin + normal·(x - set) >= 0, on the search scale.
struct LinearConstraint {
  std::vector<double> normal;
  double margin = 0.0;
};

/// The sum of squared residuals of a linearised model: p parameters at `set`, whose columns are scaled to length 1
/// (Marquardt 1963, doi:10.1137/0111030), so that lambda and the singular values are those of the scaled columns.
class GlmLinearModel final {
 public:
  /// `jacobian`: p columns as long as `residuals`. A column of zeros holds its parameter.
  GlmLinearModel(std::vector<std::vector<double>> jacobian, std::span<const double> residuals,
                 std::span<const double> set, const SearchBounds& bounds, double smallestSingularValue);

  /// From now on parameters on which no residual depends may move where constraints ask for it, but for those of which
  /// the derivatives are not known.
  void freeUnseen(const std::vector<bool>& isKnown);

  /// The set that minimises the damped sum of squares within the bounds: a parameter whose step would leave them stops
  /// at the bound, and the others are solved for anew. One at a bound whose gradient leads back in is freed again.
  /// It meets `constraints`, as the set of the model does.
  std::vector<double> setFor(double lambda, std::span<const LinearConstraint> constraints = {});
  /// A set to which setFor() has led, moved once more to undo what the run there has shown that the linear model lacks:
  /// `lack` is its residuals less those of the linear model. The set itself if the move would be no correction. It is
  /// made along `constraints`.
  std::vector<double> correctedSet(double lambda, std::span<const double> set,
                                   std::span<const std::vector<double>> jacobian, std::span<const double> lack,
                                   std::span<const LinearConstraint> constraints = {});
  /// The sum of squares that the linear model has there.
  double sumOfSquaresAt(std::span<const double> set) const;
  /// The largest cosine of the angle between the residuals and a column whose parameter is free to move downhill: 0 at
  /// a minimum. `constraints` are those at which the set lies: what they hold does not count.
  double largestCosine(std::span<const LinearConstraint> constraints = {}) const;

 private:
  double stepTo(std::size_t j, double value) const { return (value - set_[j]) * lengths_[j]; }
  struct Obstacle;
  /// The derivative of its margin by the scaled step.
  double slopeOf(const LinearConstraint& constraint, std::size_t j) const {
    return lengths_[j] > 0.0 ? constraint.normal[j] / lengths_[j] : 0.0;
  }
  Obstacle firstObstacle(std::span<const double> from, std::span<const double> to, const std::vector<bool>& isFree,
                         std::span<const LinearConstraint> constraints, const std::vector<bool>& isHeld) const;
  std::vector<double> constrainedSet(double lambda, std::span<const LinearConstraint> constraints);
  const SingularValues& decomposed(const std::vector<bool>& isFree);
  std::vector<double> stepOf(const std::vector<bool>& isFree, const std::vector<double>& fixed, double lambda);
  /// The constraints that are held, in scaled steps of the free parameters beside the fixed ones; without those that
  /// others determine, which are not held any more.
  RowSpace heldRows(const std::vector<bool>& isFree, const std::vector<double>& fixed,
                    std::span<const LinearConstraint> constraints, std::vector<bool>& isHeld) const;
  std::vector<double> stepAlong(const RowSpace& rows, const std::vector<bool>& isFree, const std::vector<double>& fixed,
                                double lambda) const;
  SingularValues decomposedAlong(std::span<const std::vector<double>> directions, const std::vector<bool>& isFree,
                                 std::span<const double> rightSide) const;
  /// Adds to the scaled downhill gradient what the held constraints push back. Returns their multipliers, 0 of others.
  std::vector<double> balance(std::vector<double>& downhill, const std::vector<bool>& isFree,
                              std::span<const LinearConstraint> constraints, const std::vector<bool>& isHeld) const;

  std::vector<double> set_;
  SearchBounds bounds_;
  double smallestSingularValue_;
  std::vector<double> lengths_;  ///< of the columns
  TriangularSystem system_;      ///< of the scaled columns, with the negative residuals on the right side
  double sumOfSquares_ = 0.0;
  std::map<std::vector<bool>, SingularValues> decomposed_;  ///< by which parameters are free
};

}  // namespace mirevo
