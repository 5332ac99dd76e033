#include <cstdio>
#include <string>
#include <unistd.h>

#include <fmt/core.h>

#include "common/run_files.h"
#include "common/version.h"
#include "viewer/viewer.h"

namespace {

constexpr std::string_view kUsage = "Usage: mirevo-viewer kdx-file\n";

constexpr std::string_view kHelp = R"(
Shows how the run of a setup file is going, or how it ended. It may begin before the run and in another terminal.

  q   cancels the run, after a question
  d   leaves, as does Ctrl-C; the run goes on

  --version   prints the version
  --help      prints this text
)";

}  // namespace

int main(int argc, char** argv) {
  const std::string argument = argc == 2 ? argv[1] : "";
  if (argument == "--help") {
    fmt::print("{}{}", kUsage, kHelp);
    return 0;
  }
  if (argument == "--version") {
    fmt::print("mirevo-viewer {}\n", mirevo::programVersion());
    return 0;
  }
  if (argument.empty()) {
    fmt::print(stderr, "{}", kUsage);
    return 1;
  }
  const std::string baseName = mirevo::baseNameOfSetup(argument);
  bool isKnown = false;
  for (const std::string& path :
       {baseName + ".kdx", mirevo::runFilePath(baseName, mirevo::run_files::kMessages), baseName})
    isKnown = isKnown || ::access(path.c_str(), F_OK) == 0;
  if (!isKnown) {
    fmt::print(stderr, "mirevo-viewer: {}: there is no such setup and no run of it\n", argument);
    return 1;
  }
  return mirevo::Viewer(argument, nullptr).watch();
}
