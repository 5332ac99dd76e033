#include "algorithms/analyses/series_band.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/calendar.h"
#include "common/text.h"
#include "measures/dates.h"

namespace mirevo {
namespace {

/// With the digits of the 32-bit values of a series.
std::string cell(double value) {
  return std::isfinite(value) ? fmt::format("{}", static_cast<float>(value)) : "NaN";
}

}  // namespace

SeriesBand seriesBand(std::span<const double> observed, std::size_t evaluations, const ReadColumns& read) {
  // A MB at a time; of more than ten thousand evaluations more, as every time costs a walk through all of them.
  constexpr std::size_t kValuesAtOnce = std::size_t{1} << 17;
  constexpr std::size_t kMostWalks = 32;
  const std::size_t atOnce =
      std::max(kValuesAtOnce / std::max<std::size_t>(evaluations, 1), observed.size() / kMostWalks + 1);
  SeriesBand band;
  std::size_t inside = 0;
  std::vector<double> columns;
  std::vector<double> values;
  std::vector<std::size_t> runs;
  for (std::size_t t = 0; t < observed.size(); ++t) {
    if (t % atOnce == 0) columns = read(t, std::min(atOnce, observed.size() - t));
    values.clear();
    for (const double value : std::span(columns).subspan(t % atOnce * evaluations, evaluations)) {
      if (std::isfinite(value)) values.push_back(value);
    }
    std::sort(values.begin(), values.end());
    band.lower.push_back(sortedQuantile(values, 0.05));
    band.median.push_back(sortedQuantile(values, 0.50));
    band.upper.push_back(sortedQuantile(values, 0.95));
    if (values.empty()) continue;
    ++band.observationCount;
    runs.push_back(values.size());
    if (observed[t] >= band.lower[t] && observed[t] <= band.upper[t]) ++inside;
  }
  if (!runs.empty()) {
    const auto [fewest, most] = std::minmax_element(runs.begin(), runs.end());
    band.fewestRuns = *fewest;
    band.mostRuns = *most;
    band.fewerRunsCount = static_cast<std::size_t>(
        std::count_if(runs.begin(), runs.end(), [most = *most](std::size_t count) { return count < most; }));
  }
  band.shareInside = band.observationCount == 0
                         ? std::numeric_limits<double>::quiet_NaN()
                         : static_cast<double>(inside) / static_cast<double>(band.observationCount);
  return band;
}

std::string fewerRunsText(const SeriesBand& band) {
  if (band.fewerRunsCount == 0) return "";
  return fmt::format(
      "at {} of {} observations the quantiles are of fewer runs than at the others, of {} to {}: runs have "
      "no value there",
      band.fewerRunsCount, band.observationCount, band.fewestRuns, band.mostRuns);
}

std::string seriesBandText(std::string_view title, const ObservedSeries& observed, const SeriesBand& band) {
  std::string text = fmt::format("# Band of {}\n", columnName(title));
  if (const std::string fewer = fewerRunsText(band); !fewer.empty()) text += fmt::format("# {}\n", fewer);
  text += "time,observed,5 %,50 %,95 %\n";
  const std::int64_t origin = secondNumber(observed.start);
  for (std::size_t t = 0; t < observed.days.size(); ++t) {
    const DateRecord time = dateOfSecond(secondAfter(origin, observed.days[t]));
    text += fmt::format("{},{},{},{},{}\n", formatDate(time), cell(observed.values[t]), cell(band.lower[t]),
                        cell(band.median[t]), cell(band.upper[t]));
  }
  return text;
}

}  // namespace mirevo
