#include "platform/series/memory_time_series.h"

#include <cassert>
#include <limits>
#include <utility>

#include "common/calendar.h"

namespace mirevo {

MemoryTimeSeries::MemoryTimeSeries(DateRecord start, std::vector<double> times, std::vector<std::vector<float>> items,
                                   std::optional<float> deleteValue)
    // No value equals NaN, so that without a delete value only NaN marks a gap.
    : deleteValue_(deleteValue.value_or(std::numeric_limits<float>::quiet_NaN())) {
  startSecond_ = secondNumber(start);
  times_ = std::move(times);
  for (std::vector<float>& values : items) {
    assert(values.size() == times_.size());
    items_.push_back({"item " + std::to_string(items_.size() + 1), std::move(values)});
  }
}

bool MemoryTimeSeries::open(const std::string& /*fileName*/) {
  return true;
}

bool MemoryTimeSeries::readItem(std::size_t place) {
  lastError_ = sourceName_ + ": no values of " + items_[place].name;
  return false;
}

std::vector<double> MemoryTimeSeries::readExactItem(std::size_t place) {
  return {items_[place].values.begin(), items_[place].values.end()};
}

}  // namespace mirevo
