#include "algorithms/analyses/sobol_series.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/dates.h"

namespace mirevo {
namespace {

/// Enough for a limit that is drawn; a long series has thousands of times.
constexpr std::size_t kSeriesBootstrapSamples = 200;
constexpr std::size_t kValuesAtOnce = std::size_t{1} << 23;  // 64 MB; each time costs a walk through all runs

std::string cell(double value) {
  return std::isfinite(value) ? fmt::format("{}", static_cast<float>(value)) : "NaN";
}

void appendIndex(const SobolIndex& index, std::string& text) {
  text += fmt::format(",{},{},{}", cell(index.value), cell(index.lower), cell(index.upper));
}

std::string headOf(std::string_view title, std::span<const SobolFactor> factors) {
  std::string text = fmt::format("# Sobol' indices of {}, with limits of 95 %\n", columnName(title));
  text += "time,observed,mean,standard deviation,blocks";
  for (const SobolFactor& factor : factors) {
    const std::string name = columnName(factor.name);
    text += fmt::format(",S {0},S {0} lower,S {0} upper,ST {0},ST {0} lower,ST {0} upper", name);
  }
  return text + "\n";
}

}  // namespace

SobolSeries sobolSeries(std::string_view title, const ObservedSeries& observed, const SobolDesign& design,
                        std::span<const SobolFactor> factors, std::span<const std::size_t> sets,
                        const ReadColumns& read, const ReplicateBootstrap& bootstrap) {
  SobolSeries series{headOf(title, factors), 0, std::vector<std::size_t>(factors.size(), 0), 0};
  const std::size_t atOnce = std::max<std::size_t>(1, kValuesAtOnce / std::max<std::size_t>(sets.size(), 1));
  const std::size_t times = observed.days.size();
  const std::int64_t origin = secondNumber(observed.start);
  std::vector<double> columns;
  std::vector<double> values(design.setCount(), std::numeric_limits<double>::quiet_NaN());
  for (std::size_t t = 0; t < times; ++t) {
    if (t % atOnce == 0) columns = read(t, std::min(atOnce, times - t));
    const std::span<const double> ofTime = std::span(columns).subspan(t % atOnce * sets.size(), sets.size());
    for (std::size_t i = 0; i < sets.size(); ++i) values[sets[i]] = ofTime[i];
    const SobolIndices indices = sobolIndices(design, values, bootstrap, kSeriesBootstrapSamples, false);
    std::size_t blocks = design.rows;
    for (const SobolIndex& index : indices.first) blocks = std::min(blocks, index.blocks);
    if (indices.isConstant && indices.valueCount > 1) ++series.constantCount;
    if (std::ranges::all_of(indices.total, [](const SobolIndex& index) { return !std::isnan(index.lower); })) {
      const auto largest = std::ranges::max_element(indices.total, {}, &SobolIndex::value);
      ++series.timeCount;
      ++series.largestCounts[static_cast<std::size_t>(largest - indices.total.begin())];
    }
    series.text += fmt::format("{},{},{},{},{}", formatDate(dateOfSecond(secondAfter(origin, observed.days[t]))),
                               std::isnan(observed.values[t]) ? "" : cell(observed.values[t]), cell(indices.mean),
                               cell(std::sqrt(indices.variance)), blocks);
    for (std::size_t j = 0; j < factors.size(); ++j) {
      appendIndex(indices.first[j], series.text);
      appendIndex(indices.total[j], series.text);
    }
    series.text += '\n';
  }
  return series;
}

}  // namespace mirevo
