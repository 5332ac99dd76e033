#pragma once

#include <string>

namespace mirevo {

/// Reads and checks a setup, runs its model once with the initial values, in a process folder of its own, and prints
/// what was read and computed on standard output; what is wrong goes to standard error. No file of a run is made,
/// changed or removed, so that a run of the setup may be going on. Returns the exit code: 0 if a run would begin like
/// this, otherwise 1.
int checkSetup(const std::string& setupFileName);

}  // namespace mirevo
