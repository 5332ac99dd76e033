#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <span>
#include <vector>

#include "algorithms/analyses/sobol_design.h"
#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {

/// An index with the limits of its 95 % interval; NaN where there are too few runs for them.
struct SobolIndex {
  double value = std::numeric_limits<double>::quiet_NaN();
  double lower = std::numeric_limits<double>::quiet_NaN();
  double upper = std::numeric_limits<double>::quiet_NaN();
  std::size_t blocks = 0;  ///< blocks of the design that it is of
};

/// The Sobol' indices of one output: shares of its variance.
struct SobolIndices {
  std::size_t valueCount = 0;  ///< successful runs of A and B, of which mean and variance are
  double mean = std::numeric_limits<double>::quiet_NaN();
  double variance = std::numeric_limits<double>::quiet_NaN();
  bool isConstant = false;  ///< no index: all values are equal
  /// Blocks, at most three, that make nearly all of the variance of all runs; 0 where it takes more. Other points would
  /// then give other indices, and the indices have no limits: those of a bootstrap say how much the blocks at hand
  /// differ, and nothing of the next one of this kind.
  std::size_t dominatingBlocks = 0;
  std::size_t farthestSet = 0;           ///< of the design: its value is the farthest from the mean
  std::vector<SobolIndex> first;         ///< one per factor: of the factor by itself
  std::vector<SobolIndex> total;         ///< with all of its interactions
  std::vector<SobolIndex> interactions;  ///< total less first
  std::vector<SobolIndex> second;        ///< one per SobolDesign::pairs(): of the interaction of the two alone
  SobolIndex sumOfFirst;
  SobolIndex sumOfTotal;
};

/// How often each replicate is in each bootstrap sample; the same for all outputs.
class ReplicateBootstrap final {
 public:
  ReplicateBootstrap(std::size_t samples, UniformGenerator& random);

  std::size_t size() const { return counts_.size(); }
  std::span<const std::uint8_t, kSobolReplicates> counts(std::size_t sample) const { return counts_[sample]; }

 private:
  std::vector<std::array<std::uint8_t, kSobolReplicates>> counts_;
};

/// The indices from an output's values, one per set of the design, NaN for a run that failed. A term of an estimator is
/// left out if one of its runs failed, and no other; as long as failures do not depend on the parameters this biases
/// nothing.
///
/// First-order indices: Saltelli et al. (2010), doi:10.1016/j.cpc.2009.09.018, table 2 (b). Total indices: Jansen
/// (1999), doi:10.1016/S0010-4655(98)00154-4. Second order: Saltelli (2002), with f(A)f(B) of the same blocks as the
/// squared mean. Deviations: outputs are taken from their mean, which leaves the expectations and has far less noise;
/// where B with columns of A was run, each estimator is the mean of the two that A and B give; the variance is that of
/// all successful runs of A and B.
///
/// Limits: quantiles of a bootstrap over the replicates, which are independent while the rows of one are not, taken as
/// far outside as Student's t demands for so few (Hesterberg 2015, doi:10.1080/00031305.2015.1089789). Uses the first
/// `bootstrapSamples` of `bootstrap`, of whose indices about `mostDrawn` are in memory at a time.
SobolIndices sobolIndices(const SobolDesign& design, std::span<const double> values,
                          const ReplicateBootstrap& bootstrap, std::size_t bootstrapSamples, bool withPairs = true,
                          std::size_t mostDrawn = 16'000'000);

}  // namespace mirevo
