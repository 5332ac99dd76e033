#include "import/import_program.h"

#include <exception>
#include <filesystem>
#include <string>
#include <string_view>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "common/version.h"
#include "import/case_folder.h"
#include "import/ostrich_case.h"
#include "import/pest_case.h"
#include "import/source_files.h"
#include "platform/terminal/front_end.h"

namespace mirevo {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kUsage = "Usage: mirevo-import case.pst|ostIn.txt [folder]";

constexpr std::string_view kHelp = R"(
Makes a setup of a calibration that another program has: of a control file of
PEST or PEST++ (case.pst, version 1 or 2), or of an input file of Ostrich
(ostIn.txt). The folder, which must not exist, is
<case>_mirevo if none is named. It gets

  <case>.kdx         the setup
  <case>_import.txt  what was left out or is expressed in another way, with the
                     lines of the source; it is printed, too
  model              a copy of the source's folder, with the batch file
                     mirevo_run.sh that runs the model command

  --version   prints the version, and what the program was built with
  --help, -h  prints how it is called, and what its exit codes mean

Exit codes: 0 after an import or an answer; 1 if nothing was made: the source
cannot be imported, the folder exists or cannot be written, or the command line
is refused.
)";

/// Whether the first line that is no comment begins as that of a control file. A file with its ending is taken for one,
/// too, so that the refusal says what is wrong with the line.
bool isPestControl(const std::string& path, std::string_view text) {
  if (equalIgnoringCase(fs::path(path).extension().string(), ".pst")) return true;
  for (const std::string_view line : splitLines(text)) {
    const std::string_view content = trim(line);
    if (content.empty() || content.front() == '#') continue;
    return equalIgnoringCase(content.substr(0, 3), "pcf");
  }
  return false;
}

ImportedCase importSource(const std::string& path) {
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text) fatalError("Error: Unable to open " + path, reason);
  const fs::path source = fs::absolute(path).lexically_normal();
  const SourceFiles files(source.parent_path().string());
  const std::string name = source.filename().string();
  ImportedCase imported =
      isPestControl(path, *text) ? importPestControl(name, *text, files) : importOstrichInput(name, *text, files);
  imported.name = source.stem().string();
  checkCase(imported);
  return imported;
}

int importCase(const std::string& path, const std::string& wantedFolder) {
  ImportedCase imported = importSource(path);
  const std::string folder = wantedFolder.empty() ? imported.name + "_mirevo" : wantedFolder;
  writeCaseFolder(imported, folder);
  fmt::print("{}/{}.kdx\n\n{}", folder, imported.name, imported.notes.text());
  return 0;
}

}  // namespace

int importProgram(std::span<const std::string> arguments) {
  const std::string_view first = arguments.empty() ? std::string_view() : std::string_view(arguments.front());
  if (arguments.size() == 1 && (first == "--help" || first == "-h")) {
    return writeAnswer(fmt::format("{}\n{}", kUsage, kHelp));
  }
  if (arguments.size() == 1 && first == "--version") return writeAnswer(versionText("mirevo-import", {}));
  if (first.empty() || first.starts_with("-") || arguments.size() > 2) {
    if (first.starts_with("-")) showMessage("Unknown option " + quotedForMessage(first));
    showMessage(kUsage);
    return 1;
  }
  try {
    return importCase(arguments[0], arguments.size() > 1 ? arguments[1] : std::string());
  } catch (const FatalError& error) {
    showMessage(error.message() + "\n" + error.detail());
  } catch (const std::exception& error) {
    showMessage(std::string("Error: Unexpected failure\n") + error.what());
  }
  return 1;
}

}  // namespace mirevo
