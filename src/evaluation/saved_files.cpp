#include "evaluation/saved_files.h"

#include <array>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/file_copy.h"
#include "common/text.h"
#include "platform/processes/leaving_links.h"

namespace mirevo {
namespace {

/// Modification time that marks a file as older than the run: one second after the epoch, which no model's file has. A
/// comparison with the start time of the run would depend on the clock and its resolution.
constexpr timespec kOldMark{1, 0};

bool isMarked(const struct stat& status) {
  return status.st_mtim.tv_sec == kOldMark.tv_sec && status.st_mtim.tv_nsec == kOldMark.tv_nsec;
}

}  // namespace

SavedFiles::SavedFiles(const std::vector<std::string>& files, const std::string& baseFolder, std::string folder)
    : folder_(std::move(folder)) {
  for (const std::string& file : files) names_.emplace_back(trimTrailing(file).substr(baseFolder.size()));
}

void SavedFiles::markAsOld(const std::string& processFolder) const {
  const std::array<timespec, 2> times{timespec{0, UTIME_OMIT}, kOldMark};
  // A missing file needs no mark. A file that cannot be marked counts as the run's, like one behind a link, which may
  // be outside the process folder.
  for (const std::string& name : names_) {
    ::utimensat(AT_FDCWD, (processFolder + name).c_str(), times.data(), AT_SYMLINK_NOFOLLOW);
  }
}

std::vector<UnkeptFile> SavedFiles::save(const std::string& processFolder, int number, bool isRepeated) const {
  std::vector<UnkeptFile> problems;
  if (names_.empty()) return problems;
  // Files that an interrupted run has kept from this evaluation are not of this model run.
  std::error_code failedToRemove;
  const std::string earlier = fmt::format("{}/{}", folder_, number);
  if (!isRepeated) std::filesystem::remove_all(earlier, failedToRemove);
  const std::string notRemoved =
      failedToRemove ? fmt::format("{} was not removed: {}", earlier, failedToRemove.message()) : std::string();
  for (const std::string& name : names_) {
    const std::string source = processFolder + name;
    const std::string target = fmt::format("{}/{}{}", folder_, number, name);
    std::error_code ignored;
    if (isRepeated && std::filesystem::exists(target, ignored)) continue;
    std::string reason = notRemoved;
    bool isModelsDoing = false;
    struct stat status {};
    if (!reason.empty()) {
      // What is there is not of this run, so that nothing may be added to it.
    } else if (::stat(source.c_str(), &status) != 0) {
      isModelsDoing = errno == ENOENT || errno == ENOTDIR || errno == ELOOP;
      reason = std::strerror(errno);
    } else if (isMarked(status)) {
      isModelsDoing = true;
      reason = "the model run did not write it";
    } else if (const auto link = findLeavingLink(processFolder, name)) {
      isModelsDoing = true;
      reason = describe(*link);
    } else {
      std::error_code failed;
      std::filesystem::create_directories(std::filesystem::path(target).parent_path(), failed);
      if (failed) {
        reason = fmt::format("{}: {}", std::filesystem::path(target).parent_path().string(), failed.message());
      } else if (copyWhole(source, target, reason)) {
        continue;
      }
      isModelsDoing = !S_ISREG(status.st_mode);
    }
    problems.push_back({name, fmt::format("{} was not kept: {}", source, reason), isModelsDoing});
  }
  return problems;
}

std::vector<UnkeptFile> SavedFiles::unkept(std::string_view reason) const {
  std::vector<UnkeptFile> files;
  for (const std::string& name : names_) files.push_back({name, fmt::format("{} was not kept: {}", name, reason)});
  return files;
}

}  // namespace mirevo
