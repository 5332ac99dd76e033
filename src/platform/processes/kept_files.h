#pragma once

#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>

#include "platform/processes/folder_listing.h"

namespace mirevo {

/// A listing by path.
using ListedPaths = std::unordered_map<std::string_view, const FolderListing::Entry*>;
ListedPaths pathsOf(const FolderListing& listing);

/// How process folders are made of a listing.
struct FolderMaking {
  std::span<const std::string> ownFiles = {};  ///< below the folder with their leading "/": what model runs write
  bool linksReadOnlyFiles = false;             ///< hard links in place of copies of files that nobody may write

  bool links(const FolderListing::Entry& entry) const;
  bool isOwnFile(std::string_view path) const;
};

/// Removes from the process folder `target`, as earlier runs have left it, everything but folders and files that are
/// certain to be what a new copy of the listed folder would hold. Returns these, by their paths; empty where nothing
/// remains, not even the folder.
///
/// A file remains if it and the original are in the states that were recorded when it was copied
/// (recordCopies()). Where states cannot be relied upon (hasReliableTimes(); a file that was changed within two seconds
/// of the record; a start of the machine since), the contents must be equal, too. What model runs write never remains.
///
/// `look` is called often and may throw. Throws FatalError where something cannot be removed or read.
std::unordered_set<std::string> removeAllButUnchanged(const std::string& target, const FolderListing& listing,
                                                      const ListedPaths& paths, const FolderMaking& making,
                                                      const std::function<void()>& look);

/// Records in the mark of the process folder `target`, just made and not used yet, what its files are copies of. Where
/// that fails nothing of it remains the next time.
void recordCopies(const std::string& target, const FolderListing& listing, const FolderMaking& making);

}  // namespace mirevo
