#pragma once

#include <string>
#include <string_view>

#include "run/run_config.h"
#include "run/run_log.h"

namespace mirevo {

/// Reads and validates a setup file, section by section in a fixed order, each validated right after it was read, and
/// echoes every value to the log. Throws FatalError with the fixed texts; its detail holds file, line, column, what was
/// found and what was expected.
RunConfig readSetupFile(const std::string& fileName, RunLog& log);

/// The same from the text of a setup file. `fileName` is what messages show and what names are relative to; files that
/// the setup names are looked up, the setup file itself is not.
RunConfig readSetup(const std::string& fileName, std::string_view text, RunLog& log);

}  // namespace mirevo
