#pragma once

#include <array>
#include <cstdint>
#include <cstring>
#include <optional>
#include <string_view>

#include "common/calendar.h"

/// The cells of one CSV line, as ranges of characters. A separator between quotes does not separate.
namespace mirevo::csv {

inline bool isBlank(char c) {
  return c == ' ' || c == '\t';
}

/// The end of the line that starts at `line`: its '\n', or `end`.
inline const char* endOfLine(const char* line, const char* end) {
  const void* newline = std::memchr(line, '\n', static_cast<std::size_t>(end - line));
  return newline != nullptr ? static_cast<const char*>(newline) : end;
}

/// The end of the line without a carriage return before it.
inline const char* trimReturn(const char* line, const char* lineEnd) {
  return lineEnd > line && lineEnd[-1] == '\r' ? lineEnd - 1 : lineEnd;
}

/// The separator that ends the cell beginning at `cell`, or `end`.
inline const char* endOfCell(const char* cell, const char* end, char separator) {
  bool quoted = false;
  for (; cell != end && (quoted || *cell != separator); ++cell) {
    if (*cell == '"') quoted = !quoted;
  }
  return cell;
}

/// Number of separators between `begin` and `end`; faster if there can be no quotes.
int countSeparators(const char* begin, const char* end, char separator, bool mayHaveQuotes);

/// The beginning of the previous cell; `cell` must not begin the first cell of the line.
const char* previousCell(const char* cell, char separator);

/// The content of a cell: without surrounding blanks, and then without surrounding quotes.
std::string_view cellText(const char* begin, const char* end);

/// Reads dates as seconds (see secondNumber()). Caches the last day, as one day has many rows.
class DateScanner final {
 public:
  /// Reads `YYYY-MM-DD`, or that with ` HH:MM` or `THH:MM` and optional `:SS`, at `at` and moves `at` past it; empty,
  /// with `at` undefined, when there is no valid date.
  std::optional<std::int64_t> scan(const char*& at, const char* end);
  /// scan() of a whole cell: surrounding blanks and quotes are allowed. `at` is moved to what follows.
  std::optional<std::int64_t> scanCell(const char*& at, const char* end);
  /// scanCell() of the usual cell, "YYYY-MM-DD HH:MM" before a separator, if it is on the last day; else empty, with
  /// `at` where it was.
  std::optional<std::int64_t> scanOnLastDay(const char*& at, const char* end, char separator) {
    constexpr std::ptrdiff_t kLength = 16;
    if (end - at <= kLength || at[kLength] != separator || at[13] != ':' || (at[10] != ' ' && at[10] != 'T')) return {};
    if (std::memcmp(at, lastDay_.data(), lastDay_.size()) != 0) return {};
    const auto digit = [&at](int place) { return static_cast<unsigned>(at[place]) - unsigned{'0'}; };
    if (digit(11) > 2 || digit(12) > 9 || digit(14) > 5 || digit(15) > 9) return {};
    const unsigned hour = 10 * digit(11) + digit(12);
    if (hour > 23) return {};
    const unsigned seconds = 60 * (60 * hour + 10 * digit(14) + digit(15));
    const std::int64_t second = lastDaySecond_ + seconds;
    at += kLength;
    return second;
  }

 private:
  std::optional<std::int64_t> scanDay(const char* at);

  std::array<char, 10> lastDay_{'0', '0', '0', '0', '-', '0', '3', '-', '0', '1'};
  std::int64_t lastDaySecond_ = 0;
};

/// A value cell: a number, or NaN if it is empty, NaN or NA; empty for any other text and for numbers outside the
/// 32-bit range.
std::optional<float> parseCell(const char* begin, const char* end);
/// The same in 64 bits.
std::optional<double> parseExactCell(const char* begin, const char* end);

}  // namespace mirevo::csv
