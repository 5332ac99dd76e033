#pragma once

#include <string>

#include "report/report_data.h"

namespace mirevo {

/// The data for the page of the report: one JSON object that is safe inside an HTML script element.
std::string reportJson(const ReportData& data);

}  // namespace mirevo
