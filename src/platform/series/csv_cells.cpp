#include "platform/series/csv_cells.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "common/text.h"

namespace mirevo::csv {
namespace {

/// The number of two digits, or one above 99 if either is not a digit.
int twoDigits(const char* at) {
  const unsigned tens = static_cast<unsigned char>(at[0]) - unsigned{'0'};
  const unsigned ones = static_cast<unsigned char>(at[1]) - unsigned{'0'};
  return tens < 10 && ones < 10 ? static_cast<int>(tens * 10 + ones) : 1000;
}

}  // namespace

int countSeparators(const char* begin, const char* end, char separator, bool mayHaveQuotes) {
  if (!mayHaveQuotes) return static_cast<int>(std::count(begin, end, separator));
  int count = 0;
  for (begin = endOfCell(begin, end, separator); begin != end; begin = endOfCell(begin + 1, end, separator)) ++count;
  return count;
}

const char* previousCell(const char* cell, char separator) {
  bool quoted = false;
  --cell;  // to the separator before this cell
  while (quoted || cell[-1] != separator) {
    --cell;
    if (*cell == '"') quoted = !quoted;
  }
  return cell;
}

std::string_view cellText(const char* begin, const char* end) {
  std::string_view text = trim(std::string_view(begin, static_cast<std::size_t>(end - begin)));
  if (text.size() >= 2 && text.front() == '"' && text.back() == '"') text = trim(text.substr(1, text.size() - 2));
  return text;
}

std::optional<std::int64_t> DateScanner::scanDay(const char* at) {
  if (std::memcmp(at, lastDay_.data(), lastDay_.size()) == 0) return lastDaySecond_;
  const int century = twoDigits(at);
  const int yearOfCentury = twoDigits(at + 2);
  DateRecord date{};
  date[date_field::kYear] = century * 100 + yearOfCentury;
  date[date_field::kMonth] = twoDigits(at + 5);
  date[date_field::kDay] = twoDigits(at + 8);
  if (century > 99 || yearOfCentury > 99 || at[4] != '-' || at[7] != '-' || !isValidDate(date)) return std::nullopt;
  std::memcpy(lastDay_.data(), at, lastDay_.size());
  lastDaySecond_ = secondNumber(date);
  return lastDaySecond_;
}

std::optional<std::int64_t> DateScanner::scan(const char*& at, const char* end) {
  constexpr std::ptrdiff_t kDayLength = 10;
  constexpr std::ptrdiff_t kMinutesLength = 16;
  constexpr std::ptrdiff_t kSecondsLength = 19;
  if (end - at < kDayLength) return std::nullopt;
  const std::optional<std::int64_t> day = scanDay(at);
  if (!day) return std::nullopt;
  const char* const date = at;
  at += kDayLength;
  if (at == end || (*at != ' ' && *at != 'T')) return day;
  if (*at == ' ' && (end - at < 2 || at[1] < '0' || at[1] > '9')) return day;  // a blank after the date, without a time
  if (end - date < kMinutesLength || date[13] != ':') return std::nullopt;
  const int hour = twoDigits(date + 11);
  const int minute = twoDigits(date + 14);
  if (hour > 24 || minute > 60 || (hour == 24 && minute != 0)) return std::nullopt;
  at = date + kMinutesLength;
  int second = 0;
  if (at != end && *at == ':') {
    if (end - date < kSecondsLength) return std::nullopt;
    second = twoDigits(date + 17);
    if (second > 59) return std::nullopt;
    at = date + kSecondsLength;
  }
  return *day + (std::int64_t{hour} * 60 + minute) * 60 + second;
}

std::optional<std::int64_t> DateScanner::scanCell(const char*& at, const char* end) {
  while (at != end && *at == ' ') ++at;
  const bool quoted = at != end && *at == '"';
  if (quoted) ++at;
  const std::optional<std::int64_t> second = scan(at, end);
  if (!second) return std::nullopt;
  if (quoted) {
    if (at == end || *at != '"') return std::nullopt;
    ++at;
  }
  while (at != end && *at == ' ') ++at;
  return second;
}

std::optional<double> parseExactCell(const char* begin, const char* end) {
  const std::string_view text = cellText(begin, end);
  // "-nan" is how the C library prints a NaN whose sign bit is set.
  if (text.empty() || text == "NA" || equalIgnoringCase(text, "nan") || equalIgnoringCase(text, "-nan")) {
    return std::numeric_limits<double>::quiet_NaN();
  }
  const std::optional<double> number = parseReal(text);
  if (!number || std::isinf(static_cast<float>(*number))) return std::nullopt;
  return number;
}

std::optional<float> parseCell(const char* begin, const char* end) {
  const std::optional<double> number = parseExactCell(begin, end);
  return number ? std::optional(static_cast<float>(*number)) : std::nullopt;
}

}  // namespace mirevo::csv
