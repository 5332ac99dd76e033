#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "parameters/model_parameter.h"

namespace mirevo {

/// The order in which the parameters take their values: a permutation of 1..N in which every dependent parameter stands
/// after those that its equation names. `named[i]` holds the 0-based indices of the parameters that occur in the
/// equation of parameter i, ascending; it is empty for a parameter that is not dependent.
///
/// From the setup order, a dependent parameter that names a later one is moved later, place by place, until it names
/// none; then the scan begins again. Throws FatalError for parameters that depend on each other, on themselves, or in a
/// ring, which is why the scan comes to an end.
std::vector<int> OrderDependentParameters(std::span<const ModelParameter> parameters,
                                          std::span<const std::vector<std::size_t>> named);

}  // namespace mirevo
