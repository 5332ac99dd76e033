#pragma once

#include <optional>

namespace mirevo {

/// This process's number as the job launcher gave it to its environment; -1 without a launcher.
int launcherRank();

/// How many processes the launcher started, as it says itself; nothing where it does not.
std::optional<int> launchedProcessCount();

/// Removes what a launcher has put into the environment: a model that uses MPI itself would take itself for a process
/// of this job.
void hideJobFromModels();

}  // namespace mirevo
