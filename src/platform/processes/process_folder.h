#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// The file in a process folder that takes what its batch prints; every process folder has one.
inline constexpr char kBatchLogName[] = "mirevo_batch.log";

/// Makes `target` anew as a copy of the folder `source`: what was there is removed; files (sharing their blocks with
/// the original where the file system can), folders and links are copied with their modes and times, sockets and
/// devices are not. Both paths are absolute. A link that leads into `source` leads into the copy, and one that leads
/// out of it to where it led before.
///
/// Left out is what runs have made in `source` (RunMadeEntries): where a setup lies beside its model, its logs, results
/// and saved files; the process folders of this run, `processFolderPrefix` followed by a number, and those of other
/// runs, `..._Process<number>` with a batch log in it. What goes away while it is copied is passed over.
///
/// Throws FatalError with a line that names the path and the system's reason.
void makeProcessFolder(const std::string& source, const std::string& target, std::string_view processFolderPrefix);

}  // namespace mirevo
