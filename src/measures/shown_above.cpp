#include "measures/shown_above.h"

#include <memory>
#include <span>

#include "measures/measure_statistics.h"
#include "measures/series_tables.h"

namespace mirevo {
namespace {

std::unique_ptr<TimeSeriesObject> openShownAbove(const SeriesReference& reference) {
  auto series = openTimeSeries(reference.fileName, reference.fileLocation, nullptr, std::span(&reference.itemNo, 1));
  requireItem(*series, reference);
  return series;
}

}  // namespace

NamedSeries readShownAbove(const SeriesReference& reference, const EvaluationPeriod& period) {
  const auto series = openShownAbove(reference);
  return {series->itemName(reference.itemNo), readPeriodSeries(*series, reference, period)};
}

void requireShownAbove(const OutputMeasure& measure) {
  if (!measure.shownAbove.fileName.empty()) openShownAbove(measure.shownAbove);
}

}  // namespace mirevo
