#pragma once

#include <string>
#include <string_view>

#include "common/run_files.h"

namespace mirevo {

/// Whether the text is that of a termination log; one of a run that goes on is empty.
bool isTerminationLog(std::string_view text);
/// Whether the first lines of the file are those of a run's.
bool carriesMark(const std::string& path, const RunFile& file);
/// Why a run must not rename, replace or remove what is at `path`, as a sentence with the remedy. Empty where it may:
/// there is nothing, a file that carries the mark or has no more than a part of the head; for the folders of
/// runs, one that is empty or holds what only theirs do.
std::string whyNotReplaceable(const std::string& path, const RunFile& file);
/// Throws FatalError, with `path` and that sentence, unless it may be replaced.
void requireReplaceable(const std::string& path, const RunFile& file);

}  // namespace mirevo
