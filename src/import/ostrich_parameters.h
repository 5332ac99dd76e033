#pragma once

#include "import/imported_case.h"
#include "import/ostrich_input.h"

namespace mirevo {

/// Adds the parameters of the blocks Params, IntegerParams, ComboParams and TiedParams. Throws FatalError.
void addOstrichParameters(const OstrichInput& input, ImportedCase& imported);

}  // namespace mirevo
