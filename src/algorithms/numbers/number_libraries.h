#pragma once

#include <string>
#include <vector>

namespace mirevo {

/// The libraries that compute, with their versions: LAPACK, whose it is as far as that can be asked ("OpenBLAS
/// 0.3.21"), and Boost.
std::vector<std::string> numberLibraries();

}  // namespace mirevo
