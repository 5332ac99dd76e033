#include "run/search_factory.h"

#include <utility>

#include <fmt/format.h>

#include "algorithms/dds.h"
#include "common/fatal_error.h"

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

std::unique_ptr<SearchAlgorithm> createSearch(const OptimisationConfig& config, SearchBounds bounds,
                                              Evaluator& evaluator, UniformGenerator& random) {
  if (config.algorithmType == AlgorithmType::dds && config.useSurrogateModel == 0) {
    return std::make_unique<Dds>(config.dds, config.stopping.maxEvaluations,
                                 config.initialSample.includeInitialParameters, std::move(bounds), evaluator, random);
  }
  fatalError(
      fmt::format("Error: The {}{} algorithm is not available in this version",
                  config.useSurrogateModel != 0 ? "surrogate-assisted " : "", searchShortName(config.algorithmType)),
      "Set Algorithm_Type = 2 and Use_Surrogate_Model = 0 for Dynamically Dimensioned Search.");
}

}  // namespace mirevo
