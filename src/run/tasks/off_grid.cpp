#include "run/tasks/off_grid.h"

#include <fmt/core.h>

#include "common/text.h"
#include "parameters/search_space.h"

namespace mirevo {

std::string offGridText(const ModelParameter& parameter, double value) {
  if (isOnGrid(parameter, value)) return {};
  return fmt::format("is not a whole number of steps above Lower_Bound = {}, {} is taken",
                     formatReal(parameter.lowerBound), formatReal(onGrid(parameter, value)));
}

}  // namespace mirevo
