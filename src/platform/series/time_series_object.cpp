#include "platform/series/time_series_object.h"

#include <algorithm>
#include <filesystem>
#include <functional>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/files.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/series/csv_time_series.h"
#include "platform/series/epanet_results.h"
#include "platform/series/grdc_time_series.h"
#include "platform/series/guarded_netcdf.h"
#include "platform/series/modflow_budget.h"
#include "platform/series/modflow_heads.h"
#include "platform/series/rdb_time_series.h"
#include "platform/series/series_reading.h"
#include "platform/series/swmm_results.h"
#include "platform/series/text_table.h"
#include "platform/series/xml_time_series.h"

namespace mirevo {
namespace {

template <class Format>
std::unique_ptr<TimeSeriesObject> make(std::shared_ptr<SeriesReading> reading) {
  return std::make_unique<Format>(std::move(reading));
}

/// The formats of series files. A further one needs a pair of files and a row here.
struct SeriesFormat {
  std::string_view endings;  ///< of file names, in lower case, separated by blanks
  std::unique_ptr<TimeSeriesObject> (*make)(std::shared_ptr<SeriesReading>);
  bool isText;
  /// Where formats share an ending: whether a file that begins like this is of this one. Of those that fit, or have no
  /// such function, the last one is taken.
  bool (*fits)(std::string_view head) = nullptr;
};
constexpr SeriesFormat kFormats[] = {
    {".csv .txt .tsv", make<CsvTimeSeries>, true},
    {".nc", make<GuardedNetcdf>, false},
    {".rdb", make<RdbTimeSeries>, true},
    {".txt", make<RdbTimeSeries>, true, RdbTimeSeries::fits},
    {".xml", make<XmlTimeSeries>, true},
    {".day .mon", make<GrdcTimeSeries>, true},
    {".txt", make<GrdcTimeSeries>, true, GrdcTimeSeries::fits},
    {".out", make<SwmmResults>, false},
    {".out", make<EpanetResults>, false, EpanetResults::fits},
    {".hds .ddn .ucn", make<ModflowHeads>, false},
    {".cbc .bud", make<ModflowBudget>, false},
};

std::string endingOf(const std::string& fileName) {
  return toLowerAscii(std::filesystem::path(trimTrailing(fileName)).extension().string());
}

bool hasEnding(const SeriesFormat& format, std::string_view ending) {
  const std::vector<std::string_view> endings = splitAt(format.endings, ' ');
  return std::find(endings.begin(), endings.end(), ending) != endings.end();
}

/// Why a file cannot be a text table of a form that the setup states; empty if it can. `.out` is an ending of listings,
/// too, in which there is no zero byte.
std::string faultOfTextEnding(const std::string& fileName) {
  const std::string ending = endingOf(fileName);
  const auto* const other = std::find_if(std::begin(kFormats), std::end(kFormats),
                                         [&](const SeriesFormat& format) { return hasEnding(format, ending); });
  if (other == std::begin(kFormats) || other == std::end(kFormats)) return {};
  if (ending == ".out") {
    std::string ignored;
    const auto head = readFileHead(std::string(trimTrailing(fileName)), ignored);
    if (!head || head->find('\0') == std::string::npos) return {};
  }
  return fmt::format(
      "this tells how a text table is to be read, and {} is a file of another format, which says itself "
      "how it is read: leave out the keywords of text tables, or export the series as text",
      ending);
}

/// Index of the first step not earlier than `days`, with the tolerance kSameTimeDays; the number of steps when there is
/// none. Widens its search from `hint` in doubling strides.
std::size_t firstStepFrom(std::span<const double> times, double days, std::size_t hint) {
  const double from = days - kSameTimeDays;
  std::size_t low = std::min(hint, times.size());
  std::size_t high = low;
  std::size_t stride = 1;
  if (low < times.size() && times[low] < from) {
    while (high < times.size() && times[high] < from) {
      low = high + 1;
      high = std::min(times.size(), high + stride);
      stride *= 2;
    }
  } else {
    while (low > 0 && !(times[low - 1] < from)) {
      high = low - 1;
      low -= std::min(low, stride);
      stride *= 2;
    }
  }
  const auto first = times.begin();
  return static_cast<std::size_t>(std::lower_bound(first + low, first + high, from) - first);
}

template <typename Value>
std::optional<Value> interpolate(std::span<const double> times, std::span<const Value> values,
                                 std::optional<float> deleteValue, double days, double largestGap, std::size_t& hint) {
  const std::size_t next = firstStepFrom(times, days, hint);
  hint = next;
  if (next >= std::min(times.size(), values.size())) return std::nullopt;
  const Value nextValue = values[next];
  if (isMissing(nextValue, deleteValue)) return std::nullopt;
  if (times[next] <= days + kSameTimeDays) return nextValue;
  if (next == 0 || isMissing(values[next - 1], deleteValue)) return std::nullopt;
  const double gap = times[next] - times[next - 1];
  if (gap > largestGap + kSameTimeDays) return std::nullopt;
  const double before = values[next - 1];
  const double fraction = (days - times[next - 1]) / gap;
  return static_cast<Value>(before + fraction * (static_cast<double>(nextValue) - before));
}

/// The value in the period that no other value precedes according to `precedes`.
template <typename Value, typename Precedes>
std::optional<Value> extractValue(std::span<const double> times, std::span<const Value> values,
                                  std::optional<float> deleteValue, double start, double end, Precedes precedes) {
  const std::size_t count = std::min(times.size(), values.size());
  std::optional<Value> extreme;
  for (std::size_t step = firstStepFrom(times, start, 0); step < count && times[step] <= end + kSameTimeDays; ++step) {
    if (isMissing(values[step], deleteValue)) continue;
    if (!extreme || precedes(values[step], *extreme)) extreme = values[step];
  }
  return extreme;
}

}  // namespace

bool isTextSeries(const std::string& fileName, const TextForm& form) {
  return form.isGiven ||
         std::any_of(std::begin(kFormats), std::end(kFormats), [ending = endingOf(fileName)](const auto& format) {
           return format.isText && hasEnding(format, ending);
         });
}

std::string howToMarkMissing(const std::string& fileName, float value, const TextForm& form) {
  if (form.isGiven) return fmt::format("write Missing_Value = {} in the section that names the file", value);
  const std::string ending = endingOf(fileName);
  if (ending == ".nc") return "make it the attribute missing_value of the variable";
  const bool isTable = hasEnding(kFormats[0], ending);
  return isTable ? fmt::format("write \"# missing = {}\" above the header row", value)
                 : "mark it as this format does, or leave it out with Lowest_Observed or Highest_Observed";
}

std::unique_ptr<TimeSeriesObject> createTimeSeriesObject(const std::string& fileName, std::string& reason,
                                                         std::shared_ptr<SeriesReading> reading, const TextForm& form) {
  if (!reading) reading = std::make_shared<SeriesReading>();
  const std::string ending = endingOf(fileName);
  if (form.isGiven) {
    reason = faultOfTextEnding(fileName);
    if (!reason.empty()) return nullptr;
    return std::make_unique<TextTable>(form, std::move(reading));
  }
  std::vector<std::string_view> known;
  const SeriesFormat* found = nullptr;
  std::optional<std::string> head;
  for (const SeriesFormat& format : kFormats) {
    for (const std::string_view each : splitAt(format.endings, ' ')) {
      if (std::find(known.begin(), known.end(), each) == known.end()) known.push_back(each);
    }
    if (!hasEnding(format, ending)) continue;
    // A file that cannot be read now is opened by the first format, which says why.
    if (found != nullptr && !head) head = readFileHead(std::string(trimTrailing(fileName)), reason).value_or("");
    const bool hasMark = head && head->starts_with(kByteOrderMark);
    if (found == nullptr || format.fits(std::string_view(*head).substr(hasMark ? kByteOrderMark.size() : 0))) {
      found = &format;
    }
  }
  reason.clear();
  if (found != nullptr) return found->make(std::move(reading));
  reason = fmt::format("expected a time-series file name ending in {} or {}, found {}",
                       fmt::join(known.begin(), known.end() - 1, ", "), known.back(),
                       ending.empty() ? "no ending" : "\"" + ending + "\"");
  return nullptr;
}

std::pair<std::string, std::string> splitUnit(std::string_view name) {
  const std::string_view text = trim(name);
  const char closing = text.empty() ? '\0' : text.back();
  const std::size_t begin = closing == ']'   ? text.rfind('[')
                            : closing == ')' ? text.rfind('(')
                                             : std::string_view::npos;
  if (begin == std::string_view::npos || begin == 0) return {std::string(text), {}};
  const std::string_view unit = trim(text.substr(begin + 1, text.size() - begin - 2));
  return {std::string(trim(text.substr(0, begin))), std::string(unit)};
}

std::optional<float> valueAt(const TimeSeriesObject& series, int item, double days, std::size_t& hint,
                             double largestGap) {
  return interpolate(series.times(), series.values(item), series.deleteValue(), days, largestGap, hint);
}

std::optional<float> valueAt(std::span<const double> times, std::span<const float> values,
                             std::optional<float> deleteValue, double days, std::size_t& hint, double largestGap) {
  return interpolate(times, values, deleteValue, days, largestGap, hint);
}

std::optional<double> exactValueAt(std::span<const double> times, std::span<const double> values, double days,
                                   std::size_t& hint, double largestGap) {
  return interpolate(times, values, std::nullopt, days, largestGap, hint);
}

std::optional<float> valueAt(const TimeSeriesObject& series, int item, double days) {
  std::size_t hint = 0;
  return valueAt(series, item, days, hint);
}

std::optional<float> extractMaxValue(const TimeSeriesObject& series, int item, double start, double end) {
  return extractValue(series.times(), series.values(item), series.deleteValue(), start, end, std::greater<>());
}

std::optional<float> extractMinValue(const TimeSeriesObject& series, int item, double start, double end) {
  return extractValue(series.times(), series.values(item), series.deleteValue(), start, end, std::less<>());
}

std::optional<double> exactMaxValue(std::span<const double> times, std::span<const double> values, double start,
                                    double end) {
  return extractValue(times, values, std::nullopt, start, end, std::greater<>());
}

std::optional<double> exactMinValue(std::span<const double> times, std::span<const double> values, double start,
                                    double end) {
  return extractValue(times, values, std::nullopt, start, end, std::less<>());
}

}  // namespace mirevo
