#pragma once

#include <string>
#include <string_view>

#include "run/progress/run_log.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// Reads and validates a setup file, section by section in a fixed order, each validated right after it was read, and
/// echoes every value to the log. Throws FatalError with the fixed texts; its detail holds file, line, column, what was
/// found and what was expected.
RunConfig readSetupFile(const std::string& fileName, RunLog& log);

/// The same from the text of a setup file. `fileName` is what messages show and what names are relative to; files that
/// the setup names are looked up, the setup file itself is not. `usesMpiWorkers`: in an MPI job, where the number of
/// model runs at a time is that of the workers, whatever the setup says.
RunConfig readSetup(const std::string& fileName, std::string_view text, RunLog& log, bool usesMpiWorkers = false);

/// The text of a setup file. Throws FatalError when it cannot be read.
std::string readSetupText(const std::string& fileName);

}  // namespace mirevo
