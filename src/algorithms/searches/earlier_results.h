#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "common/parameter_set.h"
#include "parameters/search_space.h"

namespace mirevo {

/// Which evaluations of an earlier run come first.
enum class EarlierOrder : std::int32_t {
  best,  ///< the least aggregate
  first  ///< the lowest number
};

/// Sets of an earlier run that begin the initial sample of a search.
struct EarlierSets {
  std::vector<ParameterSet> sets;        ///< search scale; no two are the same
  std::vector<ParameterSet> modelScale;  ///< the same as they are in the file
  std::size_t successCount = 0;          ///< successful evaluations in the file
  std::size_t outsideCount = 0;          ///< of those looked at, sets outside the bounds
  std::string firstOutside;              ///< where the first of them is and what lies outside
};

/// The sets of the first `most` successful evaluations, in this order, that lie within the bounds and are neither
/// `leftOut` nor one that came before. `text` is a result file; `settings` the content of the restart file beside it,
/// which tells the variable parameters of that run, or empty where there is none. Empty, with place and cause in
/// `reason`, if the parameters are not those of `space`, and if there is no set within the bounds.
std::optional<EarlierSets> readEarlierSets(const std::string& fileName, std::string_view text,
                                           std::string_view settings, EarlierOrder order, std::size_t most,
                                           const SearchSpace& space, const std::optional<ParameterSet>& leftOut,
                                           std::string& reason);

}  // namespace mirevo
