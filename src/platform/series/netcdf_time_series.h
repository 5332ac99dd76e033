#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/series/stored_time_series.h"

namespace mirevo {

/// The unit of the numbers of an item, see TimeSeriesObject::units().
struct NetcdfUnit {
  enum class Kind : std::uint32_t { printed, single, scaled };
  Kind kind = Kind::printed;
  double scale = 1.0;  ///< of integers

  /// For these values; empty for numbers that may have been printed.
  std::vector<double> unitsOf(std::span<const double> values) const;
};

inline constexpr std::size_t kMostNetcdfSteps = std::size_t{1} << 27;
inline constexpr std::size_t kMostNetcdfItems = 1'000'000;

/// A CF NetCDF file, read through netCDF-C. Its time variable is the one over a single dimension whose `units` are
/// "days|hours|minutes|seconds since DATE" (the one named like its dimension where there are several). Items are the
/// numeric variables over the time dimension, in file order; where a variable has one more dimension that is longer
/// than 1 (stations), each index of that is an item. `scale_factor` and `add_offset` are applied.
class NetcdfTimeSeries final : public StoredTimeSeries {
 public:
  NetcdfTimeSeries() = default;
  ~NetcdfTimeSeries() override;

  bool open(const std::string& fileName) override;
  /// NaN: every variable may have markers of its own (`_FillValue`, `missing_value`, the library's default fill value)
  /// and limits (`valid_min`, `valid_max`, `valid_range`); what they mark is replaced by NaN.
  std::optional<float> deleteValue() const override;
  /// The values of an item, given by its 0-based index, unpacked; nothing, with the last error, when that fails.
  std::optional<std::vector<double>> readValues(std::size_t place);
  NetcdfUnit unitOf(std::size_t place) const;

 private:
  bool readItem(std::size_t place) override;
  std::vector<double> readExactItem(std::size_t place) override;
  std::vector<double> storedUnits(std::size_t place, std::span<const double> values) override;
  const std::string& sourceName() const override { return fileName_; }
  /// Where the values of an item are in the file.
  struct Place {
    int variable = 0;
    int timePosition = 0;  ///< index of the time dimension of the variable
    int dimensionCount = 1;
    int stationPosition = -1;  ///< index of the station dimension; -1: none
    std::size_t station = 0;   ///< index along the station dimension
  };

  void close();
  bool findTimeVariable(int& timeVariable);
  bool readTimes(int timeVariable);
  bool findItems(int timeVariable);
  bool fail(const std::string& what);
  /// Whether a call of the library succeeded; if not, stores "file: what: the library's message" as the last error.
  bool succeeded(int status, const std::string& what);

  int file_ = -1;  ///< the library's handle; -1: not open
  int timeDimension_ = -1;
  std::string fileName_;
  std::vector<Place> places_;  ///< one per item
};

}  // namespace mirevo
