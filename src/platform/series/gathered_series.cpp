#include "platform/series/gathered_series.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/calendar.h"

namespace mirevo {

bool GatheredSeries::open(const std::string& fileName) {
  FileParts parts(fileName, reading_);
  return readAll(fileName, parts);
}

bool GatheredSeries::parse(std::string sourceName, std::string_view content) {
  FileParts parts(content);
  return readAll(std::move(sourceName), parts);
}

bool GatheredSeries::readAll(std::string sourceName, FileParts& parts) {
  forget();
  sourceName_ = std::move(sourceName);
  endsLine_ = true;
  return read(parts);
}

void GatheredSeries::forget() {
  lastError_.clear();
  doubts_.clear();
  startSecond_ = 0;
  times_.clear();
  items_.clear();
  values_.clear();
  axisOf_.clear();
  steps_.clear();
}

void GatheredSeries::gather(const std::vector<Seconds>& axes, std::vector<Column> columns) {
  std::vector<bool> isWanted(axes.size(), wanted_.empty());
  for (const int item : wanted_) {
    const auto place = static_cast<std::size_t>(item) - 1;
    if (place < columns.size()) isWanted[columns[place].axis] = true;
  }
  if (std::find(isWanted.begin(), isWanted.end(), true) == isWanted.end()) isWanted.assign(axes.size(), true);
  Seconds all;
  const Seconds* first = nullptr;
  bool differ = false;
  for (std::size_t i = 0; i < axes.size(); ++i) {
    const Seconds& axis = axes[i];
    if (!isWanted[i]) continue;
    if (first == nullptr) first = &axis;
    differ = differ || axis != *first;
    if (axis == all) continue;
    Seconds merged;
    merged.reserve(all.size() + axis.size());
    std::set_union(all.begin(), all.end(), axis.begin(), axis.end(), std::back_inserter(merged));
    all = std::move(merged);
  }
  if (!all.empty()) startSecond_ = all.front();
  times_.reserve(all.size());
  for (const std::int64_t second : all) {
    times_.push_back(static_cast<double>(second - startSecond_) / static_cast<double>(kSecondsOfDay));
  }
  if (differ && !wanted_.empty()) {
    doubts_.push_back(sourceName_ +
                      ": the series that are read have times of their own, and none has a value at those of another "
                      "alone: it is not interpolated there. A file for each gives each its own times");
  }
  for (std::size_t i = 0; i < axes.size(); ++i) {
    std::vector<std::uint32_t>& steps = steps_.emplace_back();
    if (!isWanted[i]) continue;
    steps.reserve(axes[i].size());
    auto step = all.begin();
    for (const std::int64_t second : axes[i]) {
      step = std::lower_bound(step, all.end(), second);
      steps.push_back(static_cast<std::uint32_t>(step - all.begin()));
    }
  }
  for (Column& column : columns) {
    items_.push_back({std::move(column.name)});
    items_.back().unit = std::move(column.unit);
    axisOf_.push_back(column.axis);
    values_.push_back(std::move(column.values));
  }
}

bool GatheredSeries::readItem(std::size_t place) {
  const std::vector<double> exact = readExactItem(place);
  items_[place].values.assign(exact.begin(), exact.end());
  return true;
}

std::vector<double> GatheredSeries::readExactItem(std::size_t place) {
  std::vector<double> exact(times_.size(), std::numeric_limits<double>::quiet_NaN());
  const std::vector<std::uint32_t>& steps = steps_[axisOf_[place]];
  for (std::size_t i = 0; i < steps.size(); ++i) exact[steps[i]] = values_[place][i];
  return exact;
}

bool GatheredSeries::fail(std::size_t line, std::string_view expected, std::string_view found) {
  const std::string source = sourceName_;
  forget();
  lastError_ = fmt::format("{}:{}: expected {}, found {}", source, line, expected, found);
  return false;
}

bool GatheredSeries::failToRead(std::string_view fault) {
  forget();
  lastError_ = fmt::format("{}: {}", sourceName_, fault);
  return false;
}

}  // namespace mirevo
