#include "platform/series/result_series.h"

#include <fmt/core.h>

#include "common/calendar.h"
#include "platform/series/printed_units.h"

namespace mirevo {

void ResultSeries::forget() {
  times_.clear();
  read_.clear();
  doubts_.clear();
  lastError_.clear();
}

bool ResultSeries::fail(std::string fault) {
  lastError_ = std::move(fault);
  return false;
}

bool ResultSeries::open(const std::string& fileName) {
  forget();
  fileName_ = fileName;
  if (file_.open(fileName) && readHeader()) return true;
  const std::string fault = lastError_.empty() ? file_.fault() : lastError_;
  forget();
  lastError_ = fmt::format("{}: {}", fileName_, fault);
  file_.close();
  return false;
}

bool ResultSeries::setTimes(std::span<const std::int64_t> seconds) {
  startSecond_ = seconds.empty() ? 0 : seconds.front();
  times_.reserve(seconds.size());
  for (std::size_t step = 0; step < seconds.size(); ++step) {
    if (step > 0 && seconds[step] <= seconds[step - 1]) {
      return fail(fmt::format("expected a time later than {} at step {}, found {}",
                              formatDate(dateOfSecond(seconds[step - 1])), step + 1,
                              formatDate(dateOfSecond(seconds[step]))));
    }
    times_.push_back(static_cast<double>(seconds[step] - startSecond_) / static_cast<double>(kSecondsOfDay));
  }
  return true;
}

std::optional<DateRecord> ResultSeries::startTime() const {
  if (times_.empty()) return std::nullopt;
  return dateOfSecond(startSecond_);
}

bool ResultSeries::getData(int item) {
  lastError_.clear();
  if (!hasItem(item)) return fail(fmt::format("{}: no item {}", fileName_, item));
  if (read_.contains(item)) return true;
  auto values = readValues(item);
  if (!values || values->size() != times_.size()) {
    return fail(fmt::format("{}: item No. {} ({}): {}", fileName_, item, itemName(item),
                            lastError_.empty() ? file_.fault() : lastError_));
  }
  Read& read = read_[item];
  read.values.assign(values->begin(), values->end());
  read.exact = std::move(*values);
  return true;
}

std::span<const float> ResultSeries::values(int item) const {
  const auto found = read_.find(item);
  return found == read_.end() ? std::span<const float>() : found->second.values;
}

std::span<const double> ResultSeries::exactValues(int item) {
  return getData(item) ? std::span<const double>(read_[item].exact) : std::span<const double>();
}

std::vector<double> ResultSeries::units(int item) {
  const std::span<const double> values = exactValues(item);
  return isSingle() ? singleUnits(values) : printedUnits(values);
}

}  // namespace mirevo
