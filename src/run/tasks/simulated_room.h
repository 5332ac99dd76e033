#pragma once

#include <cstddef>

#include "run/tasks/task.h"

namespace mirevo {

/// Logs how much room the simulated values of so many sets take in their file where that is much, and warns the user
/// where the disk has less.
void logRoomOfSimulatedValues(const TaskContext& context, const RunFile& file, std::size_t sets,
                              SeriesPrecision precision = SeriesPrecision::single);

}  // namespace mirevo
