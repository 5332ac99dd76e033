#include "platform/series/guarded_netcdf.h"

#include <limits>

#include "common/calendar.h"

namespace mirevo {

bool GuardedNetcdf::open(const std::string& fileName) {
  lastError_.clear();
  times_.clear();
  items_.clear();
  read_.clear();
  fileName_ = fileName;
  auto content = reading_->netcdf.read(fileName, wanted_, reading_->watch, lastError_);
  if (!content) return false;
  if (content->start) startSecond_ = secondNumber(*content->start);
  times_ = std::move(content->times);
  for (std::size_t i = 0; i < content->names.size(); ++i) {
    items_.push_back({std::move(content->names[i])});
    items_.back().unit = std::move(content->units[i]);
  }
  units_.assign(items_.size(), {});
  read_.resize(items_.size());
  auto next = content->items.begin();
  for (const int item : wanted_) {
    const bool isThere = item >= 1 && item <= itemCount() && next != content->items.end();
    if (isThere) read_[static_cast<std::size_t>(item - 1)] = std::move(*next++);
  }
  return true;
}

std::optional<float> GuardedNetcdf::deleteValue() const {
  return std::numeric_limits<float>::quiet_NaN();
}

bool GuardedNetcdf::readItem(std::size_t place) {
  std::optional<NetcdfReader::Item> read = std::exchange(read_[place], std::nullopt);
  if (!read) {
    const int item = static_cast<int>(place) + 1;
    auto content = reading_->netcdf.read(fileName_, std::span(&item, 1), reading_->watch, lastError_);
    if (!content) return false;
    if (content->items.empty() || content->times != times_) {
      lastError_ = fileName_ + ": the file has changed since it was opened";
      return false;
    }
    read = std::move(content->items.front());
  }
  if (!read->fault.empty()) {
    lastError_ = read->fault;
    return false;
  }
  Item& item = items_[place];
  item.values.reserve(read->values.size());
  for (const double value : read->values) item.values.push_back(static_cast<float>(value));
  item.exact = std::move(read->values);
  units_[place] = read->unit;
  return true;
}

std::vector<double> GuardedNetcdf::storedUnits(std::size_t place, std::span<const double> values) {
  return units_[place].unitsOf(values);
}

}  // namespace mirevo
