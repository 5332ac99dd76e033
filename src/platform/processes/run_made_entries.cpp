#include "platform/processes/run_made_entries.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <sys/stat.h>
#include <system_error>
#include <utility>

#include "common/files.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kSetupEnding = ".kdx";

/// Whether `text`, the part of a name after that of the setup, is that of a run's file. A killed run may have left it
/// half-written, with kTemporaryEnding at the end.
bool matches(std::string_view text, const RunFile& file) {
  if (text.ends_with(kTemporaryEnding)) {
    text.remove_suffix(kTemporaryEnding.size());
    const std::size_t dot = text.rfind('.');  // that of the report has the number of the process, too
    if (file == run_files::kReport && dot != text.npos && isDigits(text.substr(dot + 1))) text = text.substr(0, dot);
  }
  if (!takeText(text, file.stem) || (file.isNumbered && takeDigits(text).empty())) return false;
  if (text == file.extension) return true;
  return takeText(text, ".") && !takeDigits(text).empty() && text == file.extension;
}

/// Whether the content is that of a run's file, too. A link is followed: a run makes none.
bool isMadeByRun(const std::string& path, const RunFile& file) {
  // An empty file of so plain a name may be the model's.
  if (file.mayBeModels && !path.ends_with(kTemporaryEnding)) {
    std::string reason;
    const auto head = readFileHead(path, reason);
    // What has vanished since the folder was listed is what a run renames, and what comes under its name is new.
    return head ? head->find(file.mark) != std::string::npos : reason == std::strerror(ENOENT);
  }
  std::error_code failed;
  const std::string target = std::filesystem::canonical(path, failed).string();
  return whyNotReplaceable(failed ? path : target, file).empty();
}

/// Whether this is a process folder of a setup in another folder, or the lock on such folders.
bool isProcessFolder(const std::string& path) {
  constexpr std::string_view kMark = run_files::kProcessFolder.stem;
  const auto mark = path.rfind(kMark);
  if (mark == std::string::npos) return false;
  const std::string_view number = std::string_view(path).substr(mark + kMark.size());
  if (number == run_files::kProcessLock.extension) return true;
  const auto holds = [&path](const char* name) {
    struct stat status {};
    return ::stat((path + "/" + name).c_str(), &status) == 0;
  };
  return isDigits(number) && (holds(run_files::kFolderMark) || holds(run_files::kBatchLog));
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
  for (const RunFile& file : {run_files::kFailedRuns, run_files::kFailedRunsLock}) {
    if (!setups_.empty() && matches(name, file) && isMadeByRun(pathOf(name), file)) return true;
  }
  const auto owns = [&](const std::string& setup) { return belongsToRunOf(setup, name); };
  return std::any_of(setups_.begin(), setups_.end(), owns) || isProcessFolder(pathOf(name));
}

bool RunMadeEntries::belongsToRunOf(std::string_view setup, std::string_view name) const {
  std::string_view rest = name;
  if (!takeText(rest, setup)) return false;
  const std::span<const RunFile> files = runFilesOfSetup();
  return std::any_of(files.begin(), files.end(),
                     [&](const RunFile& file) { return matches(rest, file) && isMadeByRun(pathOf(name), file); });
}

std::string RunMadeEntries::pathOf(std::string_view name) const {
  return std::string(folder_).append("/").append(name);
}

}  // namespace mirevo
