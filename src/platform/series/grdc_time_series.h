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

struct SeriesReading;

/// A station file of the Global Runoff Data Centre: `#` comments, the row "YYYY-MM-DD;hh:mm; Value" (or "Original;
/// Calculated; Flag") and a row per day or month. Items are the columns behind the time. Source: GRDC, Federal
/// Institute of Hydrology, Koblenz, "GRDC export format" in the header of every station file.
///
/// -999 is missing. The mean of a month is at its first day: a day 00, as older files have it, is read as 01.
class GrdcTimeSeries final : public GatheredSeries {
 public:
  explicit GrdcTimeSeries(std::shared_ptr<SeriesReading> reading = nullptr) : reading_(std::move(reading)) {}

  bool open(const std::string& fileName) override;
  bool parse(std::string sourceName, std::string_view content);
  bool endsLine() const override { return endsLine_; }

  /// Whether a file that begins like this is one, by its first row after the comments.
  static bool fits(std::string_view head);

 private:
  bool read(std::string sourceName, FileParts& parts);
  bool readRow(std::string_view line, std::size_t number, Seconds& seconds, std::vector<Column>& columns);

  std::shared_ptr<SeriesReading> reading_;
  bool endsLine_ = true;
};

}  // namespace mirevo
