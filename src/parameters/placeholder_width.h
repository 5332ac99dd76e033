#pragma once

#include <string>

#include "parameters/model_parameter.h"
#include "parameters/value_format.h"

namespace mirevo {

/// The precision that a placeholder of this width costs the values of a parameter, for a warning: "... keeps fewer than
/// four significant digits of ...". Empty when every value tried (the initial value, the bounds and values of every
/// magnitude between them) keeps four significant digits, or all of its digits if it has fewer.
std::string describePrecisionLoss(const ModelParameter& parameter, ValueField field);

}  // namespace mirevo
