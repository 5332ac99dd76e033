#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/searches/search_algorithm.h"
#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"

namespace mirevo {

/// An evaluated point of a search: n values on the search scale and what the model made of them.
struct Individual {
  ParameterSet set;
  EvaluationResult result;
  int failedMoves = 0;  ///< PSE only: moves of the point's current step that have failed

  double value() const { return result.aggregate; }
};

using Population = std::vector<Individual>;

/// Sorts best first, not-a-number last; individuals of equal value keep their order.
void sortBestFirst(Population& population);

/// Mean over the n parameters of the population standard deviation (divisor m) of each, on the search scale. With
/// n < 1 it is 0 divided by n.
double populationSpread(const Population& population, int parameterCount);

/// Mean over the parameters of (largest − smallest value in the population) / (upper − lower bound). A parameter whose
/// bounds coincide cannot vary and counts as 0.
double normalisedPopulationRange(const Population& population, const SearchBounds& bounds);

/// The smallest box that holds the members.
Box boundingBox(const Population& population);
/// The box of the members with the indices `places` (at least one).
Box boundingBox(const Population& population, std::span<const std::size_t> places);

/// The centroid of the members with the indices `places` (at least one).
std::vector<double> centroid(const Population& population, std::span<const std::size_t> places);

/// g + factor·(u − g): with factor −1 the reflection of u through g, with 1/2 the point half-way between them.
ParameterSet pointOnRay(std::span<const double> g, std::span<const double> u, double factor);

/// How far SCE and PSE reflect a point through the centroid and contract it towards the centroid, for n parameters.
double reflectionFactor(std::size_t n);
double contractionFactor(std::size_t n);

}  // namespace mirevo
