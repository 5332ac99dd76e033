#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "common/date_record.h"

namespace mirevo {

/// The unit of times that are numbers.
enum class TimeUnit : std::int32_t { none, seconds, minutes, hours, days };
inline constexpr std::string_view kTimeUnitWords[] = {"none", "seconds", "minutes", "hours", "days"};

/// How a text file of series is to be read, as the section that names the file says. The defaults describe a CSV file.
struct TextForm {
  bool isGiven = false;         ///< any of the keywords is written
  std::int32_t skipRows = 0;    ///< lines before the header rows that are not looked at
  std::int32_t headerRows = 1;  ///< whose names are joined; 0: columns have no names
  std::string commentSign;      ///< begins a comment anywhere; empty: `#` does, above the header row
  std::string columnSeparator;  ///< one character, "tab" or "blank"; empty: as the header row shows
  std::string decimalSign = ".";
  std::vector<double> columnWidths;  ///< characters, of each column; empty: columns are separated
  std::string table;                 ///< its number, or the beginning of the line above it; empty: there is one
  std::string timeColumn = "1";      ///< numbers or names with commas between them, "none"
  std::string timeFormat;            ///< "DD.MM.YYYY hh:mm"; empty: as in a CSV file
  TimeUnit timeUnit = TimeUnit::none;
  std::optional<DateRecord> timeOrigin;
  double timeStep = 1.0;              ///< time units of one step
  std::vector<double> missingValues;  ///< besides what the file says

  bool operator==(const TextForm&) const = default;
  bool operator<(const TextForm& other) const;
};

/// A keyword whose value cannot be used together with the others, and why.
struct FormFault {
  std::string_view keyword;
  std::string explanation;
};
std::optional<FormFault> findFault(const TextForm& form);

/// The time columns that a form names, without blanks around them; none for "none".
std::vector<std::string> timeColumns(const TextForm& form);

/// The separator as one character, '\0' where the header row shows it.
char separatorOf(const TextForm& form);

}  // namespace mirevo
