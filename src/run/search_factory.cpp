#include "run/search_factory.h"

#include <utility>

#include "algorithms/dds.h"
#include "algorithms/initial_sample.h"

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

SearchSummary runConfiguredSearch(const OptimisationConfig& config, const SearchSpace& space, Evaluator& evaluator,
                                  UniformGenerator& random, const PeriodicStep& periodicStep) {
  SearchBounds bounds = searchBounds(space);
  if (config.algorithmType == AlgorithmType::dds) {
    Dds search(config.dds, config.stopping.maxEvaluations, config.initialSample.includeInitialParameters,
               std::move(bounds), evaluator, random);
    return runSearch(search, searchShortName(config.algorithmType), {});
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
