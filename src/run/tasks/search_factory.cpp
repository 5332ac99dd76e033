#include "run/tasks/search_factory.h"

#include <utility>

#include "algorithms/searches/dds.h"
#include "algorithms/searches/initial_sample.h"

namespace mirevo {

std::string_view searchShortName(AlgorithmType type) {
  switch (type) {
    case AlgorithmType::sce:
      return "SCE";
    case AlgorithmType::pse:
      return "PSE";
    case AlgorithmType::dds:
      return "DDS";
  }
  return {};
}

namespace {

/// DDS, behind the searches with smaller budgets that it goes on from: each starts from the best set of the one before.
SearchSummary runDds(const OptimisationConfig& config, SearchBounds bounds, Evaluator& evaluator,
                     UniformGenerator& random) {
  bool startsFromInitial = config.initialSample.includeInitialParameters;
  int made = 0;
  for (const EarlierSearch& earlier : config.earlierSearches) {
    Dds search(config.dds, earlier.maxEvaluations - made, startsFromInitial, bounds, evaluator, random);
    bounds.initial = runSearch(search, searchShortName(AlgorithmType::dds), {}, earlier.lastEvaluation - made).best;
    startsFromInitial = true;
    made = earlier.lastEvaluation;
  }
  Dds search(config.dds, config.stopping.maxEvaluations - made, startsFromInitial, std::move(bounds), evaluator,
             random);
  return runSearch(search, searchShortName(AlgorithmType::dds), {});
}

}  // namespace

SearchSummary runConfiguredSearch(const OptimisationConfig& config, const SearchSpace& space, Evaluator& evaluator,
                                  UniformGenerator& random, const PeriodicStep& periodicStep) {
  SearchBounds bounds = searchBounds(space);
  if (config.algorithmType == AlgorithmType::dds) {
    return runDds(config, std::move(bounds), evaluator, random);
  }
  SearchProblem problem{std::move(bounds), config.stopping, config.initialSample, {}, evaluator, random};
  if (config.initialSample.generation == static_cast<std::int32_t>(SampleGeneration::fromFile)) {
    problem.givenSample = loadInitialSample(config.initialSample.fileName, space);
  }
  PopulationSearchSettings settings;
  settings.algorithm = config.algorithmType == AlgorithmType::sce ? PopulationAlgorithm::sce : PopulationAlgorithm::pse;
  settings.usesSurrogate = config.useSurrogateModel != 0;
  settings.sce = config.sce;
  settings.pse = config.pse;
  settings.simplex = config.simplex;
  settings.surrogate = config.surrogate;
  return runPopulationSearch(settings, std::move(problem), periodicStep);
}

}  // namespace mirevo
