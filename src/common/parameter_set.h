#pragma once

#include <vector>

namespace mirevo {

/// One value per variable parameter, in setup order, on the transformed (search) scale.
using ParameterSet = std::vector<double>;

}  // namespace mirevo
