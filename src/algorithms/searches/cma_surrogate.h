#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/searches/cma_distribution.h"
#include "algorithms/surrogate/proposal_selector.h"

namespace mirevo {

/// A surrogate model of the objective function around the mean of CMA-ES. Its coordinates are the axes of the
/// distribution, in units of their lengths: in these the function looks as round as CMA-ES has learnt it to be, however
/// it is scaled and turned, and the nearest points are the likeliest ones. Places are relative to the bounds.
class CmaSurrogate final {
 public:
  CmaSurrogate(const SurrogateSettings& settings, std::size_t n);

  /// Remembers an evaluated place; without a value its run failed. One that is known is dropped.
  void note(const std::vector<double>& place, std::optional<double> value);
  /// Whether that very place has been noted.
  bool isKnown(const std::vector<double>& place) const;
  /// What was noted of a place that is known.
  std::optional<double> valueOf(const std::vector<double>& place) const;
  /// Whether there is a model in this loop, counted from 0.
  bool isActive(int loop) const;
  /// Fits to the successful places that are nearest to the mean; false if nothing can be fitted. What follows is of
  /// this fit, and of the distribution as it was.
  bool fit(const CmaDistribution& distribution);
  /// Empty where the nearest place known has failed.
  std::optional<double> predict(std::span<const double> place) const;

  /// A set that can be run, near some coordinates of the search, and its place as the model takes it; none if it
  /// cannot.
  using PlaceOf = std::function<std::optional<std::vector<double>>(const std::vector<double>& place)>;
  /// Where the lowest value is predicted within the box of the places that are fitted, from `start` on; empty if a run
  /// there would tell nothing, as the place is known to within a thousandth of the box.
  std::optional<std::vector<double>> minimum(std::span<const double> start, const PlaceOf& placeOf) const;

 private:
  std::vector<double> coordinatesOf(std::span<const double> place) const;
  std::vector<double> placeAt(std::span<const double> coordinates) const;

  SurrogateSettings settings_;
  std::size_t n_;
  std::unique_ptr<SurrogateModel> model_;
  std::vector<std::vector<double>> places_;
  std::vector<double> values_;
  std::vector<std::vector<double>> failed_;

  // Of the last fit:
  std::optional<CmaDistribution> distribution_;
  std::vector<std::vector<double>> fitted_;       ///< coordinates of the places fitted
  std::vector<std::vector<double>> failedThere_;  ///< coordinates of failed ones
  Box box_;                                       ///< of the places fitted
};

}  // namespace mirevo
