#include "measures/file_form.h"

#include <algorithm>
#include <span>

#include "common/calendar.h"
#include "measures/dates.h"

namespace mirevo {

FileForm formOfSeries(const TimeSeriesObject& series, const EvaluationPeriod& period) {
  FileForm form;
  form.endsLine = series.endsLine();
  const std::optional<DateRecord> start = series.startTime();
  if (!start) return form;
  const std::span<const double> times = series.times();
  const std::int64_t origin = secondNumber(*start);
  if (!times.empty()) {
    form.firstStep = secondAfter(origin, times.front());
    form.lastStep = secondAfter(origin, times.back());
  }
  const double first = daysSince(*start, period.start);
  const double last = daysSince(*start, period.end);
  const auto begin = std::lower_bound(times.begin(), times.end(), first - kSameTimeDays);
  const auto end = std::upper_bound(begin, times.end(), last + kSameTimeDays);
  form.stepCount = static_cast<std::size_t>(end - begin);
  const bool beginsBefore = begin != times.begin() && (begin == times.end() || *begin > first + kSameTimeDays);
  const bool endsAfter = end != times.end() && (end == times.begin() || end[-1] < last - kSameTimeDays);
  const auto from = beginsBefore ? begin - 1 : begin;
  const auto to = endsAfter ? end + 1 : end;
  auto widest = to;  // the later step
  double width = 0.0;
  for (auto step = from; to - from > 1 && step + 1 != to; ++step) {
    if (step[1] - step[0] <= width + kSameTimeDays) continue;
    width = step[1] - step[0];
    widest = step + 1;
  }
  if (widest == to) return form;
  form.gapStart = secondAfter(origin, widest[-1]);
  form.gapEnd = secondAfter(origin, *widest);
  return form;
}

}  // namespace mirevo
