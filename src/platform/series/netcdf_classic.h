#pragma once

#include <optional>
#include <string>

namespace mirevo {

/// A message if a file in a classic NetCDF format is shorter than its header says; empty for a complete file and for
/// any other format. The library reads the missing part as zeros, so that a file that a model did not finish would be
/// taken for valid.
std::optional<std::string> findCutOff(const std::string& fileName);

}  // namespace mirevo
