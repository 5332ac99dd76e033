#pragma once

#include <string_view>

#include "platform/series/time_series_object.h"
#include "require.h"

/// What TimeSeriesObject promises of a file that was opened, or refused.
inline void requirePromises(mirevo::TimeSeriesObject& series, bool isOpen, std::string_view name) {
  if (!isOpen) {
    require(series.lastError().starts_with(name) && series.timeStepCount() == 0);
    return;
  }
  const std::span<const double> times = series.times();
  require(times.size() == static_cast<std::size_t>(series.timeStepCount()));
  for (std::size_t step = 1; step < times.size(); ++step) require(times[step - 1] < times[step]);
  require(times.empty() || times[0] == 0.0);
  require(series.startTime().has_value() == !times.empty());
  const int count = series.itemCount() < 12 ? series.itemCount() : 12;
  for (int item = 1; item <= count; ++item) {
    require(!series.itemName(item).empty());
    if (!series.getData(item)) {
      require(series.lastError().starts_with(name));
      continue;
    }
    require(series.values(item).size() == times.size());
    require(series.exactValues(item).size() == times.size());
    require(series.units(item).size() == times.size());
  }
}
