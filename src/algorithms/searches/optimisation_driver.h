#pragma once

#include <functional>
#include <limits>
#include <string>
#include <string_view>

#include "algorithms/searches/search_algorithm.h"

namespace mirevo {

/// Receives a line for the log and the progress report after every tenth loop and once more when the search ends.
using PeriodicStep = std::function<void(std::string_view line)>;

/// Drives a search from its initial sample to its end and returns what it found. A step with a status other than 0
/// throws FatalError "Error: Invalid operation in SCE algorithm", with `algorithm` as the name of the search. Also
/// throws FatalError "Error: Unable to allocate memory", and what the evaluator throws. With `evaluationLimit` it ends
/// as soon as that many evaluations are made, even if the search itself would go on.
SearchSummary runSearch(SearchAlgorithm& search, std::string_view algorithm, const PeriodicStep& periodicStep,
                        int evaluationLimit = std::numeric_limits<int>::max());

}  // namespace mirevo
