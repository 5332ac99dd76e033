#include "algorithms/searches/population.h"

#include <algorithm>
#include <cmath>
#include <numeric>

namespace mirevo {

void sortBestFirst(Population& population) {
  std::stable_sort(population.begin(), population.end(),
                   [](const Individual& a, const Individual& b) { return isBetter(a.value(), b.value()); });
}

double populationSpread(const Population& population, int parameterCount) {
  const auto m = static_cast<double>(population.size());
  double sum = 0.0;
  for (int j = 0; j < parameterCount; ++j) {
    double sumOfValues = 0.0;
    double sumOfSquares = 0.0;
    for (const Individual& individual : population) {
      const double x = individual.set[static_cast<std::size_t>(j)];
      sumOfValues += x;
      sumOfSquares += x * x;
    }
    const double mean = sumOfValues / m;
    // Rounding can make the variance slightly negative where all points agree.
    sum += std::sqrt(std::max(0.0, sumOfSquares / m - mean * mean));
  }
  return sum / parameterCount;
}

Box boundingBox(const Population& population) {
  std::vector<std::size_t> places(population.size());
  std::iota(places.begin(), places.end(), std::size_t{0});
  return places.empty() ? Box{} : boundingBox(population, places);
}

Box boundingBox(const Population& population, std::span<const std::size_t> places) {
  Box box;
  box.lower = population[places.front()].set;
  box.upper = box.lower;
  for (const std::size_t place : places) {
    const ParameterSet& set = population[place].set;
    for (std::size_t j = 0; j < set.size(); ++j) {
      box.lower[j] = std::min(box.lower[j], set[j]);
      box.upper[j] = std::max(box.upper[j], set[j]);
    }
  }
  return box;
}

double reflectionFactor(std::size_t n) {
  return std::min(1.0, 0.75 + 0.5 / static_cast<double>(n));
}

double contractionFactor(std::size_t n) {
  return 0.45 - 0.1 / static_cast<double>(n);
}

std::vector<double> centroid(const Population& population, std::span<const std::size_t> places) {
  // Summed as differences from one member, so that the centroid is exact where all members agree.
  const ParameterSet& origin = population[places.front()].set;
  const auto count = static_cast<double>(places.size());
  std::vector<double> result(origin.size());
  for (std::size_t j = 0; j < result.size(); ++j) {
    double sum = 0.0;
    for (const std::size_t place : places) sum += population[place].set[j] - origin[j];
    result[j] = origin[j] + sum / count;
  }
  return result;
}

ParameterSet pointOnRay(std::span<const double> g, std::span<const double> u, double factor) {
  ParameterSet point(g.size());
  for (std::size_t j = 0; j < g.size(); ++j) point[j] = g[j] + factor * (u[j] - g[j]);
  return point;
}

double normalisedPopulationRange(const Population& population, const SearchBounds& bounds) {
  const Box box = boundingBox(population);
  double sum = 0.0;
  for (std::size_t j = 0; j < box.lower.size(); ++j) {
    const double width = bounds.upper[j] - bounds.lower[j];
    if (width > 0.0) sum += (box.upper[j] - box.lower[j]) / width;
  }
  return sum / static_cast<double>(static_cast<float>(bounds.size()));
}

}  // namespace mirevo
