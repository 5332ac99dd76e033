#pragma once

#include <string_view>

namespace mirevo {

/// The qualifiers of an observation, "A", "P e", "A:e" or "P,ICE", as one number. Quality codes are numbers in setups,
/// exchange formats have letters. The number is the sum of
///
///   1  approved (A)           10  estimated (e)
///   2  provisional (P)        20  the true value is below or above it (<, >)
///                             40  any other remark (ice, backwater, equipment ...)
///
/// and NaN without any qualifier. Case matters for none of them; grades in brackets ("[90]") and the mark of a revision
/// (R) add nothing. The letters are those of the USGS: National Water Information System, "Codes used in water data",
/// help pages of waterdata.usgs.gov.
double qualityCode(std::string_view qualifiers);

/// Whether a text stands in the place of a value that was not measured, for a reason: "Ice", "Eqp", "***" (the same
/// source).
bool isRemarkInPlaceOfValue(std::string_view text);

}  // namespace mirevo
