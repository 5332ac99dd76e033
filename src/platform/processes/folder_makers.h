#pragma once

#include <cstdint>
#include <functional>
#include <span>
#include <string>

#include "platform/processes/kept_files.h"

namespace mirevo {

/// How far the making of process folders is.
struct FoldersMade {
  std::size_t folders = 0;  ///< of all that are made
  double share = 0.0;       ///< of the work, 0 to 1
  double seconds = 0.0;     ///< since the beginning
  std::uint64_t bytes = 0;  ///< in the files of one folder
  std::uint64_t files = 0;  ///< in all folders, done
  std::uint64_t keptFiles = 0;
};

/// Renews the process folders `targets` as copies of the listed folder (renewProcessFolder()). Where there is much to
/// copy, several processes, one a core, each make one folder after the other; they end with the program, however that
/// ends. `look` is called ten times a second and may throw, which ends the copying at once and leaves the folders as
/// they are then. Throws FatalError; folders that are not complete are then removed. Returns what was made.
FoldersMade makeProcessFolders(const FolderListing& listing, std::span<const std::string> targets,
                               const FolderMaking& making, const std::function<void(const FoldersMade&)>& look);

}  // namespace mirevo
