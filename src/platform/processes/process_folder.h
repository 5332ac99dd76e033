#pragma once

#include <string>
#include <string_view>

#include "platform/processes/copy_progress.h"
#include "platform/processes/kept_files.h"

namespace mirevo {

/// The file on which the process folders with that prefix are locked, each by its number (FileLock).
std::string processLockPath(std::string_view processFolderPrefix);
/// What to say when another run, `holder`, has locked one of them.
std::string processFoldersInUse(std::string_view processFolderPrefix, std::string_view holder);

/// Makes `target` a fresh copy of the folder `source`, with a mark (run_files::kFolderMark): an existing `target` is
/// removed, unless it is not a process folder (whyNotReplaceable()); files (sharing blocks with the original if the
/// file system can), folders and links are copied with their modes and times, sockets and devices are not. Both paths
/// are absolute. A link to a target inside `source` leads into the copy, one to a target outside leads there as before.
/// What was copied before a failure is removed.
///
/// What runs have made in `source` is left out (RunMadeEntries): the logs, results and saved files of setups beside the
/// model; the process folders of this run, `processFolderPrefix` followed by a number, and those of other runs,
/// `..._Process<number>` with a batch log in it. Entries that disappear while being copied are skipped.
///
/// Throws FatalError with a line that names the path and the system's reason.
void makeProcessFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix);

/// Throws FatalError if there is something at `target` that is no process folder and must not be replaced.
void requireProcessFolder(const std::string& target);

/// The same for a process folder of this run, whatever a model has made of it. Records what was copied, so that files
/// may remain the next time.
void makeProcessFolderAnew(const FolderListing& listing, const std::string& target, const FolderMaking& making,
                           CopyProgress& progress);

/// The same, but files that are certain to be what a copy would be remain (removeAllButUnchanged()). A folder in which
/// this was interrupted is made anew, or renewed, by the next call.
void renewProcessFolder(const FolderListing& listing, const ListedPaths& paths, const std::string& target,
                        const FolderMaking& making, CopyProgress& progress);

/// Copies the folder `source` in the same way to `target`, where nothing is, and without the mark.
void copyFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix);

}  // namespace mirevo
