#include "algorithms/searches/search_method.h"

#include <utility>

namespace mirevo {

SearchSummary SearchMethod::run(SearchProblem problem, const PeriodicStep& periodicStep) const {
  const auto search = make(std::move(problem));
  return runSearch(*search, facts().name.name, periodicStep);
}

double evaluationsAfter(const SearchMethod& method, double loops) {
  return static_cast<double>(method.populationSize()) + method.evaluationsPerLoop() * loops;
}

}  // namespace mirevo
