#pragma once

#include <string>

#include "parameters/model_parameter.h"

namespace mirevo {

/// What a run makes of a value between the steps of an integer parameter: "is not a whole number of steps above
/// Lower_Bound = 0.5, 2.5 is taken". Empty for any other value.
std::string offGridText(const ModelParameter& parameter, double value);

}  // namespace mirevo
