#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/time_series_object.h"

namespace mirevo {

/// A CF NetCDF file, read through netCDF-C. Its time variable is the one over a single dimension whose `units` are
/// "days|hours|minutes|seconds since DATE" (the one named like its dimension where there are several). Items are the
/// numeric variables over the time dimension, in file order; where a variable has one more dimension that is longer
/// than 1 (stations), each index of that is an item. `scale_factor` and `add_offset` are applied.
class NetcdfTimeSeries final : public TimeSeriesObject {
 public:
  NetcdfTimeSeries() = default;
  ~NetcdfTimeSeries() override;

  bool open(const std::string& fileName) override;
  const std::string& lastError() const override { return lastError_; }
  std::optional<DateRecord> startTime() const override;
  /// NaN: every variable may have a marker of its own (`_FillValue`, `missing_value`, the library's default fill), so
  /// all of them become NaN among the values.
  std::optional<float> deleteValue() const override;
  int itemCount() const override { return static_cast<int>(items_.size()); }
  std::string itemName(int item) const override;
  bool getData(int item) override;
  int timeStepCount() const override { return static_cast<int>(times_.size()); }
  std::span<const double> times() const override { return times_; }
  std::span<const float> values(int item) const override;

 private:
  struct Item {
    int variable = 0;
    int timePosition = 0;  ///< which of the variable's dimensions is the time
    int dimensionCount = 1;
    int stationPosition = -1;  ///< which of them is the station; -1: none
    std::size_t station = 0;   ///< index along it
    std::string name;
    std::vector<float> values;  ///< empty until getData()
  };

  void close();
  bool findTimeVariable(int& timeVariable);
  bool readTimes(int timeVariable);
  bool findItems(int timeVariable);
  bool readValues(Item& item);
  bool fail(const std::string& what);
  /// Whether a call of the library succeeded; keeps "file: what: the library's message" if not.
  bool succeeded(int status, const std::string& what);

  int file_ = -1;  ///< the library's handle; -1: not open
  int timeDimension_ = -1;
  std::string fileName_;
  std::string lastError_;
  std::int64_t startSecond_ = 0;  ///< of the first step, whole seconds
  std::vector<double> times_;
  std::vector<Item> items_;
};

}  // namespace mirevo
