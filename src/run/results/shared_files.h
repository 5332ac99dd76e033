#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "common/run_files.h"
#include "run/progress/run_log.h"

namespace mirevo {

/// Folder and name, without ".kdx", of each other setup in the folder whose runs may write some of `files`, those of
/// the setup with this prefix: the results of `basin_Run.kdx` and the account of `basin.kdx` are both `basin_Run.dat`.
std::vector<std::string> prefixesThatShare(const std::string& prefix, std::span<const RunFile> files);

/// Folder and name of a setup in the folder whose run is going on and may hold the lock of the setup with this prefix
/// as it shares files with it; empty when there is none.
std::string runningPrefixThatShares(const std::string& prefix);

/// Says in the log that `path` of an earlier run was kept as `kept`, unless that is empty.
void logKept(const std::string& path, const std::string& kept, RunLog& log);
/// keepEarlierFile() with logKept().
std::string keepEarlierFile(const std::string& path, RunLog& log);

/// The same, with a warning if the head of the file names another setup, whose results then have moved.
std::string keepEarlierResults(const std::string& path, const std::string& setupFile, RunLog& log);

/// Writes a text to a file beside the results, as a whole. An existing file with the same content is left as it is; one
/// with other content is kept under a numbered name. Throws FatalError.
void writeBesideResults(const std::string& path, const std::string& text, RunLog& log);

}  // namespace mirevo
