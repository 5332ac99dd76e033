#pragma once

#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/series/file_parts.h"
#include "platform/series/file_zone.h"
#include "platform/series/gathered_series.h"

namespace mirevo {

/// A tab-delimited RDB file of the USGS: `#` comments, a row of column names, a row of formats ("5s 15s 20d 14n 10s"),
/// and a row per time; further tables may follow in the same way. Source: USGS, "Tab-delimited (RDB) format",
/// waterdata.usgs.gov, tab_delimited_format_info.
///
/// The time is the first column of format `d`, with that named `..._tm` if one belongs to a `..._dt`. Items are the
/// columns of format `n`, and those named `..._va`, and after each its qualifiers (`..._cd`) as a qualityCode(). Where
/// there are several sites, each has items of its own.
class RdbTimeSeries final : public GatheredSeries {
 public:
  explicit RdbTimeSeries(std::shared_ptr<SeriesReading> reading = nullptr) : GatheredSeries(std::move(reading)) {}

  /// Whether a file that begins like this is one: its first two rows after the comments are names and formats.
  static bool fits(std::string_view head);

 private:
  static constexpr std::size_t kNoColumn = static_cast<std::size_t>(-1);
  struct Table {
    std::vector<std::string> names;
    std::size_t time = 0;
    std::size_t timeOfDay = kNoColumn;
    std::size_t site = kNoColumn;
    std::size_t zone = kNoColumn;
    std::vector<std::pair<std::size_t, bool>> items;  ///< column, and whether it has qualifiers
  };
  struct Site {
    std::string name;
    std::map<std::string, std::size_t> columns;  ///< by name, the place among columns_
  };

  bool read(FileParts& parts) override;
  void clear();
  bool readNames(std::string_view line, std::size_t number);
  bool readFormats(std::string_view line, std::size_t number);
  bool readRow(std::string_view line, std::size_t number);
  std::size_t axisOfSite(const std::string& name);
  std::string unitOf(std::string_view column) const;
  void finish();

  Table table_;
  FileZone zone_;
  std::string firstZone_;
  std::vector<std::string> comments_;
  std::vector<Site> sites_;  ///< one per axis
  std::vector<Seconds> axes_;
  std::vector<Column> columns_;
};

}  // namespace mirevo
