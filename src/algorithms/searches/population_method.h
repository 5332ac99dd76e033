#pragma once

#include "algorithms/searches/search_method.h"

namespace mirevo {

/// What the searches with a population have in common.
class PopulationMethod : public SearchMethod {
 public:
  bool evaluatesSample(const InitialSampleSettings& sample) const final;
  /// With a raised budget the search continues as if the budget had been that large from the start.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const final;
};

}  // namespace mirevo
