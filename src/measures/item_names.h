#pragma once

#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// Whether an item with the name that a file has is the one that a setup means by `written`: the names are equal, or
/// are but for case, or but for case and the unit in brackets behind that of the file.
bool isItemCalled(std::string_view name, std::string_view written);

/// The numbers of the items that `written` means: those of the same name, if there are any, else those that differ in
/// case, else those without their unit.
std::vector<std::int32_t> itemsCalled(const TimeSeriesObject& series, std::string_view written);

/// The number of the item that the reference names, or its number if it has no name. Throws FatalError, with its
/// location and the nearest name, if there is none or are several of this name, and if the number is that of another.
std::int32_t itemNumber(const TimeSeriesObject& series, const SeriesReference& reference);

/// What becomes of a measure that names an item which cannot be found.
enum class UnknownItems {
  refused,
  left  ///< as they are, for an earlier run, whose files may have gone or changed
};

/// The measures with the numbers of the items that they name, which keep their names, from files as they are now.
/// Throws FatalError, unless unknown items are left, as itemNumber() and openTimeSeries() do.
std::vector<OutputMeasure> withItemNumbers(std::span<const OutputMeasure> measures,
                                           UnknownItems unknown = UnknownItems::refused);

}  // namespace mirevo
