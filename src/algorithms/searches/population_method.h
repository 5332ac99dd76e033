#pragma once

#include "algorithms/searches/search_method.h"

namespace mirevo {

/// What the searches with a population have in common.
class PopulationMethod : public SearchMethod {
 public:
  bool evaluatesSample(const InitialSampleSettings& sample) const final;
  /// Continues behind a raised budget as if it had been so high from the start.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const final;
};

}  // namespace mirevo
