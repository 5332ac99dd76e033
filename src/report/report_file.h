#pragma once

#include <string>
#include <string_view>

#include "report/report_data.h"

namespace mirevo {

/// The page with title and data filled in. `page` holds each of the two marks of reportPageTemplate() once.
std::string reportPage(std::string_view page, const ReportData& data);

}  // namespace mirevo
