#include "platform/series/text_form.h"

#include <algorithm>
#include <cmath>
#include <tuple>

#include <fmt/core.h>

#include "common/text.h"
#include "platform/series/text_time.h"

namespace mirevo {
namespace {

bool mayName(char separator) {
  const bool isLetter = (separator >= 'a' && separator <= 'z') || (separator >= 'A' && separator <= 'Z');
  const bool isDigit = separator >= '0' && separator <= '9';
  return isLetter || isDigit || static_cast<unsigned char>(separator) >= 0x80 || separator == '"' || separator == '-' ||
         separator == '+' || isControlCharacter(separator);
}

std::optional<FormFault> faultOfColumns(const TextForm& form) {
  const std::string& separator = form.columnSeparator;
  if (!separator.empty() && !form.columnWidths.empty()) {
    return FormFault{"Column_Separator", "expected it or Column_Widths, found both"};
  }
  if (!separator.empty() && separatorOf(form) == '\0') {
    return FormFault{
        "Column_Separator",
        fmt::format("expected one character such as ';', or 'tab' or 'blank', found {}", quotedForMessage(separator))};
  }
  if (separator == form.decimalSign) {
    return FormFault{"Column_Separator",
                     fmt::format("expected another character than the Decimal_Sign, found {} for both",
                                 quotedForMessage(separator))};
  }
  const auto isWidth = [](double width) { return width >= 1.0 && width <= 100000.0 && width == std::floor(width); };
  if (const auto wrong = std::find_if_not(form.columnWidths.begin(), form.columnWidths.end(), isWidth);
      wrong != form.columnWidths.end()) {
    return FormFault{"Column_Widths", fmt::format("expected whole numbers from 1 to 100000, found {}", *wrong)};
  }
  return std::nullopt;
}

std::optional<FormFault> faultOfTime(const TextForm& form) {
  const std::vector<std::string> columns = timeColumns(form);
  const bool isNumber = form.timeUnit != TimeUnit::none;
  if (std::any_of(columns.begin(), columns.end(), [](const std::string& column) { return column.empty(); })) {
    return FormFault{"Time_Column", "expected the number or the name of a column on either side of a comma"};
  }
  if (form.headerRows == 0) {
    for (const std::string& column : columns) {
      if (parseInteger(column)) continue;
      return FormFault{"Time_Column",
                       fmt::format("expected the number of a column, as Header_Rows = 0 and columns have "
                                   "no names, found {}",
                                   quotedForMessage(column))};
    }
  }
  if (isNumber && !form.timeFormat.empty()) {
    return FormFault{"Time_Format", "expected it or Time_Unit, found both"};
  }
  if (isNumber && !form.timeOrigin) {
    return FormFault{"Time_Unit", "expected Time_Origin beside it, the date from which the time is counted"};
  }
  if (!isNumber && form.timeOrigin) {
    return FormFault{"Time_Origin", "expected Time_Unit beside it: 'seconds', 'minutes', 'hours' or 'days'"};
  }
  if (!isNumber && form.timeStep != 1.0) {
    return FormFault{"Time_Step", "expected Time_Unit and Time_Origin beside it"};
  }
  if (!isNumber && columns.empty()) {
    return FormFault{"Time_Column",
                     "expected Time_Unit, Time_Origin and Time_Step beside 'none', by which rows have "
                     "their times"};
  }
  if (isNumber && columns.size() > 1) {
    return FormFault{"Time_Column", fmt::format("expected one column, as Time_Unit is given and the time is a number, "
                                                "found {}",
                                                columns.size())};
  }
  if (form.timeFormat.empty()) return std::nullopt;
  std::string reason;
  if (TimeFormat::parse(form.timeFormat, reason)) return std::nullopt;
  return FormFault{"Time_Format", reason};
}

}  // namespace

bool TextForm::operator<(const TextForm& other) const {
  const auto all = [](const TextForm& f) {
    return std::tie(f.isGiven, f.skipRows, f.headerRows, f.commentSign, f.columnSeparator, f.decimalSign,
                    f.columnWidths, f.table, f.timeColumn, f.timeFormat, f.timeUnit, f.timeOrigin, f.timeStep,
                    f.missingValues);
  };
  return all(*this) < all(other);
}

char separatorOf(const TextForm& form) {
  if (form.columnSeparator == "tab") return '\t';
  if (form.columnSeparator == "blank" || form.columnSeparator == " ") return ' ';
  const bool isOne = form.columnSeparator.size() == 1 && !mayName(form.columnSeparator.front());
  return isOne ? form.columnSeparator.front() : '\0';
}

std::vector<std::string> timeColumns(const TextForm& form) {
  std::vector<std::string> columns;
  if (equalIgnoringCase(trim(form.timeColumn), "none")) return columns;
  for (const std::string_view column : splitAt(form.timeColumn, ',')) columns.emplace_back(trim(column));
  return columns;
}

std::optional<FormFault> findFault(const TextForm& form) {
  if (const auto table = parseInteger(form.table); table && *table < 1) {
    return FormFault{"Table",
                     fmt::format("expected a table number of 1 or more, or the beginning of the line above the "
                                 "table, found {}",
                                 quotedForMessage(form.table))};
  }
  if (auto fault = faultOfColumns(form)) return fault;
  return faultOfTime(form);
}

}  // namespace mirevo
