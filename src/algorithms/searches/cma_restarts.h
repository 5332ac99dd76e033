#pragma once

#include <cstddef>
#include <limits>
#include <optional>

#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {

/// One run of CMA-ES from a start point to its end.
struct CmaRun {
  std::size_t population = 0;  ///< λ
  double sigma = 0.0;          ///< at the start, as a fraction of the range of each parameter
  int mostEvaluations = std::numeric_limits<int>::max();
  bool isSmall = false;  ///< of the second regime
};

/// Which run follows which: BIPOP, Hansen (2009), Benchmarking a BI-population CMA-ES on the BBOB-2009 function
/// testbed, doi:10.1145/1570256.1570333. The first regime doubles the population with each run, for functions with many
/// valleys but a common trend. The second has small populations, mostly with small steps, for those without one; its
/// runs are made as long as they have used fewer evaluations than those of the first.
class CmaRestarts final {
 public:
  /// `mostDoublings`: how often the population may be doubled.
  CmaRestarts(std::size_t population, double sigma, int mostDoublings)
      : first_{population, sigma}, large_{first_}, doublingsLeft_(mostDoublings) {}

  const CmaRun& first() const { return first_; }
  /// The run that follows one of so many evaluations; empty when all are made.
  std::optional<CmaRun> next(const CmaRun& ended, int evaluations, UniformGenerator& random);

 private:
  CmaRun first_;
  CmaRun large_;  ///< the latest of the first regime
  int doublingsLeft_;
  bool isFirst_ = true;
  int evaluationsOfLarge_ = 0;  ///< of the latest run of the first regime
  int usedByLarge_ = 0;
  int usedBySmall_ = 0;
};

}  // namespace mirevo
