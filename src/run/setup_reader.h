#pragma once

#include <string>

#include "run/run_config.h"
#include "run/run_log.h"

namespace mirevo {

/// Reads and validates a setup file, section by section in a fixed order, each validated right after it was read, and
/// echoes every value to the log. Throws FatalError with the fixed texts; its detail holds file, line, column, what was
/// found and what was expected.
RunConfig readSetupFile(const std::string& fileName, RunLog& log);

}  // namespace mirevo
