#include "run/search_factory.h"

#include <utility>

#include <fmt/format.h>

#include "algorithms/dds.h"
#include "algorithms/initial_sample.h"
#include "algorithms/sce.h"
#include "common/fatal_error.h"

namespace mirevo {

namespace {

[[noreturn]] void notAvailable(std::string_view name) {
  fatalError(fmt::format("Error: The {} algorithm is not available in this version", name));
}

}  // namespace

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

std::unique_ptr<SearchAlgorithm> createSearch(const OptimisationConfig& config, const SearchSpace& space,
                                              Evaluator& evaluator, UniformGenerator& random) {
  if (config.useSurrogateModel != 0 && config.algorithmType != AlgorithmType::dds) {
    notAvailable("surrogate-assisted " + std::string(searchShortName(config.algorithmType)));
  }
  SearchBounds bounds = searchBounds(space);
  if (config.algorithmType == AlgorithmType::dds) {
    return std::make_unique<Dds>(config.dds, config.stopping.maxEvaluations,
                                 config.initialSample.includeInitialParameters, std::move(bounds), evaluator, random);
  }
  SearchProblem problem{std::move(bounds), config.stopping, config.initialSample, {}, evaluator, random};
  if (config.initialSample.generation == static_cast<std::int32_t>(SampleGeneration::fromFile)) {
    problem.givenSample = loadInitialSample(config.initialSample.fileName, space);
  }
  if (config.algorithmType == AlgorithmType::sce) {
    return std::make_unique<Sce>(config.sce, config.simplex, std::move(problem));
  }
  notAvailable(searchShortName(config.algorithmType));
}

}  // namespace mirevo
