#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/series/time_series_object.h"

namespace mirevo {

/// What all series formats have in common: a time axis and items in memory, filled by open() and readItem() of the
/// format.
class StoredTimeSeries : public TimeSeriesObject {
 public:
  const std::string& lastError() const final { return lastError_; }
  std::optional<DateRecord> startTime() const final;
  int itemCount() const final { return static_cast<int>(items_.size()); }
  std::string itemName(int item) const final;
  std::string itemUnit(int item) const final;
  bool getData(int item) final;
  int timeStepCount() const final { return static_cast<int>(times_.size()); }
  std::span<const double> times() const final { return times_; }
  std::span<const float> values(int item) const final;
  std::span<const double> exactValues(int item) final;
  std::vector<double> units(int item) final;

 protected:
  struct Item {
    std::string name;
    std::vector<float> values = {};  ///< one per time step; empty until getData()
    std::vector<double> exact = {};  ///< one per time step; empty until exactValues()
    std::string unit = {};
  };

  /// Reads the values of an item, given by its 0-based index; false, with lastError_ set and no values, when that
  /// fails.
  virtual bool readItem(std::size_t place) = 0;
  /// The values of an item that readItem() could read, in 64 bits; those that are missing need no mark.
  virtual std::vector<double> readExactItem(std::size_t place) = 0;
  /// The units of an item that is not made of decimal digits; empty for one that is.
  virtual std::vector<double> storedUnits(std::size_t /*place*/, std::span<const double> /*values*/) { return {}; }
  /// The name of the source, for messages.
  virtual const std::string& sourceName() const = 0;

  std::string lastError_;
  std::int64_t startSecond_ = 0;  ///< secondNumber() of the first step, whole seconds
  std::vector<double> times_;     ///< days since startSecond_
  std::vector<Item> items_;

 private:
  bool hasItem(int item) const { return item >= 1 && item <= itemCount(); }
};

}  // namespace mirevo
