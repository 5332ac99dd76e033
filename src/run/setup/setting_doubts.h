#pragma once

#include <optional>
#include <vector>

#include "run/access/setup_access.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The sections from which a RunConfig was read, for the locations of warnings; of lists one per item.
struct SectionsRead {
  std::vector<SetupSection> batchItems;
  std::vector<SetupSection> parameterFiles;
  std::vector<SetupSection> parameters;
  std::optional<SetupSection> judgement;  ///< ObjectiveFunctions
  std::vector<SetupSection> validationPeriods;
  std::vector<SetupSection> measures;
  std::vector<SetupSection> objectives;
  std::optional<SetupSection> measureFile;  ///< OUTPUT_MEASURE_FILE
  std::vector<SetupSection> furtherMeasureFiles;
  std::optional<SetupSection> slots;  ///< SimultaneousSimulations
};

/// Warns of settings that are valid, each for itself, and of which it is certain that they cannot yield what is wanted
/// or have no effect.
void warnOfDoubtfulSettings(const RunConfig& config, const SectionsRead& sections);

}  // namespace mirevo
