#pragma once

#include <string>
#include <string_view>

#include "run/progress/run_log.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// Reads and validates a setup file, section by section in a fixed order, each validated directly after reading, and
/// echoes every value to the log. Throws FatalError with the fixed texts; its detail holds file, line, column, what was
/// found and what was expected.
RunConfig readSetupFile(const std::string& fileName, RunLog& log);

/// The same from the text of a setup file. `fileName` is used in messages, and file names are relative to its folder;
/// the setup file itself is not accessed. `usesMpiWorkers`: in an MPI job, where the number of simultaneous model runs
/// is that of the workers, whatever the setup says.
RunConfig readSetup(const std::string& fileName, std::string_view text, RunLog& log, bool usesMpiWorkers = false);

/// Throws FatalError, before anything is made beside it, where the setup file cannot be one: its folder is none, it is
/// a folder or device, or ".kdx" was left out. A file that is just not there passes.
void requireSetupFile(const SetupLocation& setup);

/// The text of a setup file. Throws FatalError when it cannot be read.
std::string readSetupText(const std::string& fileName);

}  // namespace mirevo
