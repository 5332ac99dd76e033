#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Every keyword of a setup as SECTION/Keyword, in the order of the reference page.
std::vector<std::string> keywordNames();

/// What the reference says of a keyword, as plain text for a terminal. `name` is that of the keyword, which may be in
/// several sections, or has its section before it, whole or in part; letter case does not count, and the number of an
/// item may stand for the `n` ("PARAMETER_3/Parameter_Name"). Of a name that only sections have, these with their
/// keywords. Empty if there is none.
std::string keywordHelp(std::string_view name);

/// A few known names that resemble an unknown one, best first: those that contain it, or else the nearest; may be
/// empty.
std::vector<std::string> namesLike(std::string_view name);

}  // namespace mirevo
