#include "measures/shown_above.h"

#include <cmath>
#include <cstddef>
#include <memory>
#include <span>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/item_names.h"
#include "measures/measure_statistics.h"
#include "measures/series_tables.h"

namespace mirevo {
namespace {

/// `reference` has the number of its item afterwards, if it has a name.
std::unique_ptr<TimeSeriesObject> openShownAbove(SeriesReference& reference) {
  std::vector<int> items;  // an item of a name may be any
  if (reference.itemName.empty()) items.push_back(reference.itemNo);
  auto series = openTimeSeries(reference, nullptr, items);
  reference.itemNo = itemNumber(*series, reference);
  requireItem(*series, reference);
  return series;
}

}  // namespace

NamedSeries readShownAbove(SeriesReference reference, const EvaluationPeriod& period) {
  const auto series = openShownAbove(reference);
  return {series->itemName(reference.itemNo), readPeriodSeries(*series, reference, period)};
}

std::vector<std::string> requireShownAbove(const OutputMeasure& measure, const EvaluationPeriod& period) {
  SeriesReference reference = measure.shownAbove;
  if (reference.fileName.empty()) return {};
  const auto series = openShownAbove(reference);
  const std::string item = fmt::format("{}: item No. {} ({})", trimTrailing(reference.fileName), reference.itemNo,
                                       series->itemName(reference.itemNo));
  std::vector<std::string> doubts;
  if (reference.isDefaultItem && series->itemCount() > 1) {
    doubts.push_back(item + " is drawn above the hydrograph, as the section has no Item_No:" + listItems(*series));
  }
  const PeriodSeries shown = readPeriodSeries(*series, reference, period);
  bool isSeen = false;
  for (std::size_t i = 0; i < shown.values.size(); ++i) {  // there is one step on either side
    const bool isInside =
        shown.seconds[i] >= secondNumber(period.start) && shown.seconds[i] <= secondNumber(period.end);
    isSeen = isSeen || (isInside && !std::isnan(shown.values[i]));
  }
  if (!isSeen) {
    doubts.push_back(item + " has no value in the evaluation period, where nothing is drawn above the hydrograph");
  }
  return doubts;
}

}  // namespace mirevo
