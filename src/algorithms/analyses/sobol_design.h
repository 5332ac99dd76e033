#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "algorithms/distributions/parameter_distributions.h"
#include "algorithms/numbers/uniform_generator.h"
#include "common/parameter_set.h"

namespace mirevo {

/// What is varied as one: a parameter, or a group of them.
struct SobolFactor {
  std::string name;
  std::vector<std::size_t> parameters;  ///< 0-based variable parameters
};

/// "6 parameters", "4 parameters and groups".
std::string factorCountText(std::span<const SobolFactor> factors);

/// The rows of a design are dealt to this many replicates, each with scramblings of its own, so that their results are
/// independent: limits are derived from how much they differ. One net for all rows would be more precise, the more the
/// larger it is, but nothing in it tells by how much (L'Ecuyer and Lemieux 2002, doi:10.1007/0-306-48102-2_20).
inline constexpr std::size_t kSobolReplicates = 16;

/// The sets of a Sobol' analysis of k factors, block by block: row i of the independent matrices A and B, of A with the
/// column of factor j from B for each j, and for interactions of second order of B with the column from A (Saltelli
/// 2002, doi:10.1016/S0010-4655(02)00280-1). Block after block, so that an interrupted run has whole ones.
struct SobolDesign {
  std::size_t rows = 0;  ///< N, the size of the base sample
  std::size_t factors = 0;
  bool hasSecondOrder = false;
  std::size_t nets = kSobolReplicates;  ///< scramblings; fewer of them have no limits

  std::size_t setsPerRow() const { return 2 + (hasSecondOrder ? 2 : 1) * factors; }
  std::size_t setCount() const { return rows * setsPerRow(); }
  /// The 0-based positions of the sets of a row.
  std::size_t ofA(std::size_t row) const { return row * setsPerRow(); }
  std::size_t ofB(std::size_t row) const { return ofA(row) + 1; }
  std::size_t ofAWithB(std::size_t row, std::size_t factor) const { return ofA(row) + 2 + factor; }
  std::size_t ofBWithA(std::size_t row, std::size_t factor) const { return ofA(row) + 2 + factors + factor; }

  /// The pairs of factors, (0, 1), (0, 2) ... (k - 2, k - 1), in the order of their indices of second order.
  std::vector<std::pair<std::size_t, std::size_t>> pairs() const;
};

/// The sets of the design. The columns of A and B are the 2p coordinates of the points of a Sobol' sequence with nested
/// uniform scrambling, which every replicate has anew.
std::vector<ParameterSet> sobolSets(const SobolDesign& design, std::span<const SobolFactor> factors,
                                    const ParameterDistributions& distributions, UniformGenerator& random);

}  // namespace mirevo
