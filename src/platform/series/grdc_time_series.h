#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/series/file_parts.h"
#include "platform/series/gathered_series.h"

namespace mirevo {

/// A station file of the Global Runoff Data Centre: `#` comments, the row "YYYY-MM-DD;hh:mm; Value" (or "Original;
/// Calculated; Flag") and a row per day or month. Items are the columns behind the time. Source: GRDC, Federal
/// Institute of Hydrology, Koblenz, "GRDC export format" in the header of every station file.
///
/// -999 is missing. The mean of a month is at its first day: a day 00, as older files have it, is read as 01.
class GrdcTimeSeries final : public GatheredSeries {
 public:
  explicit GrdcTimeSeries(std::shared_ptr<SeriesReading> reading = nullptr) : GatheredSeries(std::move(reading)) {}

  /// Whether a file that begins like this is one, by its first row after the comments.
  static bool fits(std::string_view head);

 private:
  bool read(FileParts& parts) override;
  bool readRow(std::string_view line, std::size_t number, Seconds& seconds, std::vector<Column>& columns);
};

}  // namespace mirevo
