#include "platform/series/form_meaning.h"

#include <algorithm>

#include "common/text.h"
#include "platform/series/csv_time_series.h"
#include "platform/series/time_series_object.h"

namespace mirevo {
namespace {

/// With one way of writing of what may be written in several.
TextForm plainForm(TextForm form) {
  if (const char separator = separatorOf(form); separator != '\0') form.columnSeparator = separator;
  form.table = trim(form.table);
  std::string columns;
  for (const std::string& column : timeColumns(form)) columns.append(columns.empty() ? "" : ",").append(column);
  form.timeColumn = columns;
  form.missingValues.clear();
  return form;
}

/// Some files of an ending are tables and others tell their own form, which the file itself shows.
bool isTableByItself(const std::string& fileName) {
  std::string ignored;
  const auto series = createTimeSeriesObject(fileName, ignored);
  return dynamic_cast<const CsvTimeSeries*>(series.get()) != nullptr;
}

}  // namespace

bool isReadAlike(const std::string& fileName, const TextForm& a, const TextForm& b) {
  if (a == b) return true;
  TextForm plain = plainForm(a);
  plain.isGiven = b.isGiven;
  return plain == plainForm(b) && (a.isGiven == b.isGiven || isTableByItself(fileName));
}

bool hasSameMissingValues(const TextForm& a, const TextForm& b) {
  const auto isIn = [](const TextForm& form) {
    return [&form](double value) { return std::ranges::find(form.missingValues, value) != form.missingValues.end(); };
  };
  return std::ranges::all_of(a.missingValues, isIn(b)) && std::ranges::all_of(b.missingValues, isIn(a));
}

}  // namespace mirevo
