#pragma once

#include <string_view>

#include "run/command_line.h"

namespace mirevo {

/// The process entry: chooses the front end by the command line and runs the program with it.
[[noreturn]] void processStart(int argc, char** argv);

/// Sets the environment variable of the assignment text ("G48=WIN") and calls the main program.
[[noreturn]] void runWithFrontEnd(std::string_view environmentSetting, const CommandLine& commandLine);

/// The main program: the setup file of the command line is run, and the process ends with the exit code.
[[noreturn]] void mirevoMain(const CommandLine& commandLine);

}  // namespace mirevo
