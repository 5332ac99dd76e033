#pragma once

#include "run/setup/setting_doubts.h"

namespace mirevo {

/// Refuses files of the setup that cannot be two things at once: a model parameter file that the model or its batch
/// needs as another, and a base folder among what a run of this setup removes or renames. Warns of observed series in
/// files that runs of this setup write.
void checkFileRoles(const RunConfig& config, const SectionsRead& sections);

}  // namespace mirevo
