#pragma once

#include "algorithms/searches/search_method.h"

namespace mirevo {

struct SimplexSettings {
  std::int32_t pointCount = 2;
};

/// What the searches with a population have in common.
class PopulationMethod : public SearchMethod {
 public:
  bool evaluatesSample(const InitialSampleSettings& sample) const final;
  /// Continues behind a raised budget as if it had been so high from the start.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const final;

  /// SCE's subcomplex and PSE's simplex are one setting.
  SimplexSettings simplex;
};

}  // namespace mirevo
