#pragma once

#include <cstdint>
#include <string>

namespace mirevo {

/// When a search stops.
struct StoppingCriteria {
  std::int32_t maxEvaluations = 1000;
  std::int32_t loopsConvergence = 10;  ///< loops over which the best objective value is compared
  double minChange = 0.001;            ///< relative change of the best objective value below which it has converged
};

struct InitialSampleSettings {
  bool includeInitialParameters = true;
  /// 0 uniform random, 1 Latin hypercube, 2 scrambled Sobol, 3 maximin Latin hypercube, 4 read from the file
  std::int32_t generation = 1;
  std::string fileName;  ///< absolute; of generation 4
};

/// Number of points in a simplex: SCE's subcomplex and PSE's simplex are one setting.
struct SimplexSettings {
  std::int32_t pointCount = 2;
};

struct SceSettings {
  std::int32_t complexCount = 2;
  std::int32_t pointsPerComplex = 5;
  std::int32_t evolutionSteps = 5;  ///< per complex and shuffling loop
};

struct PseSettings {
  std::int32_t populationSize = 50;
  double reflectionProbability = 0.7;   ///< of the move that is due, at first a reflection
  double contractionProbability = 0.0;  ///< of a contraction at once; what is left to 1 is that of a mutation at once
};

struct DdsSettings {
  double perturbation = 0.2;  ///< neighbourhood size r, as a fraction of a parameter's range
};

}  // namespace mirevo
