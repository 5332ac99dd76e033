#include "report/hydrograph_views.h"

#include <algorithm>
#include <cmath>
#include <functional>

#include "common/calendar.h"
#include "report/extreme_views.h"
#include "report/regime_views.h"
#include "report/residual_views.h"

namespace mirevo {
namespace {

using Digits = JsonWriter::Digits;

void writeFits(JsonWriter& json, std::string_view key, const std::vector<RegimeFit>& fits) {
  json.key(key).beginArray();
  for (const RegimeFit& fit : fits) {
    json.beginObject().member("name", fit.name).member("n", fit.figures.count).member("nse", fit.figures.nse);
    json.member("kge", fit.figures.kge).member("pbias", fit.figures.percentBias);
    json.member("observed", fit.observedMean).member("simulated", fit.simulatedMean).endObject();
  }
  json.endArray();
}

/// The finite values, the most extreme one first.
template <class Order>
std::vector<double> ordered(std::vector<double> values, Order order) {
  std::erase_if(values, [](double value) { return !std::isfinite(value); });
  std::sort(values.begin(), values.end(), order);
  return values;
}

template <class Order>
void writeRanked(JsonWriter& json, std::string_view key, const std::vector<double>& observed,
                 const std::vector<double>& simulated, Order order) {
  const std::vector<double> ofObserved = ordered(observed, order);
  json.key(key).beginObject();
  json.key("returnPeriods").numbers(returnPeriods(ofObserved.size()), Digits::drawn);
  json.key("observed").numbers(ofObserved, Digits::drawn);
  json.key("simulated").numbers(ordered(simulated, order), Digits::drawn).endObject();
}

void writeExtremes(JsonWriter& json, const ShownPairs& pairs, int firstMonth) {
  const AnnualExtremes extremes = annualExtremes(pairs, firstMonth);
  const DurationTail tail = durationTail(pairs);
  json.key("extremes").beginObject().member("isAtLeastDaily", isAtLeastDaily(pairs));
  json.member("years", extremes.years);
  json.key("lowObserved").numbers(extremes.lowObserved, Digits::drawn);
  json.key("lowSimulated").numbers(extremes.lowSimulated, Digits::drawn);
  json.key("highObserved").numbers(extremes.highObserved, Digits::drawn);
  json.key("highSimulated").numbers(extremes.highSimulated, Digits::drawn);
  writeRanked(json, "low", extremes.lowObserved, extremes.lowSimulated, std::less<>());
  writeRanked(json, "high", extremes.highObserved, extremes.highSimulated, std::greater<>());
  json.key("tail").beginObject().key("exceedance").numbers(tail.exceedance, Digits::drawn);
  json.key("observed").numbers(tail.observed, Digits::drawn);
  json.key("simulated").numbers(tail.simulated, Digits::drawn).endObject().endObject();
}

void writePeaks(JsonWriter& json, const std::vector<ShownPeak>& peaks) {
  json.key("peaks").beginArray();
  for (const ShownPeak& peak : peaks) {
    json.beginObject().member("time", epochMilliseconds(peak.second)).member("observed", peak.observed);
    json.member("simulated", peak.simulated).member("percent", peak.percent);
    json.member("hoursLater", peak.hoursLater).endObject();
  }
  json.endArray();
}

void writeResiduals(JsonWriter& json, const ResidualViews& residuals) {
  json.key("residuals").beginObject().member("n", residuals.all.count).member("mean", residuals.all.mean);
  json.member("standardDeviation", residuals.all.standardDeviation).key("months").beginArray();
  for (const std::int64_t second : residuals.months) json.integer(epochMilliseconds(second));
  json.endArray().key("monthMeans").numbers(residuals.monthMeans, Digits::drawn).key("byMonth").beginArray();
  for (const SampleSummary& month : residuals.byMonth) {
    json.numbers(std::vector<double>(month.quantiles.begin(), month.quantiles.end()), Digits::drawn);
  }
  json.endArray().key("flows").numbers(residuals.flows, Digits::drawn);
  json.key("ofFlows").numbers(residuals.ofFlows, Digits::drawn);
  json.key("autocorrelation").numbers(residuals.autocorrelation, Digits::drawn);
  json.member("autocorrelationLimit", residuals.autocorrelationLimit);
  json.key("normalQuantiles").numbers(residuals.normalQuantiles, Digits::drawn);
  json.key("standardised").numbers(residuals.standardisedResiduals, Digits::drawn).endObject();
}

}  // namespace

void writeHydrographViews(JsonWriter& json, const ShownSeries& series, int firstMonth, bool hasPeaks) {
  const ShownPairs pairs = shownPairs(series);
  if (pairs.seconds.empty()) return;
  json.key("views").beginObject().member("of", &judgedValues(series) == &series.best ? "best" : "initial");
  json.member("usualStep", usualStep(pairs) * 1000);
  writeFits(json, "seasons", seasonFits(pairs));
  writeFits(json, "years", yearFits(pairs, firstMonth));
  writeExtremes(json, pairs, firstMonth);
  if (hasPeaks && isAtLeastDaily(pairs)) writePeaks(json, largestPeaks(pairs));
  writeResiduals(json, residualViews(pairs));
  json.endObject();
}

}  // namespace mirevo
