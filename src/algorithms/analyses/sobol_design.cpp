#include "algorithms/analyses/sobol_design.h"

#include <algorithm>

#include "algorithms/numbers/owen_sobol.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// `points` with the coordinates of one factor from `others`.
std::vector<double> exchanged(std::span<const double> points, std::span<const double> others,
                              const SobolFactor& factor) {
  std::vector<double> result(points.begin(), points.end());
  for (const std::size_t j : factor.parameters) result[j] = others[j];
  return result;
}

}  // namespace

std::string factorCountText(std::span<const SobolFactor> factors) {
  const bool hasGroup = std::ranges::any_of(factors, [](const SobolFactor& one) { return one.parameters.size() > 1; });
  return countText(factors.size(), hasGroup ? "parameter or group" : "parameter",
                   hasGroup ? "parameters and groups" : "parameters");
}

std::vector<std::pair<std::size_t, std::size_t>> SobolDesign::pairs() const {
  std::vector<std::pair<std::size_t, std::size_t>> all;
  for (std::size_t j = 0; hasSecondOrder && j < factors; ++j) {
    for (std::size_t l = j + 1; l < factors; ++l) all.emplace_back(j, l);
  }
  return all;
}

std::vector<ParameterSet> sobolSets(const SobolDesign& design, std::span<const SobolFactor> factors,
                                    const ParameterDistributions& distributions, UniformGenerator& random) {
  const std::size_t p = distributions.size();
  std::vector<ParameterSet> sets(design.setCount());
  for (std::size_t replicate = 0; replicate < design.nets && replicate < design.rows; ++replicate) {
    const std::size_t count = (design.rows - replicate - 1) / design.nets + 1;
    const UnitPoints points = owenScrambledSobol(count, 2 * p, random);
    for (std::size_t i = 0; i < count; ++i) {
      const std::size_t row = i * design.nets + replicate;
      const std::span<const double> a = std::span(points[i]).first(p);
      const std::span<const double> b = std::span(points[i]).last(p);
      sets[design.ofA(row)] = distributions.setAt(a);
      sets[design.ofB(row)] = distributions.setAt(b);
      for (std::size_t j = 0; j < design.factors; ++j) {
        sets[design.ofAWithB(row, j)] = distributions.setAt(exchanged(a, b, factors[j]));
        if (design.hasSecondOrder) sets[design.ofBWithA(row, j)] = distributions.setAt(exchanged(b, a, factors[j]));
      }
    }
  }
  return sets;
}

}  // namespace mirevo
