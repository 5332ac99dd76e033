#pragma once

#include "common/settings/keyword_row.h"
#include "run/access/setup_schema.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The section MIREVO_SIMULATION_OPTION: the task and the settings of every run.
const SettingSection<RunConfig>& simulationOptionSection();
/// The section SimultaneousSimulations.
const SettingSection<RunConfig>& slotsSection();

/// Every section of a setup with its keywords, in reading order: those of the model, of every task and search, and of
/// the run.
const SetupSchema& setupSchema();

}  // namespace mirevo
