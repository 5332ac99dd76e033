#include "evaluation/folder_damage.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/paths.h"
#include "platform/processes/leaving_links.h"

namespace mirevo {
namespace {

/// The type of what is at `path` itself, as in st_mode; 0 where nothing is.
mode_t typeOf(const std::string& path) {
  struct stat status {};
  return ::lstat(path.c_str(), &status) == 0 ? status.st_mode & S_IFMT : 0;
}

/// The system's reason if the program may not do that with `path`, else empty.
std::string faultOfAccess(const std::string& path, int access) {
  return ::access(path.c_str(), access) == 0 ? std::string() : std::strerror(errno);
}

/// Of a file below `folder`, in which files may be made and removed.
std::string faultOfParameterFile(const std::string& folder, const std::string& file) {
  struct statx status {};
  const bool isKnown = ::statx(AT_FDCWD, (folder + file).c_str(), 0, STATX_TYPE, &status) == 0;
  std::string fault = isKnown && S_ISREG(status.stx_mode) ? std::string() : faultOfFile(folder + file);
  // Not even its owner may remove it then, as for each run (`chattr +i`, `chattr +a`).
  if (fault.empty() && isKnown && (status.stx_attributes & (STATX_ATTR_IMMUTABLE | STATX_ATTR_APPEND)) != 0) {
    fault = "it is immutable or append-only";
  }
  const std::string within = folderOf(file);
  return fault.empty() && !within.empty() ? faultOfAccess(folder + within, W_OK | X_OK) : fault;
}

/// A folder that is not there, the model may make in each run.
std::string faultOfOutput(const std::string& folder, const std::string& file) {
  const std::string within = folderOf(file);
  if (!within.empty()) {
    if (typeOf(folder + within) == 0) return {};
    std::string fault = faultOfAccess(folder + within, W_OK | X_OK);
    if (!fault.empty()) return fault;
  }
  return typeOf(folder + file) == S_IFDIR ? std::strerror(EISDIR) : std::string();
}

}  // namespace

std::vector<std::string> FolderNeeds::ownFiles() const {
  std::vector<std::string> files = parameterFiles;
  files.insert(files.end(), outputs.begin(), outputs.end());
  files.insert(files.end(), savedFiles.begin(), savedFiles.end());
  return files;
}

std::optional<FolderDamage> findDamage(const std::string& folder, const FolderNeeds& needs) {
  std::string fault =
      typeOf(folder) == S_IFLNK ? "it was replaced with a link" : faultOfAccess(folder, R_OK | W_OK | X_OK);
  if (!fault.empty()) return FolderDamage{"Unable to work in " + folder, std::move(fault)};
  for (const std::string& file : needs.ownFiles()) {
    // A file that is a link itself is removed before the run, or judged after it.
    if (const auto link = findLeavingLink(folder, folderOf(file))) {
      return FolderDamage{fmt::format("Unable to work with {}{}", folder, file), describe(*link)};
    }
  }
  const auto damageOf = [&folder](std::string_view what, const std::string& file, std::string why) {
    return FolderDamage{fmt::format("{} {}{}", what, folder, file), std::move(why)};
  };
  for (const std::string& file : needs.parameterFiles) {
    std::string why = faultOfParameterFile(folder, file);
    if (!why.empty()) return damageOf("Unable to open", file, std::move(why));
  }
  for (const std::string& file : needs.outputs) {
    std::string why = faultOfOutput(folder, file);
    if (!why.empty()) return damageOf("Unable to remove", file, std::move(why));
  }
  for (const std::string& file : needs.batchFiles) {
    std::string why = faultOfFile(folder + file);
    if (!why.empty()) return damageOf("Unable to open", file, std::move(why));
  }
  return std::nullopt;
}

std::string givenUpWarning(std::string_view who, const FolderDamage& damage) {
  return fmt::format("{} is given up and runs no model any more, as its process folder was damaged{}. {}", who,
                     damage.isFinal ? "" : " again", damage.text());
}

void failWithoutSlots(const FolderDamage& last) {
  fatalError("Error: " + last.what,
             fmt::format(
                 "{}\nno process folder is left: the model damages them, and {}", last.why,
                 last.isFinal ? "the last one could not be made anew" : "has done so again in one that was made anew"));
}

}  // namespace mirevo
