#pragma once

#include <span>
#include <string>

namespace mirevo {

/// columnName() of a name beside columns that there are already: "X1", or "X1 (2)" if one of them is called so.
std::string columnHeading(const std::string& name, std::span<const std::string> taken);

}  // namespace mirevo
