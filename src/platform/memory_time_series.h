#pragma once

#include <string>
#include <vector>

#include "platform/time_series_object.h"

namespace mirevo {

/// A series that is given and not read: for tests, and for anything that computes a series itself.
class MemoryTimeSeries final : public TimeSeriesObject {
 public:
  /// `times` in days since `start`, strictly increasing; `items[i]` holds the values of item i + 1, one a time.
  MemoryTimeSeries(DateRecord start, std::vector<double> times, std::vector<std::vector<float>> items,
                   std::optional<float> deleteValue = std::nullopt);

  bool open(const std::string& fileName) override;
  const std::string& lastError() const override { return lastError_; }
  std::optional<DateRecord> startTime() const override;
  std::optional<float> deleteValue() const override { return deleteValue_; }
  int itemCount() const override { return static_cast<int>(items_.size()); }
  std::string itemName(int item) const override;
  bool getData(int item) override;
  int timeStepCount() const override { return static_cast<int>(times_.size()); }
  std::span<const double> times() const override { return times_; }
  std::span<const float> values(int item) const override;

 private:
  DateRecord start_;
  std::vector<double> times_;
  std::vector<std::vector<float>> items_;
  std::optional<float> deleteValue_;
  std::string lastError_;
};

}  // namespace mirevo
