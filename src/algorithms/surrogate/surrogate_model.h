#pragma once

#include <span>
#include <vector>

namespace mirevo {

/// A cheap stand-in for the model: predicts the objective value of a point from the values of evaluated ones.
class SurrogateModel {
 public:
  SurrogateModel() = default;
  SurrogateModel(const SurrogateModel&) = delete;
  SurrogateModel& operator=(const SurrogateModel&) = delete;
  virtual ~SurrogateModel() = default;

  /// Fits to points of n coordinates each, of order 1, and their finite values, one per point. False when nothing can
  /// be fitted; predict() must not be called then.
  virtual bool fit(std::span<const std::vector<double>> points, std::span<const double> values) = 0;
  virtual double predict(std::span<const double> point) const = 0;
};

}  // namespace mirevo
