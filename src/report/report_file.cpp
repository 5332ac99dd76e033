#include "report/report_file.h"

#include <algorithm>

#include "common/utf8.h"
#include "report/report_json.h"

namespace mirevo {
namespace {

constexpr std::string_view kTitleMark = "@REPORT_TITLE@";
constexpr std::string_view kDataMark = "@REPORT_DATA@";

std::string escapeHtml(std::string_view text) {
  std::string escaped;
  for (const char c : text) {
    switch (c) {
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      case '&':
        escaped += "&amp;";
        break;
      default:
        escaped += static_cast<unsigned char>(c) < ' ' ? ' ' : c;
    }
  }
  return escaped;
}

}  // namespace

std::string reportPage(std::string_view page, const ReportData& data) {
  const std::string title = escapeHtml(withValidUtf8(data.run.title.empty() ? data.run.setupName : data.run.title));
  const std::string json = reportJson(data);
  std::string text;
  text.reserve(page.size() + title.size() + json.size());
  // In one pass over the page: what is filled in may itself hold a mark.
  while (!page.empty()) {
    const std::size_t titleAt = page.find(kTitleMark);
    const std::size_t dataAt = page.find(kDataMark);
    const std::size_t at = std::min(titleAt, dataAt);
    text += page.substr(0, at);
    if (at == std::string_view::npos) break;
    text += at == titleAt ? title : json;
    page.remove_prefix(at + (at == titleAt ? kTitleMark : kDataMark).size());
  }
  return text;
}

}  // namespace mirevo
