#include "report/report_program.h"

#include <exception>
#include <string>
#include <string_view>
#include <unistd.h>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/version.h"
#include "measures/item_names.h"
#include "platform/terminal/front_end.h"
#include "report/library_versions.h"
#include "report/run_report.h"
#include "run/setup/setup_reader.h"

namespace mirevo {
namespace {

constexpr std::string_view kUsage = "Usage: mirevo-report kdx-file";

constexpr std::string_view kHelp = R"(
Writes <setup>_Report.html, a report for the browser, from what the run of the
setup has written so far. The run may go on meanwhile, may have ended in any way
or have been cut off; its files are only read.

  --version   prints the version, and what the program was built with
  --help, -h  prints how it is called, and what its exit codes mean

Exit codes: 0 after a report or an answer; 1 if there is none: the setup is
refused, no run of it has written anything, the file cannot be written, or the
command line is refused.
)";

int makeReport(const std::string& setupFileName) {
  RunLog unread;  // the run's own log is not touched
  RunConfig config = readSetupFile(setupFileName, unread);
  config.measures = withItemNumbers(config.measures, UnknownItems::left);
  const std::string filePrefix = config.setupFolder + "/" + config.setupName;
  std::string reason;
  // The run may be making its report, and others this one.
  const std::string temporaryEnding = fmt::format(".{}{}", ::getpid(), kTemporaryEnding);
  if (!writeReport(config, filePrefix, reason, temporaryEnding)) {
    showMessage("Error: Unable to write the report of " + setupFileName + "\n" + reason);
    return 1;
  }
  fmt::print("{}\n", runFilePath(filePrefix, run_files::kReport));
  return 0;
}

}  // namespace

int reportProgram(std::span<const std::string> arguments) {
  const std::string_view argument = arguments.size() == 1 ? std::string_view(arguments.front()) : std::string_view();
  if (argument == "--help" || argument == "-h") return writeAnswer(fmt::format("{}\n{}", kUsage, kHelp));
  if (argument == "--version") return writeAnswer(versionText("mirevo-report", libraryVersions()));
  if (argument.empty() || argument.starts_with("--")) {
    if (arguments.size() > 1) showMessage("One setup file at a time, and nothing beside a question");
    if (!argument.empty()) showMessage("Unknown option " + quotedForMessage(argument));
    showMessage(kUsage);
    return 1;
  }
  try {
    return makeReport(arguments.front());
  } catch (const FatalError& error) {
    showMessage(error.message() + "\n" + error.detail());
  } catch (const std::exception& error) {
    showMessage(std::string("Error: Unexpected failure\n") + error.what());
  }
  return 1;
}

}  // namespace mirevo
