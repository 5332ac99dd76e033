#pragma once

#include <string_view>

namespace mirevo {

/// The page of the HTML report (UTF-8), with two marks that the program replaces: `@REPORT_TITLE@` (HTML text, in
/// <title>) and `@REPORT_DATA@` (one JSON object, in the script element `report-data`). Each occurs once.
std::string_view reportPageTemplate();

}  // namespace mirevo
