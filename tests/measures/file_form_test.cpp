#include "measures/file_form.h"

#include <tuple>

#include <gtest/gtest.h>

#include "common/calendar.h"
#include "platform/series/memory_time_series.h"

namespace mirevo {
namespace {

TEST(FileForm, OfASeriesIsThatOfItsStepsAroundThePeriod) {
  const EvaluationPeriod january{{2001, 1, 1}, {2001, 1, 31}};
  // times in days since 2000-12-30; steps in the period; the widest gap that reaches into it, in days since then
  const std::tuple<std::vector<double>, std::size_t, std::pair<int, int>> cases[] = {
      {{0, 1, 2, 3, 4, 5}, 4, {2, 3}},
      {{0, 2, 4, 8, 9, 13}, 5, {4, 8}},
      {{0, 10, 11, 12}, 3, {0, 10}},  // which begins before the period
      {{0, 2, 3, 30, 90}, 3, {30, 90}},
      {{0, 2, 3, 32, 90}, 3, {3, 32}},  // the last gap begins as the period ends
      {{0, 1, 40, 41}, 0, {1, 40}},
      {{0}, 0, {0, 0}},
      {{40, 42}, 0, {0, 0}},
      {{}, 0, {0, 0}},
  };
  const DateRecord start{2000, 12, 30};
  for (const auto& [times, steps, gap] : cases) {
    SCOPED_TRACE(testing::PrintToString(times));
    const MemoryTimeSeries series(start, times, {std::vector<float>(times.size())});
    const FileForm form = formOfSeries(series, january);
    EXPECT_EQ(form.stepCount, steps);
    EXPECT_EQ(form.gapEnd - form.gapStart, 86400 * (gap.second - gap.first));
    EXPECT_EQ(form.gapStart, gap.second > 0 ? secondNumber(start) + 86400 * gap.first : 0);
  }
}

}  // namespace
}  // namespace mirevo
