#pragma once

#include <string>
#include <string_view>

#include "algorithms/searches/search_method.h"
#include "common/settings/choice_table.h"

namespace mirevo {

/// All searches.
const ChoiceTable<SearchMethod>& searchMethods();

/// The names of the searches for which `fact` is true, each between two `quote`s: "SCE, PSE or OPSE" if `last` is "or".
std::string searchesWith(bool SearchFacts::*fact, std::string_view last, std::string_view quote = {});

}  // namespace mirevo
