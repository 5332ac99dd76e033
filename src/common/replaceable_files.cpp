#include "common/replaceable_files.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <optional>
#include <string_view>
#include <system_error>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kReportHead =
    "<!doctype html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n<meta "
    "http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; script-src";

/// Of a file that a full disk or a kill has cut off before the end of its mark.
bool isPartOfHead(std::string_view text, const RunFile& file) {
  using namespace run_files;
  if (file == kReport) return kReportHead.starts_with(text);
  if (text.empty() || file.mark.starts_with(text)) return true;
  if (file.mark == kPlain.simulatedValues.mark) return file.mark.starts_with(text.substr(1));  // behind the version
  // Before the mark of a table is the line of the title, which may be any.
  if (file.mark != RunFile{}.mark || !text.starts_with("#") || text.size() >= kFileHeadLength) return false;
  const auto lines = splitLines(text);
  return lines.size() == 1 || (lines.size() == 2 && file.mark.starts_with(lines[1]));
}

/// Of any run: a setup that is named after a result of another shares names with it.
bool isOfSomeRun(std::string_view head, const RunFile& file) {
  using namespace run_files;
  if (file == kLog && isTerminationLog(head)) return true;
  const std::array marks{file.mark, RunFile{}.mark, kPlain.restart.mark, kFailuresMark};
  return std::any_of(marks.begin(), marks.end(),
                     [head](std::string_view mark) { return head.find(mark) != head.npos; });
}

/// Whether a run has made the folder.
bool isFolderOfRun(const std::string& path, const RunFile& file, std::string& fault) {
  bool isEmpty = true;
  bool hasNumber = false;
  std::error_code failed;
  std::filesystem::directory_iterator entry(path, failed);
  for (; !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    const std::string name = entry->path().filename().string();
    // A folder that is only renamed may hold what a file manager or file system hides in it.
    isEmpty = isEmpty && file == run_files::kSavedFolder && name.starts_with(".");
    hasNumber = hasNumber || isDigits(name);
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

/// What is neither a file nor a folder, for a message; empty where it is one of them, is nothing or cannot be examined.
std::string kindOf(const std::string& path) {
  std::error_code failed;
  switch (std::filesystem::symlink_status(path, failed).type()) {
    case std::filesystem::file_type::symlink:
      return fmt::format("a symbolic link to {}", std::filesystem::read_symlink(path, failed).string());
    case std::filesystem::file_type::fifo:
      return "a pipe";
    case std::filesystem::file_type::socket:
      return "a socket";
    case std::filesystem::file_type::block:
    case std::filesystem::file_type::character:
      return "a device";
    default:
      return {};
  }
}

std::string unreadable(const std::string& reason) {
  return fmt::format("It cannot be read, and may not be from a run of this program: {}", reason);
}

}  // namespace

bool isTerminationLog(std::string_view text) {
  return text.size() < 200 && (text.ends_with("Successful completion\n") || text.ends_with("Abnormal completion\n"));
}

bool carriesMark(const std::string& path, const RunFile& file) {
  std::string reason;
  return readFileHead(path, reason).value_or(std::string()).find(file.mark) != std::string::npos;
}

std::string whyNotReplaceable(const std::string& path, const RunFile& file) {
  using namespace run_files;
  constexpr std::string_view kOfAnother =
      "It is not from a run of this program, which would rename or remove it. Move it, or give the setup another name.";
  if (const std::string kind = kindOf(path); !kind.empty()) {
    return fmt::format(
        "It is {}; a run writes files and folders of its own. Remove it, or give the setup another name.", kind);
  }
  const bool isFolder = file == kSavedFolder || file == kFailedFolder || file == kProcessFolder;
  std::error_code failed;
  const auto type = std::filesystem::symlink_status(path, failed).type();
  bool isOfRun = true;  // if it cannot be looked at, too: whoever touches it says why
  if (type == std::filesystem::file_type::directory) {
    std::string fault;
    isOfRun = isFolder && isFolderOfRun(path, file, fault);
    if (!fault.empty()) return unreadable(fault);
  } else if (type == std::filesystem::file_type::regular) {
    std::string reason;
    const auto head = readFileHead(path, reason);
    if (!head && reason == std::strerror(ENOENT)) return {};  // another run has just renamed it
    if (!head) return unreadable(reason);
    isOfRun = !isFolder && (isOfSomeRun(*head, file) || isPartOfHead(*head, file));
  }
  return isOfRun ? std::string() : std::string(kOfAnother);
}

void requireReplaceable(const std::string& path, const RunFile& file) {
  const std::string why = whyNotReplaceable(path, file);
  if (!why.empty()) fatalError("Error: The name of a result is taken: " + path, why);
}

}  // namespace mirevo
