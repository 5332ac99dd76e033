#pragma once

#include <memory>
#include <string_view>

#include "algorithms/search_algorithm.h"
#include "algorithms/uniform_generator.h"
#include "evaluation/evaluator.h"
#include "parameters/search_space.h"
#include "run/run_config.h"

namespace mirevo {

/// "SCE", "PSE" or "DDS"; empty for any other code.
std::string_view searchShortName(AlgorithmType type);

/// The search that the setup chooses, ready to be initialised; `evaluator` and `random` must outlive it. Reads the
/// initial sample file where the setup names one. Throws FatalError for a search that this version does not have.
std::unique_ptr<SearchAlgorithm> createSearch(const OptimisationConfig& config, const SearchSpace& space,
                                              Evaluator& evaluator, UniformGenerator& random);

}  // namespace mirevo
