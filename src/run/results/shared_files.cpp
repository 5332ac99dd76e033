#include "run/results/shared_files.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include <fmt/core.h>

#include "common/file_lock.h"
#include "common/files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "run/results/record_file.h"

namespace mirevo {
namespace {

constexpr std::string_view kSetupEnding = ".kdx";

/// Whether a setup whose name is longer than another's by `rest` may write its file: `basin_Optimisation.kdx` that of
/// `basin.kdx` named `basin_Optimisation_Run.dat`.
bool mayWrite(std::string_view rest, const RunFile& file) {
  std::string_view ownStem = file.stem;
  return !rest.empty() && takeText(ownStem, rest) && (ownStem.empty() || ownStem.starts_with("_"));
}

/// The names, without the ending, of the setups in the folder of `prefix`.
std::vector<std::string> setupsBeside(const std::string& prefix) {
  std::vector<std::string> names;
  std::error_code failed;
  std::filesystem::directory_iterator entry(std::filesystem::path(prefix).parent_path(), failed);
  for (; !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    std::string name = entry->path().filename().string();
    if (name.size() <= kSetupEnding.size()) continue;
    const std::size_t length = name.size() - kSetupEnding.size();
    if (!equalIgnoringCase(std::string_view(name).substr(length), kSetupEnding)) continue;
    name.resize(length);
    names.push_back(std::move(name));
  }
  std::sort(names.begin(), names.end());
  names.erase(std::unique(names.begin(), names.end()), names.end());  // basin.kdx and basin.KDX
  return names;
}

/// The setup that the first lines of a result name; empty where there is no such line.
std::string_view setupNamedIn(std::string_view head) {
  constexpr std::string_view kLabel = "# Setup file: ";
  for (std::string_view line : splitLines(head)) {
    if (takeText(line, kLabel)) return trimTrailing(line);
    if (!line.starts_with("#")) break;
  }
  return {};
}

}  // namespace

std::vector<std::string> prefixesThatShare(const std::string& prefix, std::span<const RunFile> files) {
  const std::size_t nameStart = prefix.rfind('/') + 1;
  std::vector<std::string> prefixes;
  for (const std::string& name : setupsBeside(prefix)) {
    std::string_view rest = name;
    if (!takeText(rest, std::string_view(prefix).substr(nameStart))) continue;
    if (std::any_of(files.begin(), files.end(), [rest](const RunFile& file) { return mayWrite(rest, file); })) {
      prefixes.push_back(prefix.substr(0, nameStart) + name);
    }
  }
  return prefixes;
}

std::string runningPrefixThatShares(const std::string& prefix) {
  const std::size_t nameStart = prefix.rfind('/') + 1;
  const std::span<const RunFile> files = runFilesOfSetup();
  for (const std::string& name : setupsBeside(prefix)) {
    std::string_view rest = std::string_view(prefix).substr(nameStart);
    if (!takeText(rest, name)) continue;
    const bool shares =
        std::any_of(files.begin(), files.end(), [rest](const RunFile& file) { return mayWrite(rest, file); });
    std::string found = prefix.substr(0, nameStart) + name;
    if (shares && FileLock::isHeld(runFilePath(found, run_files::kRunLock))) return found;
  }
  return {};
}

void logKept(const std::string& path, const std::string& kept, RunLog& log) {
  if (!kept.empty()) log.line(fmt::format("{} of an earlier run was kept as {}", fileNameOf(path), kept));
}

std::string keepEarlierFile(const std::string& path, RunLog& log) {
  std::string kept = keepEarlierFile(path);
  logKept(path, kept, log);
  return kept;
}

std::string keepEarlierResults(const std::string& path, const std::string& setupFile, RunLog& log) {
  std::string kept = keepEarlierFile(path, log);
  if (kept.empty()) return kept;
  std::string reason;
  const auto head = readFileHead(kept, reason);
  const std::string_view earlier = setupNamedIn(head ? *head : std::string_view());
  if (!head) {
    log.warning(
        fmt::format("{}, kept from an earlier run: {}. Whether it is of this setup is not known", kept, reason));
  } else if (!earlier.empty() && fileNameOf(earlier) != withValidUtf8(fileNameOf(setupFile))) {
    log.warning(fmt::format(
        "{} held results of another setup, {}, which shares this name with {}. They were kept as {}. Give one of the "
        "setups another name",
        path, earlier, setupFile, kept));
  }
  return kept;
}

void writeBesideResults(const std::string& path, const std::string& text, RunLog& log) {
  std::string reason;
  if (readTextFile(path, reason) == text) return;
  keepEarlierFile(path, log);
  RecordFile file;
  file.open(path);
  file.append(text);
  file.close();
}

}  // namespace mirevo
