#include <cmath>

#include <gmock/gmock.h>

#include "common/calendar.h"
#include "report/extreme_views.h"
#include "report/regime_views.h"
#include "report/residual_views.h"

namespace mirevo {
namespace {

using ::testing::DoubleNear;
using ::testing::ElementsAre;
using ::testing::Pointwise;

/// Values from a day on at equal steps; NaN is a gap.
ShownSeries seriesFrom(DateRecord day, std::int64_t step, std::vector<float> observed, std::vector<float> simulated) {
  ShownSeries series;
  for (std::size_t i = 0; i < observed.size(); ++i) {
    series.seconds.push_back(secondNumber(day) + step * static_cast<std::int64_t>(i));
  }
  series.observed = std::move(observed);
  series.best = std::move(simulated);
  return series;
}

TEST(HydrographViews, SeasonsAndYearsHaveTheFiguresOfTheirOwnPairs) {
  // 28 to 30 November and 1 to 10 December: the autumn has too few pairs for efficiencies. Of the winter's pairs the
  // errors are 1 throughout and the squared deviations of 1 to 10 from their mean add up to 82.5.
  const ShownPairs pairs =
      shownPairs(seriesFrom({2001, 11, 28}, kSecondsOfDay, {4, NAN, 2, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10},
                            {5, 3, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11}));
  const std::vector<RegimeFit> seasons = seasonFits(pairs);
  ASSERT_EQ(seasons.size(), 2U);
  EXPECT_EQ(seasons[0].name + seasons[1].name, "DJFSON");
  EXPECT_NEAR(seasons[0].figures.nse, 1.0 - 10.0 / 82.5, 1e-12);
  EXPECT_NEAR(seasons[0].figures.percentBias, 1000.0 / 55.0, 1e-12);
  EXPECT_EQ(seasons[0].observedMean, 5.5);
  EXPECT_EQ(seasons[0].simulatedMean, 6.5);
  EXPECT_EQ(seasons[1].figures.count, 2U);
  EXPECT_TRUE(std::isnan(seasons[1].figures.nse));
  const std::vector<RegimeFit> years = yearFits(pairs, 12);
  ASSERT_EQ(years.size(), 2U);
  EXPECT_EQ(years[0].name + " " + years[1].name, "2000/01 2001/02");
  EXPECT_EQ(years[1].figures.count, 10U);
}

TEST(HydrographViews, AnnualExtremesNeedNineTenthsOfTheDaysAndSevenInARow) {
  std::vector<float> observed(3 * 365, 10.0F);  // 2001 to 2003
  for (std::size_t i = 20; i < 28; ++i) observed[i] = 3.0F;
  observed[23] = NAN;  // what is left of the low flow is shorter than 7 days
  observed[100] = 50.0F;
  for (std::size_t i = 365 + 40; i < 365 + 47; ++i) observed[i] = static_cast<float>(i - 365 - 40);  // 0 to 6
  std::fill_n(observed.begin() + 2 * 365, 40, NAN);
  std::vector<float> simulated(observed.size(), 8.0F);
  simulated[101] = 20.0F;
  const ShownSeries daily = seriesFrom({2001, 1, 1}, kSecondsOfDay, observed, simulated);
  const AnnualExtremes extremes = annualExtremes(shownPairs(daily), 1);
  EXPECT_THAT(extremes.years, ElementsAre("2001", "2002"));
  EXPECT_THAT(extremes.lowObserved, ElementsAre(DoubleNear((4 * 3.0 + 3 * 10.0) / 7.0, 1e-12), 3.0));
  EXPECT_THAT(extremes.lowSimulated, ElementsAre(8.0, 8.0));
  EXPECT_THAT(extremes.highObserved, ElementsAre(50.0, 10.0));
  EXPECT_THAT(extremes.highSimulated, ElementsAre(20.0, 8.0));
  EXPECT_THAT(returnPeriods(3), ElementsAre(4.0, 2.0, 4.0 / 3.0));

  // The same values twice a day have the same daily means; every second day has none.
  const auto twice = [](const std::vector<float>& values) {
    std::vector<float> doubled;
    for (const float value : values) doubled.insert(doubled.end(), {value + 1.0F, value - 1.0F});
    return doubled;
  };
  const ShownSeries halfDaily = seriesFrom({2001, 1, 1}, kSecondsOfDay / 2, twice(observed), twice(simulated));
  EXPECT_THAT(annualExtremes(shownPairs(halfDaily), 1).lowObserved, Pointwise(DoubleNear(1e-6), extremes.lowObserved));
  EXPECT_THAT(annualExtremes(shownPairs(seriesFrom({2001, 1, 1}, 2 * kSecondsOfDay, observed, simulated)), 1).years,
              ElementsAre());
}

TEST(HydrographViews, TheTailIsTheDryEndOfEachSeriesInItsOwnOrder) {
  const DurationTail tail = durationTail(
      shownPairs(seriesFrom({2001, 1, 1}, 60, {9, 1, 8, 2, 7, 3, 6, 4, 5}, {10, 20, 30, 40, 50, 60, 70, 80, 90})));
  EXPECT_THAT(tail.exceedance, ElementsAre(70.0, 80.0, 90.0));
  EXPECT_THAT(tail.observed, ElementsAre(3.0, 2.0, 1.0));
  EXPECT_THAT(tail.simulated, ElementsAre(30.0, 20.0, 10.0));
}

TEST(HydrographViews, PeaksAreAWeekApartAndComparedWithTheLargestSimulatedValueNearby) {
  std::vector<float> observed(40, 1.0F);
  std::vector<float> simulated(40, 2.0F);
  observed[0] = 99.0F;                 // the recession of an earlier peak
  observed[10] = observed[11] = 8.0F;  // the first of equal ones
  observed[16] = 7.0F;                 // within 7 days
  observed[24] = 5.0F;
  observed[34] = 20.0F;  // beside a missing one
  observed[35] = NAN;
  simulated[12] = 6.0F;
  simulated[20] = 9.0F;  // more than 3 days away
  simulated[21] = simulated[27] = 4.0F;
  const std::vector<ShownPeak> peaks =
      largestPeaks(shownPairs(seriesFrom({2001, 1, 1}, kSecondsOfDay, observed, simulated)));
  ASSERT_EQ(peaks.size(), 2U);
  EXPECT_EQ(peaks[0].second, secondNumber({2001, 1, 11}));
  EXPECT_THAT((std::array{peaks[0].observed, peaks[0].simulated, peaks[0].percent, peaks[0].hoursLater}),
              ElementsAre(8.0, 6.0, -25.0, 48.0));
  EXPECT_THAT((std::array{peaks[1].observed, peaks[1].simulated, peaks[1].percent, peaks[1].hoursLater}),
              ElementsAre(5.0, 4.0, -20.0, -72.0));
}

// Residuals 1, -1, 2, -2, 3, -3, -, 1, -1: mean 0, squares 30; products one step apart -1-2-4-6-9-1 = -23, two apart
// 2+2+6+6-3 (across the gap) = 13.
TEST(HydrographViews, ResidualsAreCorrelatedWithThoseAWholeNumberOfStepsLater) {
  const std::vector<float> observed(9, 10.0F);
  const ResidualViews views =
      residualViews(shownPairs(seriesFrom({2001, 1, 28}, kSecondsOfDay, observed, {11, 9, 12, 8, 13, 7, NAN, 11, 9})));
  EXPECT_THAT(views.autocorrelation, ElementsAre(DoubleNear(-23.0 / 30.0, 1e-12), DoubleNear(13.0 / 30.0, 1e-12)));
  EXPECT_NEAR(views.autocorrelationLimit, 1.96 / std::sqrt(8.0), 1e-12);
  EXPECT_THAT(views.months, ElementsAre(secondNumber({2001, 1, 1}), secondNumber({2001, 2, 1})));
  EXPECT_THAT(views.monthMeans, ElementsAre(0.0, 0.0));
  EXPECT_EQ(views.byMonth[0].count + views.byMonth[1].count, 8U);
  EXPECT_EQ(views.byMonth[1].quantiles[2], 0.0);  // of 3, -3, 1, -1
  EXPECT_THAT(views.flows, ElementsAre(7, 8, 9, 9, 11, 11, 12, 13));
  EXPECT_THAT(views.ofFlows, ElementsAre(-3, -2, -1, -1, 1, 1, 2, 3));
  // Blom's positions of the largest of 8: Phi(1.4342) = 7.625/8.25.
  ASSERT_EQ(views.normalQuantiles.size(), 8U);
  EXPECT_NEAR(views.normalQuantiles.back(), 1.4342, 1e-3);
  EXPECT_NEAR(views.standardisedResiduals.back(), 3.0 / std::sqrt(30.0 / 7.0), 1e-12);
}

}  // namespace
}  // namespace mirevo
