#pragma once

#include <string>
#include <vector>

#include "platform/series/stored_time_series.h"

namespace mirevo {

/// Series given in memory, for tests.
class MemoryTimeSeries final : public StoredTimeSeries {
 public:
  /// `times` in days since `start`, strictly increasing; `items[i]` holds the values of item i + 1, one per time.
  MemoryTimeSeries(DateRecord start, std::vector<double> times, std::vector<std::vector<float>> items,
                   std::optional<float> deleteValue = std::nullopt);

  bool open(const std::string& fileName) override;
  std::optional<float> deleteValue() const override { return deleteValue_; }

 private:
  bool readItem(std::size_t place) override;
  std::vector<double> readExactItem(std::size_t place) override;
  const std::string& sourceName() const override { return sourceName_; }

  std::string sourceName_ = "series in memory";
  std::optional<float> deleteValue_;
};

}  // namespace mirevo
