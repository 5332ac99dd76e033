#include "platform/series/rdb_time_series.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/take_text.h"
#include "common/text.h"
#include "platform/series/quality_codes.h"
#include "platform/series/series_reading.h"

namespace mirevo {
namespace {

constexpr double kNone = std::numeric_limits<double>::quiet_NaN();
constexpr double kNoData = -999999.0;  ///< of the USGS's services

/// "14n": a width and s (text), n (number) or d (date); the width may be absent.
bool isFormat(std::string_view cell) {
  takeDigits(cell);
  return cell == "s" || cell == "n" || cell == "d" || cell == "S" || cell == "N" || cell == "D";
}

bool areFormats(std::string_view line) {
  const std::vector<std::string_view> cells = splitAt(line, '\t');
  return cells.size() > 1 &&
         std::all_of(cells.begin(), cells.end(), [](std::string_view cell) { return isFormat(trim(cell)); });
}

std::string columnsText(std::size_t count) {
  return countText(count, "column");
}

}  // namespace

bool RdbTimeSeries::fits(std::string_view head) {
  bool isAfterNames = false;
  for (const std::string_view line : splitLines(head)) {
    if (line.starts_with('#')) continue;
    if (isAfterNames) return areFormats(line);
    if (line.find('\t') == std::string_view::npos) return false;
    isAfterNames = true;
  }
  return false;
}

void RdbTimeSeries::clear() {
  table_ = {};
  zone_ = {};
  firstZone_.clear();
  comments_.clear();
  sites_.clear();
  axes_.clear();
  columns_.clear();
}

bool RdbTimeSeries::read(FileParts& parts) {
  clear();
  enum class Expected { names, formats, rows } expected = Expected::names;
  std::size_t number = 0;
  while (const auto next = parts.nextLine()) {
    const std::string_view line = *next;
    ++number;
    if (line.starts_with('#')) {
      if (expected == Expected::formats) return fail(number, "the row of formats, as 5s, 15s, 20d", "a comment");
      comments_.emplace_back(line);
      expected = Expected::names;
    } else if (trim(line).empty()) {
      continue;
    } else if (expected == Expected::names) {
      if (!readNames(line, number)) return false;
      expected = Expected::formats;
    } else if (expected == Expected::formats) {
      if (!readFormats(line, number)) return false;
      expected = Expected::rows;
    } else if (!readRow(line, number)) {
      return false;
    }
  }
  if (!parts.fault().empty()) return failToRead(parts.fault());
  endsLine_ = number == 0 || parts.endsLine();
  if (expected == Expected::formats || (expected == Expected::names && axes_.empty())) {
    return fail(std::max<std::size_t>(number, 1),
                expected == Expected::names ? "a row of column names" : "the row of formats, as 5s, 15s, 20d",
                "the end of the file");
  }
  finish();
  return true;
}

bool RdbTimeSeries::readNames(std::string_view line, std::size_t number) {
  table_ = {};
  for (const std::string_view name : splitAt(line, '\t')) {
    table_.names.emplace_back(trim(name));
    if (trim(name).empty()) return fail(number, "a name for each column", quotedForMessage(line));
  }
  return table_.names.size() > 1 || fail(number, "column names separated by tabs", quotedForMessage(line));
}

bool RdbTimeSeries::readFormats(std::string_view line, std::size_t number) {
  const std::vector<std::string_view> formats = splitAt(line, '\t');
  if (!areFormats(line)) return fail(number, "the row of formats, as 5s, 15s, 20d", quotedForMessage(line));
  if (formats.size() != table_.names.size()) {
    return fail(number, columnsText(table_.names.size()) + " as in the row of names", std::to_string(formats.size()));
  }
  const auto columnOf = [&](std::string_view name) {
    const auto found = std::find(table_.names.begin(), table_.names.end(), name);
    return found == table_.names.end() ? kNoColumn : static_cast<std::size_t>(found - table_.names.begin());
  };
  const auto letterOf = [&](std::size_t column) { return toLowerAscii(trim(formats[column])).back(); };
  std::size_t time = 0;
  while (time < formats.size() && letterOf(time) != 'd') ++time;
  if (time == formats.size()) return fail(number, "a column of format d, the time", quotedForMessage(line));
  table_.time = time;
  table_.site = columnOf("site_no");
  const std::string& name = table_.names[time];
  if (name.ends_with("_dt")) table_.timeOfDay = columnOf(name.substr(0, name.size() - 2) + "tm");
  for (std::size_t column = 0; column < formats.size(); ++column) {
    const std::string& each = table_.names[column];
    if (each == "tz_cd" || each.ends_with("_tz_cd")) table_.zone = column;
    if (column == time || column == table_.site || column == table_.timeOfDay) continue;
    if (letterOf(column) != 'n' && !each.ends_with("_va")) continue;
    const std::string stem = each.ends_with("_va") ? each.substr(0, each.size() - 3) : each;
    table_.items.emplace_back(column, false);
    if (const std::size_t code = columnOf(stem + "_cd"); code != kNoColumn) table_.items.emplace_back(code, true);
  }
  return !table_.items.empty() || fail(number, "a column of values, of format n", quotedForMessage(line));
}

std::size_t RdbTimeSeries::axisOfSite(const std::string& name) {
  auto site = sites_.empty() || sites_.back().name != name
                  ? std::find_if(sites_.begin(), sites_.end(), [&](const Site& each) { return each.name == name; })
                  : sites_.end() - 1;
  if (site == sites_.end()) {
    sites_.push_back({name, {}});
    axes_.emplace_back();
    site = sites_.end() - 1;
  }
  return static_cast<std::size_t>(site - sites_.begin());
}

bool RdbTimeSeries::readRow(std::string_view line, std::size_t number) {
  const std::vector<std::string_view> cells = splitAt(line, '\t');
  if (cells.size() != table_.names.size()) {
    return fail(number, columnsText(table_.names.size()) + " as in the row of names", std::to_string(cells.size()));
  }
  std::string text(trim(cells[table_.time]));
  if (table_.timeOfDay != kNoColumn && !trim(cells[table_.timeOfDay]).empty()) {
    text += fmt::format(" {}", trim(cells[table_.timeOfDay]));
  }
  auto time = parseZonedTime(text);
  if (!time) return fail(number, "a valid time like 2001-01-31 12:30", quotedForMessage(text));
  if (table_.zone != kNoColumn) {
    const std::string_view zone = trim(cells[table_.zone]);
    if (firstZone_.empty()) firstZone_ = zone;
    time->offsetMinutes = offsetOfZone(zone);
    if (!time->offsetMinutes && zone != firstZone_) {
      return fail(number, fmt::format("a time in {}, as above, or in a zone that is known", firstZone_),
                  quotedForMessage(zone));
    }
  }
  const auto second = zone_.take(*time);
  if (!second) return fail(number, "times that all have a known zone, or none", quotedForMessage(text));
  const std::size_t axis = axisOfSite(table_.site == kNoColumn ? std::string() : std::string(trim(cells[table_.site])));
  Seconds& seconds = axes_[axis];
  if (!seconds.empty() && *second <= seconds.back()) {
    return fail(number, "a time later than that of the row before", quotedForMessage(text));
  }
  for (const auto& [column, isCode] : table_.items) {
    auto [place, isNew] = sites_[axis].columns.try_emplace(table_.names[column], columns_.size());
    if (isNew) {
      columns_.push_back(
          {.name = table_.names[column], .unit = isCode ? "" : unitOf(table_.names[column]), .axis = axis});
    }
    std::vector<double>& values = columns_[place->second].values;
    values.resize(seconds.size(), kNone);
    const std::string_view cell = trim(cells[column]);
    if (isCode) {
      values.push_back(qualityCode(cell));
      continue;
    }
    const auto value = parseReal(cell);
    if (!cell.empty() && !isRemarkInPlaceOfValue(cell) && (!value || std::isinf(static_cast<float>(*value)))) {
      return fail(number, fmt::format("a number in the column {}", table_.names[column]), quotedForMessage(cell));
    }
    values.push_back(!value || *value == kNoData ? kNone : *value);
  }
  seconds.push_back(*second);
  return true;
}

std::string RdbTimeSeries::unitOf(std::string_view column) const {
  // "#    01   00060     00003     Discharge, cubic feet per second (Mean)" is of the column 01_00060_00003.
  for (const std::string& comment : comments_) {
    std::string_view rest = trim(std::string_view(comment).substr(1));
    std::string joined;
    while (!rest.empty() && joined.size() < column.size()) {
      const std::size_t end = std::min(rest.find_first_of(" \t"), rest.size());
      if (!joined.empty()) joined += '_';
      joined += rest.substr(0, end);
      rest = trim(rest.substr(end));
    }
    if (joined != column) continue;
    if (rest.ends_with(')')) rest = trim(rest.substr(0, rest.rfind('(')));
    const std::size_t comma = rest.rfind(", ");
    return comma == std::string_view::npos ? std::string() : std::string(rest.substr(comma + 2));
  }
  return {};
}

void RdbTimeSeries::finish() {
  for (Seconds& axis : axes_) {
    for (std::int64_t& second : axis) second += zone_.shiftSeconds();
  }
  for (Column& column : columns_) {
    column.values.resize(axes_[column.axis].size(), kNone);
    if (sites_.size() > 1) column.name = sites_[column.axis].name + " " + column.name;
  }
  // A table without rows has items nevertheless.
  if (columns_.empty()) {
    axes_.resize(1);
    for (const auto& [column, isCode] : table_.items) {
      columns_.push_back({.name = table_.names[column], .unit = isCode ? "" : unitOf(table_.names[column])});
    }
  }
  if (const std::string doubt = zone_.doubt(); !doubt.empty()) doubts_.push_back(sourceName_ + ": " + doubt);
  gather(axes_, std::move(columns_));
}

}  // namespace mirevo
