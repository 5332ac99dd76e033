#pragma once

#include <functional>
#include <vector>

#include "algorithms/searches/glm.h"
#include "trials.h"

/// Searches by GLM on functions that are sums of squares.
namespace mirevo::bench {

/// The residuals at a point, as many of each.
using Residuals = std::function<std::vector<double>(const std::vector<double>&)>;

/// One trial like runTrial(), also as to what `setting` says of budgets and targets; `residuals` belong to the
/// function, which need not be the sum of their squares.
Outcome runGlmTrial(const TestFunction& function, const Residuals& residuals, const GlmSettings& settings,
                    const Setting& setting, int seed);

}  // namespace mirevo::bench
