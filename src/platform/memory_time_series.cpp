#include "platform/memory_time_series.h"

#include <cassert>
#include <limits>
#include <utility>

namespace mirevo {

MemoryTimeSeries::MemoryTimeSeries(DateRecord start, std::vector<double> times, std::vector<std::vector<float>> items,
                                   std::optional<float> deleteValue)
    : start_(start),
      times_(std::move(times)),
      items_(std::move(items)),
      // No number equals NaN: with it only NaN itself marks a gap.
      deleteValue_(deleteValue.value_or(std::numeric_limits<float>::quiet_NaN())) {
  for ([[maybe_unused]] const auto& item : items_) assert(item.size() == times_.size());
}

bool MemoryTimeSeries::open(const std::string& /*fileName*/) {
  return true;
}

std::optional<DateRecord> MemoryTimeSeries::startTime() const {
  if (times_.empty()) return std::nullopt;
  return start_;
}

std::string MemoryTimeSeries::itemName(int item) const {
  return "item " + std::to_string(item);
}

bool MemoryTimeSeries::getData(int item) {
  if (item >= 1 && item <= itemCount()) return true;
  lastError_ = "no item " + std::to_string(item);
  return false;
}

std::span<const float> MemoryTimeSeries::values(int item) const {
  if (item < 1 || item > itemCount()) return {};
  return items_[static_cast<std::size_t>(item - 1)];
}

}  // namespace mirevo
