#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "parameters/model_parameter.h"

namespace mirevo {

/// Dependent parameters that cannot be ordered.
struct IllegalRelationship {
  std::size_t parameter = 0;  ///< 0-based index of one of them
  std::string message;
  std::string detail;
};

/// The first parameter that depends on itself, or two on each other, or else a longer cycle; empty if there is none.
/// `named` is that of OrderDependentParameters().
std::optional<IllegalRelationship> findIllegalRelationship(std::span<const ModelParameter> parameters,
                                                           std::span<const std::vector<std::size_t>> named);

/// The order in which the parameters are evaluated: a permutation of 1..N in which every dependent parameter comes
/// after those that its equation names. `named[i]` holds the 0-based indices of the parameters that occur in the
/// equation of parameter i, ascending; it is empty for a parameter that is not dependent.
///
/// Starting from the setup order, a dependent parameter that names a later one is moved back, position by position,
/// until it names none; then the scan starts again. Throws FatalError for a parameter that depends on itself and for
/// cycles, without which the scan always ends.
std::vector<int> OrderDependentParameters(std::span<const ModelParameter> parameters,
                                          std::span<const std::vector<std::size_t>> named);

}  // namespace mirevo
