// Any bytes as the result file of an earlier run and, behind the first NUL, the settings of that run: no crash, sets
// within the bounds that all differ, and a reason with the file where there are none.

#include <algorithm>
#include <cstdint>
#include <set>
#include <string>
#include <string_view>

#include "algorithms/searches/earlier_results.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const std::size_t end = std::min(text.find('\0'), text.size());
  const mirevo::SearchSpace space{{"a", "b"},
                                  {1.0, 2.0},
                                  {0.0, 1.0},
                                  {10.0, 9.0},
                                  {mirevo::TransformationType::none, mirevo::TransformationType::integer}};
  for (const auto order : {mirevo::EarlierOrder::best, mirevo::EarlierOrder::first}) {
    std::string reason;
    const auto sets = mirevo::readEarlierSets("e.dat", text.substr(0, end), text.substr(std::min(end + 1, size)), order,
                                              5, space, {}, reason);
    require(sets.has_value() || reason.starts_with("e.dat:"));
    if (!sets) continue;
    require(sets->sets.size() <= 5 && sets->sets.size() == sets->modelScale.size());
    require(std::set(sets->sets.begin(), sets->sets.end()).size() == sets->sets.size());
    for (const auto& set : sets->sets) {
      for (std::size_t j = 0; j < space.size(); ++j) require(set[j] >= space.lower[j] && set[j] <= space.upper[j]);
    }
  }
  return 0;
}
