#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "common/parameter_set.h"
#include "common/settings/keyword_row.h"
#include "parameters/feasibility.h"
#include "parameters/parameter_fields.h"
#include "parameters/search_space.h"

namespace mirevo {

enum class Differencing : std::int32_t { forward = 0, central = 1 };
inline constexpr CodeName kDifferencingNames[] = {{0, "forward"}, {1, "central"}};
/// What the perturbation is a fraction of.
enum class PerturbationOption : std::int32_t { range = 0, value = 1 };
inline constexpr CodeName kPerturbationOptionNames[] = {{0, "range"}, {1, "value"}};

struct SensitivitySettings {
  Differencing differencing = Differencing::forward;
  PerturbationOption perturbationOption = PerturbationOption::range;
  double perturbationFraction = 0.01;
  bool calculatesCovariance = false;
  bool perturbsChoices = false;  ///< also integer parameters of kMostChoices values or fewer
};
/// Up to so many values of an integer parameter are choices rather than a quantity: a step from one to the next is a
/// quarter of the range or more, and no derivative.
inline constexpr int kMostChoices = 5;

/// The section LOCAL_SA.
const SettingSection<SensitivitySettings>& localSensitivitySection();

/// The two parameter sets whose difference gives the derivatives with respect to one parameter.
struct ParameterDifference {
  std::size_t minus = 0;  ///< 0-based among the sets; 0 is the base set
  std::size_t plus = 0;
  double width = 0.0;   ///< value of the parameter in `plus` minus that in `minus`, as written; search scale; 0: none
  double extent = 0.0;  ///< what scales the derivatives: the range or the value, search scale
  std::string problem;  ///< why there are no derivatives; empty when there are some
  /// The two parts of the width of a central difference, below and above the base value.
  double widthBelow = 0.0;
  double widthAbove = 0.0;
  std::vector<std::string> warnings;  ///< what makes them less certain

  bool isCentral() const { return minus != 0 && plus != 0; }
};

/// All parameter sets of an analysis, the base set first, and which differences of their results to take.
struct PerturbationPlan {
  std::vector<ParameterSet> sets;
  std::vector<ParameterDifference> differences;  ///< one per variable parameter
};

/// Perturbs each parameter of `base` by the fraction of its range on the search scale, or of its value on the model
/// scale (a logarithmic parameter x becomes x (1 + fraction)); an integer parameter moves by whole steps, at least one.
/// Where a step would leave the bounds the difference is one-sided, inwards; where neither side has room the step is
/// shortened. The width of a difference is that of the values that a model reads from `fields`; without a field, any
/// value as it is. A side that cannot be run is left out where the other one can. Of a parameter of a few choices there
/// is no set unless the settings ask for it.
PerturbationPlan planPerturbations(const SensitivitySettings& settings, const SearchSpace& space,
                                   std::span<const double> base, const ParameterFields& fields = {},
                                   const Feasibility& feasibility = {});

/// Whether parameter j has room for its whole step from the initial value of the space in at least one direction.
bool hasRoomForStep(const SensitivitySettings& settings, const SearchSpace& space, std::size_t j);

}  // namespace mirevo
