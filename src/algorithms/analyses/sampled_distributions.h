#pragma once

#include <span>
#include <string>
#include <vector>

#include "algorithms/distributions/parameter_distributions.h"
#include "common/parameter_set.h"
#include "parameters/search_space.h"

namespace mirevo {

/// What the log says of the distributions before the run: which one each parameter has, on the search scale and on the
/// model scale, and which mean centres an integer parameter on a value.
std::vector<std::string> distributionLines(const ParameterDistributions& distributions, const SearchSpace& space);

/// One warning per distribution whose mean, that of a normal distribution, is outside the search bounds, or most of
/// whose values are.
std::vector<std::string> distributionWarnings(const ParameterDistributions& distributions, const SearchSpace& space);

/// How many sets leave the bounds, and with which parameters, as one line. What counts is the value that the model
/// gets.
std::string setsOutsideBounds(std::span<const ParameterSet> sample, const SearchSpace& space);

}  // namespace mirevo
