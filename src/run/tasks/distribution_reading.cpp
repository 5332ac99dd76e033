#include "run/tasks/distribution_reading.h"

namespace mirevo {

ParameterDistributions readDistributions(const TaskReading& reading, const SetupSection& /*section*/) {
  return ParameterDistributions::uniform(BuildSearchSpace(reading.parameters));
}

}  // namespace mirevo
