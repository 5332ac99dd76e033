#include <cstdio>
#include <string>
#include <unistd.h>

#include <fmt/core.h>

#include "common/run_files.h"
#include "common/version.h"
#include "platform/terminal/front_end.h"
#include "viewer/viewer.h"

namespace {

constexpr std::string_view kUsage = "Usage: mirevo-viewer kdx-file\n";

constexpr std::string_view kHelp = R"(
Shows how the run of a setup file is going, or how it ended. It may begin before
the run and in another terminal.

  q   cancels the run, after a question
  d   leaves, as does Ctrl-C; the run goes on

  --version   prints the version, and what the program was built with
  --help, -h  prints how it is called, and what its exit codes mean

Exit codes: 0, however the run goes or has ended, and after an answer; 1 if
there is no such setup and no run of it, or the command line is refused.
)";

/// Whether there is such a setup or a run of it.
bool isKnown(const std::string& argument) {
  const std::string baseName = mirevo::baseNameOfSetup(argument);
  for (const std::string& path :
       {baseName + ".kdx", mirevo::runFilePath(baseName, mirevo::run_files::kMessages), baseName}) {
    if (::access(path.c_str(), F_OK) == 0) return true;
  }
  return false;
}

}  // namespace

int main(int argc, char** argv) {
  const std::string argument = argc == 2 ? argv[1] : "";
  if (argument == "--help" || argument == "-h") return mirevo::writeAnswer(std::string(kUsage).append(kHelp));
  if (argument == "--version") return mirevo::writeAnswer(mirevo::versionText("mirevo-viewer"));
  if (argument.empty() || (argument.starts_with("--") && !isKnown(argument))) {
    if (argc > 2) fmt::print(stderr, "mirevo-viewer: One setup file at a time, and nothing beside a question\n");
    if (!argument.empty()) fmt::print(stderr, "mirevo-viewer: Unknown option {}\n", argument);
    fmt::print(stderr, "{}", kUsage);
    return 1;
  }
  if (!isKnown(argument)) {
    fmt::print(stderr, "mirevo-viewer: {}: there is no such setup and no run of it\n", argument);
    return 1;
  }
  return mirevo::Viewer(argument, nullptr).watch();
}
