#pragma once

#include <cstdint>
#include <string>

#include "common/date_record.h"
#include "common/settings/code_name.h"

namespace mirevo {

enum class InterfaceType : std::int32_t { timeSeries = 0, measureFile = 1 };
inline constexpr CodeName kInterfaceTypeNames[] = {{0, "time series"}, {1, "measure file"}};

/// A statistic by its place in their table (measures/statistics.h); the first ones have it as their code, too.
enum class StatisticType : std::int32_t {
  mean = 0,
  rootMeanSquare = 1,
  standardDeviation = 2,
  peakDifference = 3,
  lowDifference = 4
};

/// One item of a time-series file.
struct SeriesReference {
  std::string fileName;  ///< absolute; trailing blanks trimmed
  std::int32_t itemNo = 1;
};

/// One comparison of a simulated with an observed series, or a value that the model wrote, reduced to one number.
struct OutputMeasure {
  std::string name;
  InterfaceType interfaceType = InterfaceType::timeSeries;
  std::int32_t measurementNo = 1;  ///< which number of the output-measure file, from 1
  StatisticType statisticType = StatisticType::mean;
  double weight = 1.0;         ///< of simulations at or below the observation
  double weightAbove = 1.0;    ///< of simulations above it
  std::string functionName;    ///< the objective function it belongs to; empty: none
  SeriesReference simulation;  ///< in or below the base folder
  SeriesReference observation;
};

struct EvaluationPeriod {
  DateRecord start{};
  DateRecord end{};
};

}  // namespace mirevo
