#include "platform/series/stored_time_series.h"

#include "common/calendar.h"

namespace mirevo {

std::optional<DateRecord> StoredTimeSeries::startTime() const {
  if (times_.empty()) return std::nullopt;
  return dateOfSecond(startSecond_);
}

std::string StoredTimeSeries::itemName(int item) const {
  return hasItem(item) ? items_[static_cast<std::size_t>(item - 1)].name : std::string();
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

}  // namespace mirevo
