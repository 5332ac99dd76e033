#pragma once

#include <span>

#include "algorithms/analyses/perturbation_plan.h"
#include "parameters/parameter_fields.h"

namespace mirevo {

/// Takes the width of a difference with respect to parameter j as the model gets it from the fields that change with
/// the parameter, its own and those of dependent parameters: the part of the step that all of them keep. Where they
/// keep different parts, the width remains as it is, with a warning; where none keeps any, the difference has a
/// problem.
void takeWidthAsWritten(const ParameterFields& fields, const SearchSpace& space, std::size_t j,
                        std::span<const ParameterSet> sets, ParameterDifference& difference);

}  // namespace mirevo
