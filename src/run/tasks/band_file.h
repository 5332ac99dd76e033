#pragma once

#include <string>

#include "algorithms/analyses/series_band.h"
#include "measures/observed_series.h"

namespace mirevo {

/// Writes the band of a series as a CSV file that can be read as a time series: time, observed value, 5, 50 and 95 %
/// quantile, a row an observation. An earlier file is kept under a numbered name. Throws FatalError.
void writeBandFile(const std::string& path, const std::string& title, const ObservedSeries& observed,
                   const SeriesBand& band);

}  // namespace mirevo
