#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/series/csv_cells.h"
#include "platform/series/text_form.h"

namespace mirevo {

/// How a date is written: YYYY, MM (MMM: Jan, Feb ...) and DD, or YYYY and DDD (day of the year), hh, mm and ss, with
/// other characters between them. A number may have fewer digits, but for one that another one follows at once; a blank
/// stands for any number of them.
class TimeFormat final {
 public:
  /// Empty, with `reason`, if it is none.
  static std::optional<TimeFormat> parse(std::string_view text, std::string& reason);
  /// secondNumber() of a text of this form; empty if it is none or no valid date.
  std::optional<std::int64_t> read(std::string_view text) const;

 private:
  enum class Kind { year, month, monthName, day, dayOfYear, hour, minute, second, character };
  struct Part {
    Kind kind = Kind::character;
    std::size_t digits = 0;  ///< at most
    char character = ' ';
    bool hasAllDigits = false;  ///< as another number follows at once
  };

  bool has(Kind kind) const;

  std::vector<Part> parts_;
};

/// Reads the times of a file, as its form says.
class TimeReading final {
 public:
  explicit TimeReading(const TextForm& form);
  /// secondNumber() of the time in `text`, that of several columns with a blank between them; empty if it is none.
  std::optional<std::int64_t> read(std::string_view text);
  /// That of row `row`, from 0, where the rows are counted.
  std::optional<std::int64_t> ofStep(double step) const;
  /// What a time must be: "a valid time like 2001-01-31 12:30".
  std::string expected() const;

 private:
  std::optional<TimeFormat> format_;
  std::string formatText_;
  TimeUnit unit_;
  std::int64_t origin_ = 0;  ///< secondNumber()
  double stepSeconds_ = 0.0;
  bool hasDecimalComma_;
  csv::DateScanner dates_;
};

/// A number with this decimal sign as one with a point; empty if it has the other sign, too.
std::optional<std::string> withDecimalPoint(std::string_view text, char decimalSign);

}  // namespace mirevo
