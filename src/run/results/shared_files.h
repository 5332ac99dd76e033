#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "common/run_files.h"
#include "run/progress/run_log.h"

namespace mirevo {

/// Folder and name, without ".kdx", of the setups that share a file with the setup of this prefix by their names:
/// `basin_Run.kdx` has its results in `basin_Run.dat`, where `basin.kdx` has the account of its run. Whether there are
/// such setups is another matter.
std::vector<std::string> prefixesThatShare(const std::string& prefix);

/// The first of them of which a run is going on, by its lock; empty when there is none.
std::string runningPrefixThatShares(const std::string& prefix);

/// The setup that the first lines of a result name; empty where there is no such line.
std::string setupNamedIn(std::string_view head);
/// Whether two paths are those of one setup, but for the folder and however the ending is spelt.
bool isSameSetup(std::string_view one, std::string_view other);

/// Says in the log that `path` of an earlier run was kept as `kept`, unless that is empty.
void logKept(const std::string& path, const std::string& kept, RunLog& log);
/// keepEarlierFile() with logKept().
std::string keepEarlierFile(const std::string& path, RunLog& log);

/// The same for each of the results, with a warning for each other setup that the heads of some name, whose results
/// then have moved. A file without such a line belongs to the one before it.
void keepEarlierResults(std::span<const std::string> paths, const std::string& setupFile, RunLog& log);

/// The same for those of `paths` whose heads name another setup than that of `results`: a run that goes on would
/// replace them by its own.
void keepResultsOfAnother(const std::string& results, std::span<const std::string> paths, const std::string& setupFile,
                          RunLog& log);

/// Writes a text to a file beside the results, as a whole. An existing file with the same content is left as it is; one
/// with other content is kept under a numbered name. Throws FatalError.
void writeBesideResults(const std::string& path, const std::string& text, RunLog& log);

}  // namespace mirevo
