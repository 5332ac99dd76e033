#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <vector>

#include "measures/output_measure.h"

namespace mirevo {

/// What an axis says of a pair of series.
struct SeriesLabel {
  std::string quantity;   ///< as the setup names it, else the observed item; empty where neither does
  std::string unit;       ///< as the setup says, else the observed file; may be empty
  bool hasHoles = false;  ///< observations are left out for their months or values
};

/// The labels of the pairs of these measures, 0-based. Of several measures that compare a pair the first that says
/// something decides. Observed files that cannot be opened any more say nothing.
std::vector<SeriesLabel> seriesLabels(std::span<const OutputMeasure> measures, std::span<const std::size_t> shown);

}  // namespace mirevo
