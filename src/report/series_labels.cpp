#include "report/series_labels.h"

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "measures/item_names.h"
#include "measures/period_series.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

std::vector<SeriesLabel> seriesLabels(std::span<const OutputMeasure> measures, std::span<const std::size_t> shown) {
  std::vector<SeriesLabel> labels(shown.size());
  std::map<std::pair<std::string, TextForm>, std::vector<std::size_t>>
      unsaid;  // places in the list, by the file that may say it
  for (std::size_t place = 0; place < shown.size(); ++place) {
    labels[place].hasHoles = measures[shown[place]].selection.leavesHoles();
    for (const OutputMeasure& other : measures) {
      const bool isOfPair =
          other.interfaceType == InterfaceType::timeSeries && isSamePair(other, measures[shown[place]]);
      if (isOfPair && labels[place].quantity.empty()) labels[place].quantity = other.displayName;
      if (isOfPair && labels[place].unit.empty()) labels[place].unit = other.unit;
    }
    if (labels[place].quantity.empty() || labels[place].unit.empty()) {
      const SeriesReference& observation = measures[shown[place]].observation;
      unsaid[{observation.fileName, observation.form}].push_back(place);
    }
  }
  for (const auto& [source, places] : unsaid) {
    const auto& [fileName, form] = source;
    std::string reason;
    const auto file = createTimeSeriesObject(fileName, reason, nullptr, form);
    if (!file || !file->open(fileName)) continue;
    for (const std::size_t place : places) {
      const SeriesReference& observation = measures[shown[place]].observation;
      int item = observation.itemNo;
      if (!observation.itemName.empty() && !observation.hasItemNo) {
        const auto named = itemsCalled(*file, observation.itemName);
        if (named.size() == 1) item = named.front();
      }
      const std::string unit = file->itemUnit(item);
      const auto [name, unitInName] = splitUnit(file->itemName(item));
      if (labels[place].quantity.empty()) labels[place].quantity = unit == unitInName ? name : file->itemName(item);
      if (labels[place].unit.empty()) labels[place].unit = unit;
    }
  }
  return labels;
}

}  // namespace mirevo
