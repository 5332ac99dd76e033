#pragma once

#include <string>

#include "report/report_data.h"

namespace mirevo {

/// The data as the report's page takes them: one JSON object that may stand inside an HTML script element.
std::string reportJson(const ReportData& data);

}  // namespace mirevo
