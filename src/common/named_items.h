#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// Whether two names are the same but for blanks around them.
bool isSameName(std::string_view a, std::string_view b);

/// The indices of the items that a user means by `written`: those with exactly this name, or, where there are none,
/// those whose names differ from it by case alone. Blanks around a name do not count. More than one: ambiguous.
std::vector<std::size_t> itemsNamed(std::string_view written, std::span<const std::string> names);

/// Why a name with several meanings is refused, and what to write in its place.
std::string ambiguityText(std::string_view written, std::span<const std::string> names,
                          std::span<const std::size_t> meant);

}  // namespace mirevo
