#pragma once

#include <vector>

#include <gtest/gtest.h>

#include "platform/series/time_series_object.h"

namespace mirevo {

/// The item's values, -999999 where one is missing (NaN does not compare).
inline std::vector<float> valuesOf(TimeSeriesObject& series, int item) {
  EXPECT_TRUE(series.getData(item)) << series.lastError();
  const auto values = series.values(item);
  std::vector<float> shown(values.begin(), values.end());
  for (float& value : shown) {
    if (isMissing(value, series.deleteValue())) value = -999999.0F;
  }
  return shown;
}

inline std::vector<double> timesOf(const TimeSeriesObject& series) {
  return {series.times().begin(), series.times().end()};
}

}  // namespace mirevo
