#include "algorithms/searches/optimisation_driver.h"

#include <new>
#include <stdexcept>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr int kLoopsBetweenReports = 10;
constexpr std::string_view kNegativeAggregate =
    "Warning: The best objective value is negative. The convergence test divides by the sum of two best values and "
    "will hold as soon as No_Loops_Convergence loops have been made";

void checkStatus(SearchStatus status, std::string_view algorithm) {
  if (status == kSearchOk) return;
  fatalError(fmt::format("Error: Invalid operation in {} algorithm", algorithm), fmt::format("status {}", status));
}

std::string progressLine(const SearchSummary& summary) {
  return fmt::format("Loop {}: {} model evaluations, best objective value {}, population spread {}", summary.loopCount,
                     summary.evaluationCount, formatReal(summary.bestResult.aggregate),
                     formatReal(summary.populationSpread));
}

[[noreturn]] void failForMemory() {
  fatalError("Error: Unable to allocate memory");
}

}  // namespace

SearchSummary runSearch(SearchAlgorithm& search, std::string_view algorithm, const PeriodicStep& periodicStep,
                        int evaluationLimit) {
  try {
    checkStatus(search.initialise(), algorithm);
    if (periodicStep && search.comparesBestValues() && search.summary().bestResult.aggregate < 0.0) {
      periodicStep(kNegativeAggregate);
    }
    while (!search.isTerminated() && search.summary().evaluationCount < evaluationLimit) {
      checkStatus(search.advance(), algorithm);
      const bool isTimeForReport = search.isTerminated() || search.summary().loopCount % kLoopsBetweenReports == 0;
      if (isTimeForReport && periodicStep) periodicStep(progressLine(search.summary()));
    }
    return search.summary();
  } catch (const std::bad_alloc&) {
    failForMemory();
  } catch (const std::length_error&) {  // a container exceeded its maximum size
    failForMemory();
  }
}

}  // namespace mirevo
