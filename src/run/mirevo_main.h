#pragma once

#include <string_view>

#include "run/command_line.h"

namespace mirevo {

/// The process entry: chooses the front end according to the command line and runs the program with it.
[[noreturn]] void processStart(int argc, char** argv);

/// Sets an environment variable ("G48=WIN") and calls the main program.
[[noreturn]] void runWithFrontEnd(std::string_view environmentSetting, const CommandLine& commandLine);

/// The main program: runs the setup file of the command line and ends the process with the exit code.
[[noreturn]] void mirevoMain(const CommandLine& commandLine);

}  // namespace mirevo
