#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "algorithms/searches/search_method.h"

namespace mirevo {

struct SimplexSettings {
  std::int32_t pointCount = 2;
};

/// Refuses a simplex of more points than the `available` ones of its `source` ("the population"), with that fixed text.
std::optional<SettingRefusal> validateSimplex(const SimplexSettings& simplex, std::int32_t available,
                                              std::string_view source, std::string_view keyword,
                                              std::string_view refusal);

/// What the searches with a population have in common.
class PopulationMethod : public SearchMethod {
 public:
  bool testsPopulationRange() const override { return true; }
  bool evaluatesSample(const InitialSampleSettings& sample) const final;
  /// With a raised budget the search continues as if the budget had been that large from the start.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const override;
};

/// One whose population moves by simplexes.
class SimplexMethod : public PopulationMethod {
 public:
  /// The subcomplex of SCE and the simplex of PSE are one setting.
  SimplexSettings simplex;
};

}  // namespace mirevo
