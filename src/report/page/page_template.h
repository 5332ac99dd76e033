#pragma once

#include <string_view>

namespace mirevo {

/// The page of the HTML report, complete but for the two places that the program fills: `@REPORT_TITLE@` (HTML text, in
/// <title>) and `@REPORT_DATA@` (one JSON object, in the script element `report-data`). Each stands in it once. UTF-8.
std::string_view reportPageTemplate();

}  // namespace mirevo
