#pragma once

#include <span>
#include <string>

namespace mirevo {

/// The program `mirevo-report`: makes the report of a setup's run from its files, whether the run has ended, is going
/// on or was cut off. `arguments` are those after the program's name. Returns the exit code.
int reportProgram(std::span<const std::string> arguments);

}  // namespace mirevo
