#pragma once

#include <functional>
#include <vector>

#include "algorithms/searches/optimisation_driver.h"
#include "algorithms/searches/search_algorithm.h"
#include "evaluation/evaluator.h"

namespace mirevo {

/// Runs a search from its start to its end on the evaluator, and passes its lines for the log on.
using SearchRun = std::function<SearchSummary(Evaluator& evaluator, const PeriodicStep& periodicStep)>;

/// Called when the search with this 0-based index has ended.
using SearchEnd = std::function<void(std::size_t search, const SearchSummary& summary)>;

/// Runs several searches at the same time, so that those that propose one set at a time fill as many slots as there are
/// searches. All their sets are submitted to the evaluator in the order in which they are proposed, beside those that
/// are under way, and each result goes to its search in that order. As soon as a search has the results that it waits
/// for it goes on, until it waits again; one search computes at a time. What they do and the numbers of their sets thus
/// depend on the results alone, not on the number of slots or on how long model runs take.
///
/// Each search has a thread of its own, on which it waits; the evaluator, `periodicStep` and `ended` are called from
/// the thread of the caller alone. Throws what any of them or a search throws, when all searches have been unwound and
/// their threads have ended.
void runSideBySide(Evaluator& evaluator, const std::vector<SearchRun>& searches, const PeriodicStep& periodicStep,
                   const SearchEnd& ended);

}  // namespace mirevo
