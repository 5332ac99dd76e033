#pragma once

#include <string_view>

#include "import/pest_control.h"

namespace mirevo {

/// Parses a line of prior information, `name 1.0 * log(k1) - 2.0 * k2 = 0.5 weight group`. Throws FatalError.
PestPrior parsePestPrior(const SourcePlace& place, std::string_view line);

}  // namespace mirevo
