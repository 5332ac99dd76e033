#pragma once

#include <span>
#include <string>

namespace mirevo {

/// The program `mirevo-import`, with the arguments of its command line; returns the exit code.
int importProgram(std::span<const std::string> arguments);

}  // namespace mirevo
