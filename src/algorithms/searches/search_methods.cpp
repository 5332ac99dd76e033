#include "algorithms/searches/search_methods.h"

#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/searches/cma_es.h"
#include "algorithms/searches/dds.h"
#include "algorithms/searches/glm.h"
#include "algorithms/searches/nsga_ii.h"
#include "algorithms/searches/opse.h"
#include "algorithms/searches/padds.h"
#include "algorithms/searches/pdds.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"

namespace mirevo {

const ChoiceTable<SearchMethod>& searchMethods() {
  /// A new search is added here.
  static const auto searches = ChoiceTable<SearchMethod>::of<SceMethod, PseMethod, DdsMethod, PddsMethod, OpseMethod,
                                                             CmaEsMethod, GlmMethod, NsgaIiMethod, PaddsMethod>();
  return searches;
}

std::string searchesWith(bool SearchFacts::*fact, std::string_view last, std::string_view quote) {
  std::vector<std::string> names;
  for (const auto& search : searchMethods().all()) {
    if (search->facts().*fact) names.push_back(fmt::format("{0}{1}{0}", quote, search->facts().name.name));
  }
  if (names.size() < 2) return names.empty() ? std::string() : names.front();
  const std::string end = fmt::format(" {} {}", last, names.back());
  names.pop_back();
  return fmt::format("{}{}", fmt::join(names, ", "), end);
}

}  // namespace mirevo
