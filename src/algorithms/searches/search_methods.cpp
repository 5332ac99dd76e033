#include "algorithms/searches/search_methods.h"

#include "algorithms/searches/dds.h"
#include "algorithms/searches/opse.h"
#include "algorithms/searches/pdds.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"

namespace mirevo {

const ChoiceTable<SearchMethod>& searchMethods() {
  /// A new search is added here.
  static const auto searches = ChoiceTable<SearchMethod>::of<SceMethod, PseMethod, DdsMethod, PddsMethod, OpseMethod>();
  return searches;
}

std::string searchesWith(bool SearchFacts::*fact, std::string_view between) {
  std::string names;
  for (const auto& search : searchMethods().all()) {
    if (!(search->facts().*fact)) continue;
    names.append(names.empty() ? "" : between).append(search->facts().name.name);
  }
  return names;
}

}  // namespace mirevo
