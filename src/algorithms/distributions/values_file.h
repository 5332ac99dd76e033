#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The numbers in the text of a file, between blanks, tabs or line ends, without lines that begin with `#`; of a table
/// with a line of column names (common/data_table) those of `column`, if one is named. Throws FatalError with the line
/// of what is no finite number; `fileName` is the name in messages.
std::vector<double> readValues(std::string_view text, std::string_view column, const std::string& fileName);

}  // namespace mirevo
