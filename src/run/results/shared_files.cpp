#include "run/results/shared_files.h"

#include <algorithm>
#include <iterator>
#include <map>
#include <set>
#include <utility>

#include <fmt/format.h>

#include "common/file_lock.h"
#include "common/files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "run/results/record_file.h"

namespace mirevo {
namespace {

/// What the name of a setup has more than that of another with which it shares a file.
std::vector<std::string> sharingEndings() {
  std::set<std::string> endings;
  for (const RunFile& shorter : runFilesOfSetup()) {
    for (const RunFile& longer : runFilesOfSetup()) {
      std::string_view ending = shorter.stem;
      const bool isLock = shorter.extension == run_files::kRunLock.extension;  // they keep each other away
      if (isLock || shorter.extension != longer.extension || !ending.ends_with(longer.stem)) continue;
      ending.remove_suffix(longer.stem.size());
      if (!ending.empty()) endings.emplace(ending);
    }
  }
  return {endings.begin(), endings.end()};
}

std::string_view withoutEnding(std::string_view path) {
  constexpr std::string_view kSetupEnding = ".kdx";
  const std::size_t length = path.size() - std::min(path.size(), kSetupEnding.size());
  return equalIgnoringCase(path.substr(length), kSetupEnding) ? path.substr(0, length) : path;
}

}  // namespace

std::vector<std::string> prefixesThatShare(const std::string& prefix) {
  std::vector<std::string> prefixes;
  const std::string_view name = std::string_view(prefix).substr(prefix.rfind('/') + 1);
  for (const std::string& ending : sharingEndings()) {
    prefixes.push_back(prefix + ending);
    if (name.size() > ending.size() && name.ends_with(ending)) {
      prefixes.push_back(prefix.substr(0, prefix.size() - ending.size()));
    }
  }
  return prefixes;
}

std::string runningPrefixThatShares(const std::string& prefix) {
  for (std::string& other : prefixesThatShare(prefix)) {
    if (FileLock::isHeld(runFilePath(other, run_files::kRunLock))) return std::move(other);
  }
  return {};
}

std::string setupNamedIn(std::string_view head) {
  constexpr std::string_view kLabel = "# Setup file: ";
  for (std::string_view line : splitLines(head)) {
    if (takeText(line, kLabel)) return std::string(trimTrailing(line));
    if (!line.starts_with("#")) break;
  }
  return {};
}

bool isSameSetup(std::string_view one, std::string_view other) {
  return withValidUtf8(withoutEnding(fileNameOf(one))) == withValidUtf8(withoutEnding(fileNameOf(other)));
}

void logKept(const std::string& path, const std::string& kept, RunLog& log) {
  if (!kept.empty()) log.line(fmt::format("{} of an earlier run was kept as {}", fileNameOf(path), kept));
}

std::string keepEarlierFile(const std::string& path, RunLog& log) {
  std::string kept = keepEarlierFile(path);
  logKept(path, kept, log);
  return kept;
}

void keepEarlierResults(std::span<const std::string> paths, const std::string& setupFile, RunLog& log) {
  std::map<std::string, std::vector<std::string>> ofOthers;  // by the setup that they name
  std::string setup;  // also of a file without its name, which stands behind the results that it belongs to
  for (const std::string& path : paths) {
    const std::string kept = keepEarlierFile(path, log);
    if (kept.empty()) continue;
    std::string reason;
    const auto head = readFileHead(kept, reason);
    if (!head) {
      log.warning(
          fmt::format("{}, kept from an earlier run: {}. Whether it is of this setup is not known", kept, reason));
      continue;
    }
    if (std::string named = setupNamedIn(*head); !named.empty()) setup = std::move(named);
    if (!setup.empty() && !isSameSetup(setup, setupFile)) ofOthers[setup].push_back(kept);
  }
  for (const auto& [other, kept] : ofOthers) {
    log.warning(
        fmt::format("Results of another setup, {}, had the names of this run's, and were kept as {}. Give one "
                    "of the setups another name",
                    other, fmt::join(kept, ", ")));
  }
}

void keepResultsOfAnother(const std::string& results, std::span<const std::string> paths, const std::string& setupFile,
                          RunLog& log) {
  const auto setupOf = [](const std::string& path) {
    std::string ignored;
    return setupNamedIn(readFileHead(path, ignored).value_or(""));
  };
  const std::string own = setupOf(results);  // as it was called then
  std::vector<std::string> ofAnother;
  std::copy_if(paths.begin(), paths.end(), std::back_inserter(ofAnother), [&](const std::string& path) {
    const std::string setup = setupOf(path);
    return !own.empty() && !setup.empty() && !isSameSetup(setup, own);
  });
  keepEarlierResults(ofAnother, setupFile, log);
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
