#include "platform/series/grdc_time_series.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/take_text.h"
#include "common/text.h"
#include "platform/series/file_zone.h"
#include "platform/series/series_reading.h"

namespace mirevo {
namespace {

constexpr std::string_view kHeading = "YYYY-MM-DD;hh:mm;";
constexpr double kMissing = -999.0;

/// What a comment says behind a name and its colon, "# Data lines: 441"; empty for another comment.
std::string_view saidOf(std::string_view comment, std::string_view name) {
  comment = trim(comment.substr(1));
  return takeText(comment, name) && takeText(comment, ":") ? trim(comment) : std::string_view();
}

}  // namespace

bool GrdcTimeSeries::fits(std::string_view head) {
  for (const std::string_view line : splitLines(head)) {
    if (!line.starts_with('#')) return line.starts_with(kHeading);
  }
  return false;
}

bool GrdcTimeSeries::read(FileParts& parts) {
  std::string unit;
  std::optional<std::int32_t> promised;
  std::vector<Column> columns;
  Seconds seconds;
  std::size_t number = 0;
  while (const auto next = parts.nextLine()) {
    const std::string_view line = *next;
    ++number;
    if (trim(line).empty()) continue;
    if (!columns.empty()) {
      if (!readRow(line, number, seconds, columns)) return false;
    } else if (line.starts_with('#')) {
      for (const char* name : {"Unit of measure", "Unit"}) {
        if (unit.empty()) unit = decodeText(saidOf(line, name)).text;
      }
      if (!promised) promised = parseInteger(saidOf(line, "Data lines"));
    } else if (!line.starts_with(kHeading)) {
      return fail(number, fmt::format("the row \"{} ...\" of a GRDC station file", kHeading), quotedForMessage(line));
    } else {
      for (const std::string_view name : splitAt(line.substr(kHeading.size()), ';')) {
        const bool isFlag = trim(name) == "Flag";
        columns.push_back({.name = std::string(trim(name)), .unit = isFlag ? "" : unit});
        if (columns.back().name.empty()) return fail(number, "names of columns", quotedForMessage(line));
      }
    }
  }
  if (!parts.fault().empty()) return failToRead(parts.fault());
  endsLine_ = number == 0 || parts.endsLine();
  number = std::max<std::size_t>(number, 1);
  if (columns.empty()) return fail(number, fmt::format("the row \"{} ...\"", kHeading), "the end of the file");
  if (promised && seconds.size() != static_cast<std::size_t>(*promised)) {
    return fail(
        number,
        fmt::format("{} as its comment \"Data lines\" says",
                    countText(static_cast<std::size_t>(std::max(*promised, 0)), "row")),
        fmt::format("{}{}", seconds.size(),
                    seconds.size() < static_cast<std::size_t>(std::max(*promised, 0)) ? ": the file is cut off" : ""));
  }
  gather({std::move(seconds)}, std::move(columns));
  return true;
}

bool GrdcTimeSeries::readRow(std::string_view line, std::size_t number, Seconds& seconds,
                             std::vector<Column>& columns) {
  const std::vector<std::string_view> cells = splitAt(line, ';');
  if (cells.size() != columns.size() + 2) {
    return fail(number, fmt::format("{} as in the row of names", countText(columns.size() + 2, "column")),
                std::to_string(cells.size()));
  }
  std::string time(trim(cells[0]));
  if (time.ends_with("-00")) time.back() = '1';
  if (const std::string_view clock = trim(cells[1]); clock != "--:--" && !clock.empty())
    time += fmt::format(" {}", clock);
  const auto second = parseZonedTime(time);
  if (!second || second->offsetMinutes)
    return fail(number, "a valid time like 2001-01-31;12:30", quotedForMessage(line));
  if (!seconds.empty() && second->second <= seconds.back()) {
    return fail(number, "a time later than that of the row before", quotedForMessage(time));
  }
  seconds.push_back(second->second);
  for (std::size_t i = 0; i < columns.size(); ++i) {
    const std::string_view cell = trim(cells[i + 2]);
    const auto value = parseReal(cell);
    if (!value || std::isinf(static_cast<float>(*value))) {
      return fail(number, fmt::format("a number in the column {}", columns[i].name), quotedForMessage(cell));
    }
    columns[i].values.push_back(*value == kMissing ? std::numeric_limits<double>::quiet_NaN() : *value);
  }
  return true;
}

}  // namespace mirevo
