#pragma once

#include <cstdio>
#include <string_view>

namespace mirevo::examples {

/// How a program is called, and what it does.
struct ProgramHelp {
  const char* name;
  const char* arguments;
  const char* meaning;
};

/// Answers --help or --version, where that is the only argument, on standard output; false if neither was asked.
inline bool answersQuestion(int argc, char** argv, const ProgramHelp& help) {
  const std::string_view question = argc == 2 ? argv[1] : "";
  if (question == "--version") std::printf("%s %s\n", help.name, MIREVO_EXAMPLES_VERSION);
  if (question == "--help") {
    std::printf("Usage: %s %s\n\n%s\n\nExit codes: 0, or 1 with the reason on standard error.\n", help.name,
                help.arguments, help.meaning);
  }
  return question == "--version" || question == "--help";
}

/// Returns the exit code of a refused command line.
inline int refuseArguments(const ProgramHelp& help) {
  std::fprintf(stderr, "Usage: %s %s\n", help.name, help.arguments);
  return 1;
}

}  // namespace mirevo::examples
