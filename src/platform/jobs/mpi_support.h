#pragma once

#include <string>

namespace mirevo {

/// What this program can do with MPI, for people: "no", "yes", or with the library where it is loaded, "yes, Open MPI
/// v4.1.4". MPI is not started.
std::string mpiSupport();

}  // namespace mirevo
