#include "platform/processes/run_made_entries.h"

#include <algorithm>
#include <array>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include "common/descriptor.h"
#include "common/files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "platform/processes/process_folder.h"

namespace mirevo {
namespace {

constexpr std::string_view kSetupEnding = ".kdx";

/// What follows a setup's name in the name of something that its runs make. What an earlier run made is kept with a
/// number before the extension: `basin_Saved.2`, `basin_Optimisation.1.dat`. A run that was killed may have left one
/// half-written, with kTemporaryEnding behind it.
struct Ending {
  std::string_view stem;
  std::string_view extension;
  bool isNumbered = false;   ///< a number follows the stem
  bool mayBeModels = false;  ///< so plain a name that only the content tells
};

constexpr std::array<Ending, 18> kEndings = {{
    {"", ".log", false, true},
    {"", ".dat", false, true},
    {"", "._spi_"},
    {"", "._kill_"},
    {"_Optimisation", ".dat"},
    {"_Sensitivity", ".dat"},
    {"_Series", ".dat"},
    {"_Restart", ".dat"},
    {"_Optimisation_Restart", ".dat"},
    {"_Sensitivity_Restart", ".dat"},
    {"_Simulated", ".bin"},
    {"_Sensitivity_Simulated", ".bin"},
    {"_Report", ".html"},
    {"_Termination", ".log"},
    {"_Band_", ".csv", true},
    {"_Saved", ""},
    {"_Failed", "", true},
    {"_Process", "", true},
}};
constexpr Ending kFailedRuns{"calSimErr", ".dat"};  ///< stands beside a setup without its name

bool matches(std::string_view text, const Ending& ending) {
  if (text.ends_with(kTemporaryEnding)) text.remove_suffix(kTemporaryEnding.size());
  if (!takeText(text, ending.stem) || (ending.isNumbered && takeDigits(text).empty())) return false;
  if (text == ending.extension) return true;
  return takeText(text, ".") && !takeDigits(text).empty() && text == ending.extension;
}

/// Whether the file names this program in one of its first lines, as every log and result file does.
bool namesThisProgram(const std::string& path) {
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  std::array<char, 1024> head{};
  const ssize_t length = file.get() < 0 ? -1 : ::read(file.get(), head.data(), head.size());
  if (length <= 0) return false;
  const auto lines = splitLines({head.data(), static_cast<std::size_t>(length)});
  return std::any_of(lines.begin(), lines.end(), [](std::string_view line) {
    takeText(line, "# ");
    return line.starts_with("Mirevo ");
  });
}

/// Whether this is a process folder of a setup that lies elsewhere.
bool isProcessFolder(const std::string& path) {
  static constexpr std::string_view kMark = "_Process";
  const auto mark = path.rfind(kMark);
  if (mark == std::string::npos) return false;
  std::string_view number = std::string_view(path).substr(mark + kMark.size());
  struct stat status {};
  return !takeDigits(number).empty() && number.empty() && ::stat((path + "/" + kBatchLogName).c_str(), &status) == 0;
}

}  // namespace

RunMadeEntries::RunMadeEntries(std::string folder, std::span<const std::string> names) : folder_(std::move(folder)) {
  for (const std::string& name : names) {
    if (name.size() <= kSetupEnding.size()) continue;
    const std::size_t stem = name.size() - kSetupEnding.size();
    if (equalIgnoringCase(std::string_view(name).substr(stem), kSetupEnding)) setups_.push_back(name.substr(0, stem));
  }
}

bool RunMadeEntries::contains(std::string_view name) const {
  if (!setups_.empty() && matches(name, kFailedRuns)) return true;
  const auto owns = [&](const std::string& setup) { return belongsToRunOf(setup, name); };
  return std::any_of(setups_.begin(), setups_.end(), owns) || isProcessFolder(folder_ + "/" + std::string(name));
}

bool RunMadeEntries::belongsToRunOf(std::string_view setup, std::string_view name) const {
  std::string_view rest = name;
  if (!takeText(rest, setup)) return false;
  const auto* ending =
      std::find_if(kEndings.begin(), kEndings.end(), [rest](const Ending& each) { return matches(rest, each); });
  if (ending == kEndings.end()) return false;
  return !ending->mayBeModels || namesThisProgram(folder_ + "/" + std::string(name));
}

}  // namespace mirevo
