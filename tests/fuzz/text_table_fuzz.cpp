// Any bytes as the form of a text table, in a line "skip header widths;comment;separator;decimal;table;time column;time
// format;unit", and the table behind it: no crash, and what is accepted keeps the promises of TimeSeriesObject. What is
// a CSV file as well is the same series.

#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "common/text.h"
#include "platform/series/csv_time_series.h"
#include "platform/series/text_table.h"
#include "require.h"

namespace {

/// Behind each keyword's text a 0x1F; numbers are single digits.
mirevo::TextForm formOf(std::string_view line) {
  const std::vector<std::string_view> parts = mirevo::splitAt(line, '\x1f');
  const auto part = [&parts](std::size_t i) { return i < parts.size() ? parts[i] : std::string_view(); };
  const auto digit = [](char c) { return c >= '0' && c <= '9' ? c - '0' : 0; };
  mirevo::TextForm form;
  form.isGiven = true;
  form.skipRows = part(0).empty() ? 0 : digit(part(0)[0]);
  form.headerRows = part(0).size() < 2 ? 1 : digit(part(0)[1]);
  for (const char c : part(0).substr(std::min<std::size_t>(part(0).size(), 2))) form.columnWidths.push_back(digit(c));
  form.commentSign = part(1);
  form.columnSeparator = part(2);
  form.decimalSign = part(3) == "," ? "," : ".";
  form.table = part(4);
  if (!part(5).empty()) form.timeColumn = part(5);
  form.timeFormat = part(6);
  if (!part(7).empty()) {
    form.timeUnit = static_cast<mirevo::TimeUnit>(digit(part(7)[0]) % 5);
    form.timeOrigin = mirevo::DateRecord{2000, 1, 1};
  }
  return form;
}

void requireSame(mirevo::TimeSeriesObject& a, mirevo::TimeSeriesObject& b) {
  require(std::ranges::equal(a.times(), b.times()) && a.startTime() == b.startTime());
  require(a.itemCount() == b.itemCount());
  require(a.doubts().size() == b.doubts().size());
  for (int item = 1; item <= std::min(a.itemCount(), 12); ++item) {
    require(a.itemName(item) == b.itemName(item));
    require(a.getData(item) == b.getData(item));
    const auto left = a.values(item);
    const auto right = b.values(item);
    require(std::ranges::equal(left, right, [](float x, float y) { return x == y || (x != x && y != y); }));
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const std::size_t end = std::min(text.find('\n'), text.size());
  const std::string content(text.substr(std::min(end + 1, text.size())));
  const mirevo::TextForm form = formOf(text.substr(0, end));
  mirevo::CsvTimeSeries plain;
  mirevo::TextForm usual;
  usual.isGiven = true;
  mirevo::TextTable same(usual);
  if (plain.parse("fuzz.csv", content) && same.parse("fuzz.csv", content)) requireSame(plain, same);
  require(plain.firstLines().size() < 20000);
  if (mirevo::findFault(form)) return 0;
  mirevo::TextTable series(form);
  const bool isRead = series.parse("fuzz.csv", content);
  require(series.firstLines().size() < 20000);
  if (!isRead) {
    require(series.lastError().starts_with("fuzz.csv:") && series.timeStepCount() == 0);
    return 0;
  }
  const std::span<const double> times = series.times();
  for (std::size_t step = 1; step < times.size(); ++step) require(times[step - 1] < times[step]);
  require(series.startTime().has_value() == !times.empty());
  for (int item = std::min(series.itemCount(), 12); item >= 1; --item) {
    const bool hasData = series.getData(item);
    require(hasData ? series.values(item).size() == times.size() : series.lastError().starts_with("fuzz.csv:"));
  }
  return 0;
}
