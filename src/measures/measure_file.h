#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The numbers of an output-measure file in free format: separated by blanks, tabs, commas, semicolons or line ends,
/// `#` comments to the end of the line. Nothing, with the place in `reason`, when something in it is no number.
std::optional<std::vector<double>> readMeasureFile(const std::string& fileName, std::string& reason);
/// readMeasureFile() with the content at hand; `sourceName` is for the reason.
std::optional<std::vector<double>> parseMeasureFile(const std::string& sourceName, std::string_view content,
                                                    std::string& reason);

}  // namespace mirevo
