#pragma once

#include <cstdint>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/initial_sample.h"
#include "algorithms/searches/stopping_criteria.h"
#include "common/parameter_set.h"
#include "evaluation/evaluator.h"
#include "parameters/feasibility.h"

namespace mirevo {

class ProposalSelector;
struct ResidualProblem;
struct ParetoProblem;

/// A search with a smaller budget, from whose best parameter set, or front, a search with a raised budget continues.
struct EarlierSearch {
  std::int32_t maxEvaluations = 0;  ///< its budget, counted from the first evaluation of the run
  std::int32_t lastEvaluation = 0;  ///< the number of its last evaluation
};

/// What a search works on. The references must outlive the search.
struct SearchProblem {
  SearchBounds bounds;
  StoppingCriteria stopping;
  InitialSampleSettings initialSample;
  std::vector<ParameterSet> givenSample;  ///< search scale; of the initial sample file or of an earlier run
  Evaluator& evaluator;
  UniformGenerator& random;
  ProposalSelector* selector = nullptr;             ///< of a surrogate-assisted search
  std::vector<EarlierSearch> earlierSearches = {};  ///< the searches that this one continues, in order
  Feasibility feasibility = {};                     ///< which sets can be run, of a model with constraints
  ResidualProblem* residuals = nullptr;             ///< of a search by residuals
  ParetoProblem* pareto = nullptr;                  ///< of a search that finds a front
};

}  // namespace mirevo
