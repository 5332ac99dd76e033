#pragma once

#include "run/setup_access.h"

namespace mirevo {

/// Warns in the log about everything in the setup file that no reader will ever look at: unknown sections and keywords,
/// with the nearest known name, and repeated ones of which only the first counts.
void warnAboutUnusedEntries(SetupFile& file);

}  // namespace mirevo
