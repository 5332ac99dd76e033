#pragma once

#include <memory>
#include <span>
#include <vector>

#include "algorithms/searches/search_method.h"

namespace mirevo {

/// The names of all searches, those with a number first.
std::span<const CodeName> searchNames();
/// The search with this number or name, with the default settings; nullptr when there is none.
std::unique_ptr<SearchMethod> makeSearchMethod(const SetupValue& value);
/// One of each search, for the manual.
std::vector<std::unique_ptr<SearchMethod>> searchMethods();

}  // namespace mirevo
