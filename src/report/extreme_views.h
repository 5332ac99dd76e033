#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "report/shown_pairs.h"

namespace mirevo {

/// The extremes of the years in which at least kLeastShareOfDays of the days have all their pairs; one entry per year.
struct AnnualExtremes {
  std::vector<std::string> years;
  std::vector<double> lowObserved;  ///< smallest mean of 7 days in a row, all of the year and with all their pairs
  std::vector<double> lowSimulated;
  std::vector<double> highObserved;  ///< largest value
  std::vector<double> highSimulated;
};

inline constexpr double kLeastShareOfDays = 0.9;

/// Whether pairs are usually a day or less apart, as low flows, floods and peaks need.
bool isAtLeastDaily(const ShownPairs& pairs);

/// Of years that begin with this month. Without years if the pairs are not at least daily.
AnnualExtremes annualExtremes(const ShownPairs& pairs, int firstMonth);

/// Return periods, in years, of `count` annual extremes from the most to the least extreme one: (count + 1) / rank, the
/// plotting positions of Weibull (1939).
std::vector<double> returnPeriods(std::size_t count);

/// The dry end of the flow duration curves of the pairs: the values that are exceeded at least 70 % of the time, each
/// series in its own order, the value of rank i of n being exceeded 100 i / (n + 1) % of the time. Thinned to at most
/// 200 ranks.
struct DurationTail {
  std::vector<double> exceedance;  ///< ascending
  std::vector<double> observed;
  std::vector<double> simulated;
};
DurationTail durationTail(const ShownPairs& pairs);

/// An observed peak and what was simulated for it.
struct ShownPeak {
  std::int64_t second = 0;
  double observed = 0.0;
  double simulated = 0.0;   ///< the largest one of a pair at most 3 days from the observed peak
  double percent = 0.0;     ///< by how much it is larger, of the observed value
  double hoursLater = 0.0;  ///< its time less that of the observed peak
};

/// The 10 largest observed values that no other within 7 days before and after exceeds, the largest first. Of equal
/// ones the first counts. A value beside an end or a gap of the pairs, such as a missing one, is no peak.
std::vector<ShownPeak> largestPeaks(const ShownPairs& pairs);

}  // namespace mirevo
