#include "algorithms/searches/cma_surrogate.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>

#include "algorithms/surrogate/pattern_search.h"

namespace mirevo {
namespace {

/// As a share of the box of the places that are fitted.
constexpr double kSamePlace = 1.0e-3;

double squaredLength(std::span<const double> vector) {
  return std::inner_product(vector.begin(), vector.end(), vector.begin(), 0.0);
}

double squaredDistance(std::span<const double> a, std::span<const double> b) {
  double sum = 0.0;
  for (std::size_t j = 0; j < a.size(); ++j) sum += (a[j] - b[j]) * (a[j] - b[j]);
  return sum;
}

double leastDistance(const std::vector<std::vector<double>>& points, std::span<const double> to) {
  double least = std::numeric_limits<double>::infinity();
  for (const auto& point : points) least = std::min(least, squaredDistance(point, to));
  return least;
}

}  // namespace

CmaSurrogate::CmaSurrogate(const SurrogateSettings& settings, std::size_t n)
    : settings_(settings), n_(n), model_(makeSurrogateModel(settings.modelType)) {}

void CmaSurrogate::note(const std::vector<double>& place, std::optional<double> value) {
  if (isKnown(place)) return;
  if (!value) {
    failed_.push_back(place);
    return;
  }
  places_.push_back(place);
  values_.push_back(*value);
}

bool CmaSurrogate::isKnown(const std::vector<double>& place) const {
  return std::ranges::find(places_, place) != places_.end() || std::ranges::find(failed_, place) != failed_.end();
}

std::optional<double> CmaSurrogate::valueOf(const std::vector<double>& place) const {
  const auto found = std::ranges::find(places_, place);
  if (found == places_.end()) return std::nullopt;
  return values_[static_cast<std::size_t>(found - places_.begin())];
}

bool CmaSurrogate::isActive(int loop) const {
  return mayAskModel(settings_, loop) && places_.size() >= leastSetCount(settings_, n_);
}

/// D⁻¹·Bᵀ·y of the place.
std::vector<double> CmaSurrogate::coordinatesOf(std::span<const double> place) const {
  const std::vector<double> step = distribution_->stepTo(place);
  std::vector<double> along(n_);
  for (std::size_t k = 0; k < n_; ++k) {
    const std::span<const double> axis = distribution_->axis(k);
    along[k] = std::inner_product(step.begin(), step.end(), axis.begin(), 0.0) / distribution_->axisLengths()[k];
  }
  return along;
}

std::vector<double> CmaSurrogate::placeAt(std::span<const double> coordinates) const {
  std::vector<double> step(n_, 0.0);
  for (std::size_t k = 0; k < n_; ++k) {
    const std::span<const double> axis = distribution_->axis(k);
    const double along = coordinates[k] * distribution_->axisLengths()[k];
    for (std::size_t j = 0; j < n_; ++j) step[j] += along * axis[j];
  }
  return distribution_->pointOf(step);
}

bool CmaSurrogate::fit(const CmaDistribution& distribution) {
  distribution_ = distribution;
  std::vector<std::vector<double>> all;
  std::vector<double> distances;
  for (const auto& place : places_) {
    all.push_back(coordinatesOf(place));
    distances.push_back(squaredLength(all.back()));
  }
  std::vector<std::size_t> order(all.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::ranges::stable_sort(order, [&](std::size_t a, std::size_t b) { return distances[a] < distances[b]; });
  order.resize(std::min(order.size(), std::max(neighbourhoodSize(settings_, n_), std::size_t{2})));
  if (order.empty()) return false;
  fitted_.clear();
  std::vector<double> values;
  box_ = {all[order.front()], all[order.front()]};
  for (const std::size_t place : order) {
    for (std::size_t j = 0; j < n_; ++j) {
      box_.lower[j] = std::min(box_.lower[j], all[place][j]);
      box_.upper[j] = std::max(box_.upper[j], all[place][j]);
    }
    fitted_.push_back(std::move(all[place]));
    values.push_back(values_[place]);
  }
  failedThere_.clear();
  for (const auto& place : failed_) failedThere_.push_back(coordinatesOf(place));
  return model_->fit(fitted_, values);
}

std::optional<double> CmaSurrogate::predict(std::span<const double> place) const {
  const std::vector<double> at = coordinatesOf(place);
  if (!failedThere_.empty() && leastDistance(failedThere_, at) < leastDistance(fitted_, at)) return std::nullopt;
  return model_->predict(at);
}

std::optional<std::vector<double>> CmaSurrogate::minimum(std::span<const double> start, const PlaceOf& placeOf) const {
  const auto value = [&](const std::vector<double>& at) {
    const std::optional<std::vector<double>> place = placeOf(placeAt(at));
    const std::optional<double> predicted = place ? predict(*place) : std::nullopt;
    return predicted.value_or(std::numeric_limits<double>::max());
  };
  const std::vector<double> from = coordinatesOf(start);
  Box box = box_;  // which need not have `start` in it
  for (std::size_t j = 0; j < n_; ++j) {
    box.lower[j] = std::min(box.lower[j], from[j]);
    box.upper[j] = std::max(box.upper[j], from[j]);
  }
  const std::vector<double> lowest = patternSearch(value, from, box, std::vector<double>(n_, 0.0));
  std::optional<std::vector<double>> place = placeOf(placeAt(lowest));
  if (!place) return std::nullopt;
  const std::vector<double> at = coordinatesOf(*place);
  const auto isSamePlace = [&](const std::vector<double>& point) {
    for (std::size_t j = 0; j < n_; ++j) {
      if (std::abs(at[j] - point[j]) > kSamePlace * (box_.upper[j] - box_.lower[j])) return false;
    }
    return true;
  };
  if (std::ranges::any_of(fitted_, isSamePlace) || std::ranges::any_of(failedThere_, isSamePlace)) return std::nullopt;
  return place;
}

}  // namespace mirevo
