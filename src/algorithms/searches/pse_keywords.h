#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "algorithms/searches/population_method.h"
#include "algorithms/searches/search_method.h"

namespace mirevo {

inline constexpr std::string_view kPopulationKeyword = "Population_Size";
inline constexpr std::string_view kSimplexKeyword = "No_Points_Simplex";
inline constexpr std::string_view kContractionKeyword = "Prob_Contraction";

/// The fixed texts with which a search by PseMoves refuses values of its keywords.
struct PseRefusals {
  std::string_view population;
  std::string_view simplex;
  std::string_view reflection;
  std::string_view contraction;
  std::string_view expansion;
  std::string_view sum;  ///< of the two probabilities
};

/// The rows of the keywords that searches by PseMoves have in common. `Method` has the members `settings`, from which
/// PseSettings can be read, and `kRefusals`.
template <class Method>
std::vector<KeywordRow> pseKeywordRows() {
  return {
      setting<Method>([](auto& m) -> auto& { return m.settings.populationSize; },
                      {.name = kPopulationKeyword,
                       .range = from(1),
                       .refusal = Method::kRefusals.population,
                       .meaning = "Points of the population and model runs of a generation."}),
      checked<Method>(
          setting<Method>([](auto& m) -> auto& { return m.simplex.pointCount; },
                          {.name = kSimplexKeyword,
                           .range = from(2),
                           .refusal = Method::kRefusals.simplex,
                           .meaning = "Points in a simplex, at most those of the population. The same setting as SCE's "
                                      "`No_Points_Subcomplex`."}),
          [](const Method& m) {
            return validateSimplex(m.simplex, m.settings.populationSize, "the population", kSimplexKeyword,
                                   Method::kRefusals.simplex);
          }),
      setting<Method>([](auto& m) -> auto& { return m.settings.reflectionProbability; },
                      {.name = "Prob_Reflection",
                       .defaultValue = "0.7",
                       .range = kFraction,
                       .refusal = Method::kRefusals.reflection,
                       .meaning = "Probability of the move that is due: a reflection, after it a contraction."}),
      checked<Method>(
          setting<Method>([](auto& m) -> auto& { return m.settings.contractionProbability; },
                          {.name = kContractionKeyword,
                           .defaultValue = "0",
                           .range = kFraction,
                           .refusal = Method::kRefusals.contraction,
                           .meaning = "Probability of an immediate contraction; the remainder to 1 is the probability "
                                      "of an immediate mutation."}),
          [](const Method& m) -> std::optional<SettingRefusal> {
            const double r = m.settings.reflectionProbability;
            const double c = m.settings.contractionProbability;
            if (r + c <= 1.0) return std::nullopt;
            return SettingRefusal{std::string(Method::kRefusals.sum), kContractionKeyword,
                                  fmt::format("expected at most 1 with Prob_Reflection, found {} + {}", r, c)};
          }),
      setting<Method>([](auto& m) -> auto& { return m.settings.expansionShare; },
                      {.name = "Prob_Expansion",
                       .defaultValue = "0",
                       .range = kFraction,
                       .refusal = Method::kRefusals.expansion,
                       .meaning = "Probability that a reflection goes nearly three times as far; 0.2 keeps the "
                                  "population spread along bent valleys."})};
}

/// Settings that are small for n parameters: a population or a simplex that spans too few directions.
inline std::vector<SearchAdvice> pseAdvice(std::int32_t populationSize, std::int32_t simplexSize, std::size_t n) {
  const auto count = static_cast<std::int64_t>(n);
  return {{kPopulationKeyword, populationSize, 4 * (2 * count + 1)}, {kSimplexKeyword, simplexSize, count + 1}};
}

}  // namespace mirevo
