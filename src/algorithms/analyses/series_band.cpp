#include "algorithms/analyses/series_band.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "algorithms/numbers/sample_summary.h"

namespace mirevo {

SeriesBand seriesBand(std::span<const double> observed, std::span<const EvaluationResult> results, std::size_t first) {
  SeriesBand band;
  std::size_t inside = 0;
  std::vector<double> values;
  for (std::size_t t = 0; t < observed.size(); ++t) {
    values.clear();
    for (const EvaluationResult& result : results) {
      if (first + t >= result.simulatedValues.size()) continue;  // it failed
      const double value = result.simulatedValues[first + t];
      if (std::isfinite(value)) values.push_back(value);
    }
    std::sort(values.begin(), values.end());
    band.lower.push_back(sortedQuantile(values, 0.05));
    band.median.push_back(sortedQuantile(values, 0.50));
    band.upper.push_back(sortedQuantile(values, 0.95));
    if (values.empty()) continue;
    ++band.observationCount;
    if (observed[t] >= band.lower[t] && observed[t] <= band.upper[t]) ++inside;
  }
  band.shareInside = band.observationCount == 0
                         ? std::numeric_limits<double>::quiet_NaN()
                         : static_cast<double>(inside) / static_cast<double>(band.observationCount);
  return band;
}

}  // namespace mirevo
