#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The words of a line: separated by blanks, or in quotes of either kind.
std::vector<std::string> wordsOf(std::string_view line);

/// The cells of a line of a CSV file with quotes around cells that have the separator in them; without blanks on either
/// side. With a blank as the separator any number of blanks is one.
std::vector<std::string> cellsOf(std::string_view line, char separator);

}  // namespace mirevo
