#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "common/date_record.h"
#include "platform/processes/helper_process.h"
#include "platform/series/netcdf_time_series.h"

namespace mirevo {

class ReadingWatch;

/// Reads NetCDF files in a process of its own, as a damaged file may make the library hang, crash or take all memory.
/// Time is limited by a ReadingWatch, or to kLongestReading where that has not begun; memory in proportion to the size
/// of the file. The process is started at the first file, reads many, and is replaced after any failure.
class NetcdfReader final {
 public:
  struct Item {
    std::vector<double> values;  ///< one per time step, NaN where one is missing
    NetcdfUnit unit;
    std::string fault;  ///< why it cannot be read; then it has no values
  };
  struct Content {
    std::optional<DateRecord> start;
    std::vector<double> times;
    std::vector<std::string> names;  ///< of all items
    std::vector<std::string> units;  ///< of their values, one per item; empty where the file says none
    std::vector<Item> items;         ///< those that were asked for
  };

  /// Opens a file as NetcdfTimeSeries does, reads these items, given by their numbers, as far as it has them, and
  /// closes it. Empty, with "file: why", when that fails. Once more if something else has killed the process.
  std::optional<Content> read(const std::string& path, std::span<const int> items, ReadingWatch& watch,
                              std::string& reason);
  /// Ends the process; the next file starts another one.
  void end() { helper_.end(); }

 private:
  std::optional<Content> readOnce(const std::string& path, std::span<const int> items, ReadingWatch& watch,
                                  std::string& reason);

  HelperProcess helper_;
};

}  // namespace mirevo
