#pragma once

#include <cstdint>
#include <vector>

namespace mirevo {

/// The distribution of one variable parameter, on the search scale: of a logarithmic parameter that of its logarithm.
struct NormalDistribution {
  double mean = 0.0;
  double standardDeviation = 0.0;
};

struct UncertaintySettings {
  std::int32_t uncertaintyType = 0;            ///< 0 simple random, 1 Latin hypercube sampling
  std::int32_t sampleSize = 0;                 ///< N, at least 2
  std::vector<NormalDistribution> parameters;  ///< one a variable parameter, in setup order
};

struct SensitivitySettings {
  std::int32_t differencing = 0;        ///< 0 forward, 1 central
  std::int32_t perturbationOption = 0;  ///< fraction of 0 the parameter's range, 1 its value
  double perturbationFraction = 0.01;
};

}  // namespace mirevo
