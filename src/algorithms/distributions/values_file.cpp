#include "algorithms/distributions/values_file.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "common/data_table.h"
#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr const char* kRefusal = "Error: Values of the distribution invalid";

std::vector<double> columnOf(const ReadTable& table, std::string_view column, const std::string& fileName) {
  const auto index = table.column(column);
  if (!index) {
    const auto nearest = nearestName(column, table.columns);
    fatalError(kRefusal, fmt::format("{}: expected a tab-separated table with the column {}{}", fileName,
                                     quotedForMessage(column),
                                     nearest ? fmt::format(", did you mean {}?", quotedForMessage(*nearest)) : ""));
  }
  if (std::ranges::count(table.columns, column) > 1) {
    fatalError(kRefusal, fmt::format("{}: {} is the name of several columns", fileName, quotedForMessage(column)));
  }
  std::vector<double> values;
  for (std::size_t row = 0; row < table.rows.size(); ++row) {
    const std::string& cell = table.rows[row][*index];
    const auto value = realCell(cell);
    if (!value || !std::isfinite(*value)) {
      fatalError(kRefusal, fmt::format("{}: row {} of column {}: expected a number, found {}", fileName, row + 1,
                                       quotedForMessage(column), quotedForMessage(cell)));
    }
    values.push_back(*value);
  }
  return values;
}

}  // namespace

std::vector<double> readValues(std::string_view text, std::string_view column, const std::string& fileName) {
  if (!column.empty()) return columnOf(readGivenTable(text, kRefusal, fileName), column, fileName);
  constexpr std::string_view kBlanks = " \t";
  std::vector<double> values;
  std::size_t number = 0;
  for (std::string_view line : splitLines(text)) {
    ++number;
    if (line.starts_with('#')) continue;
    while (true) {
      line.remove_prefix(std::min(line.find_first_not_of(kBlanks), line.size()));
      if (line.empty()) break;
      const std::string_view word = line.substr(0, line.find_first_of(kBlanks));
      line.remove_prefix(word.size());
      const auto value = parseReal(word);
      if (!value || !std::isfinite(*value)) {
        fatalError(kRefusal,
                   fmt::format("{}:{}: expected a number, found {}", fileName, number, quotedForMessage(word)));
      }
      values.push_back(*value);
    }
  }
  return values;
}

}  // namespace mirevo
