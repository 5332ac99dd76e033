#pragma once

#include <string>
#include <string_view>

#include "report/report_data.h"

namespace mirevo {

/// The page with its title and data in their places. `page` holds each of the two marks of reportPageTemplate() once.
std::string reportPage(std::string_view page, const ReportData& data);

/// Writes text to a file that is there whole or not at all: beside it first, then renamed over what there was. False,
/// with the system's reason, when that fails.
bool writeWhole(const std::string& path, std::string_view text, std::string& reason);

}  // namespace mirevo
