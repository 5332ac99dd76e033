#pragma once

#include <string>
#include <vector>

#include "measures/fit_figures.h"
#include "report/shown_pairs.h"

namespace mirevo {

/// The fit within some of the pairs.
struct RegimeFit {
  std::string name;    ///< "DJF", "1981/82"
  FitFigures figures;  ///< efficiencies are NaN with fewer than kLeastPairsOfEfficiency
  double observedMean = 0.0;
  double simulatedMean = 0.0;
};

inline constexpr std::size_t kLeastPairsOfEfficiency = 10;

/// The seasons DJF, MAM, JJA and SON that have pairs.
std::vector<RegimeFit> seasonFits(const ShownPairs& pairs);
/// The years that have pairs, beginning with this month.
std::vector<RegimeFit> yearFits(const ShownPairs& pairs, int firstMonth);

}  // namespace mirevo
