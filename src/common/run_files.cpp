#include "common/run_files.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <optional>
#include <system_error>
#include <unistd.h>
#include <vector>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/fatal_error.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

std::vector<RunFile> filesOfSetup() {
  using namespace run_files;
  std::vector<RunFile> files{kLog,     kTerminationLog, kMessages,     kKill,         kSeries,
                             kReport,  kBand,           kSavedFolder,  kFailedFolder, kProcessFolder,
                             kRunLock, kProcessLock,    kOwnFailedRuns};
  for (const ResultFileNames& names : {kPlain, kSensitivity, kOptimisation}) {
    files.insert(files.end(),
                 {names.results, names.restart, names.simulatedValues, names.record, names.failures, names.pairs});
    files.insert(files.end(), names.tables.begin(), names.tables.end());
  }
  return files;
}

constexpr std::size_t kHeadLength = 16384;  // room for a long title before the mark

/// The beginning of the file; empty, with the system's error, where it cannot be read.
std::optional<std::string> headOf(const std::string& path, int& error) {
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  std::string head(kHeadLength, '\0');
  const ssize_t length = file.get() < 0 ? -1 : ::read(file.get(), head.data(), head.size());
  error = errno;
  if (length < 0) return std::nullopt;
  head.resize(static_cast<std::size_t>(length));
  return head;
}

/// Of a text that a full disk or a kill has cut off before the mark.
bool isPartOfHead(std::string_view text) {
  const auto lines = splitLines(text);
  return text.size() < kHeadLength &&
         std::all_of(lines.begin(), lines.end(), [](std::string_view line) { return line.starts_with("#"); });
}

bool isNumber(std::string_view name) {
  return !takeDigits(name).empty() && name.empty();
}

/// Whether a run has made the folder.
bool isFolderOfRun(const std::string& path, const RunFile& file, std::string& fault) {
  bool isEmpty = true;
  bool hasNumber = false;
  std::error_code failed;
  std::filesystem::directory_iterator entry(path, failed);
  for (; !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    const std::string name = entry->path().filename().string();
    isEmpty = isEmpty && name.starts_with(".");  // a hidden file is that of a file manager or file system
    hasNumber = hasNumber || isNumber(name);
  }
  if (failed) fault = failed.message();
  if (failed || isEmpty) return isEmpty;
  if (file == run_files::kSavedFolder) return hasNumber;
  for (const char* mark : {run_files::kFolderMark, run_files::kBatchLog}) {  // the log alone in older versions
    const std::string found = fmt::format("{}/{}", path, mark);
    if (std::filesystem::exists(found, failed)) return true;
    if (failed) fault = fmt::format("{}: {}", found, failed.message());
  }
  return false;
}

std::string unreadable(const std::string& reason) {
  return fmt::format("It cannot be read, and may not be from a run of this program: {}", reason);
}

}  // namespace

std::span<const RunFile> runFilesOfSetup() {
  static const std::vector<RunFile> kFiles = filesOfSetup();
  return kFiles;
}

std::string runFilePath(std::string_view prefix, const RunFile& file) {
  std::string path(prefix);
  path += file.stem;
  if (!file.isNumbered) path += file.extension;
  return path;
}

std::string runFilePath(std::string_view prefix, const RunFile& file, int number) {
  return std::string(prefix).append(file.stem).append(std::to_string(number)).append(file.extension);
}

std::string pathBeside(std::string_view prefix, const RunFile& file) {
  return runFilePath(prefix.substr(0, prefix.rfind('/') + 1), file);
}

bool carriesMark(const std::string& path, const RunFile& file) {
  int error = 0;
  return headOf(path, error).value_or(std::string()).find(file.mark) != std::string::npos;
}

std::string whyNotReplaceable(const std::string& path, const RunFile& file) {
  using namespace run_files;
  constexpr std::string_view kOfAnother =
      "It is not from a run of this program, which would rename or remove it. Move it, or give the setup another name.";
  const bool isFolder = file == kSavedFolder || file == kFailedFolder || file == kProcessFolder;
  std::error_code failed;
  const auto type = std::filesystem::symlink_status(path, failed).type();
  bool isOfRun = true;  // if it cannot be looked at, too: whoever touches it says why
  if (type == std::filesystem::file_type::directory) {
    std::string fault;
    isOfRun = isFolder && isFolderOfRun(path, file, fault);
    if (!fault.empty()) return unreadable(fault);
  } else if (type == std::filesystem::file_type::regular) {
    int error = 0;
    const auto head = headOf(path, error);
    if (!head) return unreadable(std::strerror(error));
    isOfRun = !isFolder && (head->find(file.mark) != std::string::npos || isPartOfHead(*head));
  }
  return isOfRun ? std::string() : std::string(kOfAnother);
}

void requireReplaceable(const std::string& path, const RunFile& file) {
  const std::string why = whyNotReplaceable(path, file);
  if (!why.empty()) fatalError("Error: The name of a result is taken: " + path, why);
}

std::string fileNameOf(std::string_view path) {
  return std::string(path.substr(path.rfind('/') + 1));
}

}  // namespace mirevo
