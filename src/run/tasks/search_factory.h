#pragma once

#include <string_view>

#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/optimisation_driver.h"
#include "evaluation/evaluator.h"
#include "parameters/search_space.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// "SCE", "PSE" or "DDS"; empty for any other code.
std::string_view searchShortName(AlgorithmType type);

/// Runs the search that the setup chooses from its start to its end; `evaluator` and `random` are used by it alone
/// meanwhile. Reads the initial sample file where the setup names one. Dynamically Dimensioned Search is never combined
/// with the surrogate model. Throws FatalError and RunCancelled.
SearchSummary runConfiguredSearch(const OptimisationConfig& config, const SearchSpace& space, Evaluator& evaluator,
                                  UniformGenerator& random, const PeriodicStep& periodicStep);

}  // namespace mirevo
