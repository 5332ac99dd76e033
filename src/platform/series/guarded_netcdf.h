#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/series/series_reading.h"
#include "platform/series/stored_time_series.h"

namespace mirevo {

/// A NetcdfTimeSeries that is read in another process, see NetcdfReader: the same values, bit for bit.
class GuardedNetcdf final : public StoredTimeSeries {
 public:
  explicit GuardedNetcdf(std::shared_ptr<SeriesReading> reading) : reading_(std::move(reading)) {}

  bool open(const std::string& fileName) override;
  void willRead(std::span<const int> items) override { wanted_.assign(items.begin(), items.end()); }
  std::optional<float> deleteValue() const override;

 private:
  bool readItem(std::size_t place) override;
  /// Not called, as readItem() has stored them.
  std::vector<double> readExactItem(std::size_t place) override { return items_[place].exact; }
  std::vector<double> storedUnits(std::size_t place, std::span<const double> values) override;
  const std::string& sourceName() const override { return fileName_; }

  std::shared_ptr<SeriesReading> reading_;
  std::string fileName_;
  std::vector<int> wanted_;
  std::vector<std::optional<NetcdfReader::Item>> read_;  ///< one per item: what open() has read of those wanted
  std::vector<NetcdfUnit> units_;                        ///< one per item
};

}  // namespace mirevo
