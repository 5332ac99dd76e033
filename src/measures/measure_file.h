#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The numbers of an output-measure file in free format: separated by blanks, tabs, commas, semicolons or line ends,
/// `#` comments to the end of the line. Empty, with line and cause in `reason`, when it cannot be read or something in
/// it is not a number.
std::optional<std::vector<double>> readMeasureFile(const std::string& fileName, std::string& reason);
/// The same for content in memory; `sourceName` is used in `reason`.
std::optional<std::vector<double>> parseMeasureFile(const std::string& sourceName, std::string_view content,
                                                    std::string& reason);

}  // namespace mirevo
