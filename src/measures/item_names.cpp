#include "measures/item_names.h"

#include <algorithm>
#include <array>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <tuple>
#include <utility>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/measure_statistics.h"
#include "measures/series_tables.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostNumbers = 20;

bool isEqual(std::string_view name, std::string_view written) {
  return trim(name) == trim(written);
}
bool isEqualIgnoringCase(std::string_view name, std::string_view written) {
  return equalIgnoringCase(trim(name), trim(written));
}
bool isEqualWithoutUnit(std::string_view name, std::string_view written) {
  return equalIgnoringCase(splitUnit(name).first, trim(written));
}
constexpr std::array kWaysToMean = {isEqual, isEqualIgnoringCase, isEqualWithoutUnit};

[[noreturn]] void refuseUnknown(const TimeSeriesObject& series, const SeriesReference& reference) {
  std::vector<std::string> names;
  for (int item = 1; item <= series.itemCount(); ++item) {
    names.push_back(series.itemName(item));
    names.push_back(splitUnit(names.back()).first);
  }
  const auto nearest = nearestName(trim(reference.itemName), names);
  fatalError(fmt::format("Error: Item {} not found in {}", quotedForMessage(reference.itemName),
                         trimTrailing(reference.fileName)),
             fmt::format("{}{}the file has {}{}", reference.itemLocation,
                         nearest ? fmt::format("did you mean {}? ", quotedForMessage(*nearest)) : "",
                         countText(static_cast<std::size_t>(series.itemCount()), "item"), listItems(series)));
}

/// The files that measures name items of, each opened once.
class NamedFiles final {
 public:
  const TimeSeriesObject& open(const SeriesReference& reference) {
    File& file = files_[{std::string(trimTrailing(reference.fileName)), reference.form, reference.listing.get()}];
    if (file.fault) throw FatalError(*file.fault);
    if (file.series) return *file.series;
    try {
      file.series = openTimeSeries(reference);
    } catch (const FatalError& fault) {
      file.fault = fault;
      throw;
    }
    return *file.series;
  }

 private:
  struct File {
    std::unique_ptr<TimeSeriesObject> series;
    std::optional<FatalError> fault;
  };
  std::map<std::tuple<std::string, TextForm, const void*>, File> files_;
};

/// Finds the numbers of the items of a measure.
class ItemFinder final {
 public:
  explicit ItemFinder(UnknownItems unknown) : unknown_(unknown) {}

  void find(OutputMeasure& measure) {
    for (SeriesReference* const reference : {&measure.simulation, &measure.observation}) findItem(*reference);
    if (measure.weighting.isUsed()) findWeighting(measure);
  }

 private:
  void findItem(SeriesReference& reference) {
    if (reference.itemName.empty() || (reference.hasItemNo && unknown_ == UnknownItems::left)) return;
    try {
      reference.itemNo = itemNumber(files_.open(reference), reference);
      reference.hasItemNo = true;
    } catch (const FatalError&) {
      if (unknown_ == UnknownItems::refused) throw;
    }
  }

  void findWeighting(OutputMeasure& measure) {
    ObservationWeighting& weighting = measure.weighting;
    using Named = std::tuple<const std::string&, std::int32_t&, const std::string&>;
    for (const auto& [name, item, location] :
         {Named{weighting.weightName, weighting.weightItem, weighting.weightLocation},
          Named{weighting.errorName, weighting.errorItem, weighting.weightLocation},
          Named{weighting.qualityName, weighting.qualityItem, weighting.qualityLocation}}) {
      SeriesReference reference = measure.observation;
      reference.itemName = name;
      reference.hasItemNo = item != 0;
      reference.itemNo = item;
      reference.itemLocation = location;
      findItem(reference);
      item = reference.itemNo;
    }
    for (const auto& [item, location] :
         {std::pair{std::max(weighting.weightItem, weighting.errorItem), &weighting.weightLocation},
          std::pair{weighting.qualityItem, &weighting.qualityLocation}}) {
      if (item != measure.observation.itemNo || unknown_ == UnknownItems::left) continue;
      fatalError("Error: Weights of observations invalid for output measure " + measure.name,
                 fmt::format("{}expected another item than the observed one, item No. {}", *location, item));
    }
  }

  UnknownItems unknown_;
  NamedFiles files_;
};

}  // namespace

bool isItemCalled(std::string_view name, std::string_view written) {
  return std::ranges::any_of(kWaysToMean, [&](const auto& isMeant) { return isMeant(name, written); });
}

std::vector<std::int32_t> itemsCalled(const TimeSeriesObject& series, std::string_view written) {
  std::vector<std::int32_t> found;
  for (const auto& isMeant : kWaysToMean) {
    for (int item = 1; item <= series.itemCount(); ++item) {
      if (isMeant(series.itemName(item), written)) found.push_back(item);
    }
    if (!found.empty()) break;
  }
  return found;
}

std::int32_t itemNumber(const TimeSeriesObject& series, const SeriesReference& reference) {
  if (reference.itemName.empty()) return reference.itemNo;
  const std::vector<std::int32_t> found = itemsCalled(series, reference.itemName);
  if (found.empty()) refuseUnknown(series, reference);
  const bool isAmong = std::ranges::find(found, reference.itemNo) != found.end();
  if (reference.hasItemNo && isAmong) return reference.itemNo;
  const std::string name(trimTrailing(reference.fileName));
  const std::span<const std::int32_t> shown(found.data(), std::min(found.size(), kMostNumbers));
  const std::string numbers =
      fmt::format("No. {}{}", fmt::join(shown, ", "), found.size() > shown.size() ? ", ..." : "");
  if (reference.hasItemNo) {
    const bool isItem = reference.itemNo >= 1 && reference.itemNo <= series.itemCount();
    fatalError(withNumber("Error: Item No. % not found in ", reference.itemNo) + name,
               fmt::format("{}expected the item called {}, which is {}, found {}: leave one of the two keywords out",
                           reference.itemLocation, quotedForMessage(reference.itemName), numbers,
                           isItem ? "the number of " + quotedForMessage(series.itemName(reference.itemNo))
                                  : fmt::format("{} in a file of {}", reference.itemNo,
                                                countText(static_cast<std::size_t>(series.itemCount()), "item"))));
  }
  if (found.size() == 1) return found.front();
  fatalError(fmt::format("Error: Item {} is ambiguous in {}", quotedForMessage(reference.itemName), name),
             fmt::format("{}{} items are called so, {}: the number beside the name tells which is meant",
                         reference.itemLocation, found.size(), numbers));
}

std::vector<OutputMeasure> withItemNumbers(std::span<const OutputMeasure> measures, UnknownItems unknown) {
  std::vector<OutputMeasure> numbered(measures.begin(), measures.end());
  ItemFinder finder(unknown);
  for (OutputMeasure& measure : numbered) {
    if (measure.interfaceType == InterfaceType::timeSeries) finder.find(measure);
  }
  return numbered;
}

}  // namespace mirevo
