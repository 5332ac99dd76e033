#include "platform/series/stored_time_series.h"

#include <limits>

#include "common/calendar.h"
#include "platform/series/printed_units.h"

namespace mirevo {

std::optional<DateRecord> StoredTimeSeries::startTime() const {
  if (times_.empty()) return std::nullopt;
  return dateOfSecond(startSecond_);
}

std::string StoredTimeSeries::itemName(int item) const {
  return hasItem(item) ? items_[static_cast<std::size_t>(item - 1)].name : std::string();
}

std::string StoredTimeSeries::itemUnit(int item) const {
  return hasItem(item) ? items_[static_cast<std::size_t>(item - 1)].unit : std::string();
}

bool StoredTimeSeries::getData(int item) {
  if (!hasItem(item)) {
    lastError_ = sourceName() + ": no item " + std::to_string(item);
    return false;
  }
  const auto place = static_cast<std::size_t>(item - 1);
  return items_[place].values.size() == times_.size() || readItem(place);
}

std::span<const float> StoredTimeSeries::values(int item) const {
  if (!hasItem(item)) return {};
  return items_[static_cast<std::size_t>(item - 1)].values;
}

std::span<const double> StoredTimeSeries::exactValues(int item) {
  if (!getData(item)) return {};
  const auto place = static_cast<std::size_t>(item - 1);
  Item& read = items_[place];
  if (read.exact.size() == times_.size()) return read.exact;
  read.exact = readExactItem(place);
  for (std::size_t k = 0; k < read.values.size(); ++k) {
    if (isMissing(read.values[k], deleteValue())) read.exact[k] = std::numeric_limits<double>::quiet_NaN();
  }
  return read.exact;
}

std::vector<double> StoredTimeSeries::units(int item) {
  const std::span<const double> values = exactValues(item);
  if (values.empty()) return {};
  std::vector<double> units = storedUnits(static_cast<std::size_t>(item - 1), values);
  return units.empty() ? printedUnits(values) : units;
}

}  // namespace mirevo
