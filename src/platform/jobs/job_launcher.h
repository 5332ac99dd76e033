#pragma once

#include <optional>
#include <sys/types.h>

namespace mirevo {

/// The rank of this process, from the environment that the job launcher set; -1 without a launcher.
int launcherRank();

/// How many processes the launcher has started; empty if it does not say.
std::optional<int> launchedProcessCount();

/// Whether the launcher lets the job go on when processes of it are lost (`mpirun --enable-recovery`). It then ends no
/// other process when one aborts the job, and its own exit code is 0 whatever theirs are.
bool launcherKeepsJob();

/// The process of mpirun, if it is what has started this one; 0 if a daemon of it on another node or a script has, or
/// if it is gone.
pid_t mpirunProcess();

/// Removes the launcher's variables from the environment: a model that uses MPI itself would take itself for a process
/// of this job.
void hideJobFromModels();

}  // namespace mirevo
