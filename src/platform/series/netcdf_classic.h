#pragma once

#include <optional>
#include <string>

namespace mirevo {

/// Why a file of the classic NetCDF formats is shorter than its header says: the library reads what is missing as
/// zeros, so that a file which a model did not finish would count. Nothing for a whole file and for any other format.
std::optional<std::string> findCutOff(const std::string& fileName);

}  // namespace mirevo
