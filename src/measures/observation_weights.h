#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "common/date_record.h"

namespace mirevo {

class TimeSeriesObject;
struct EvaluationPeriod;
struct OutputMeasure;

/// What other items of an observation file say of how much each observation counts. A weight multiplies the difference
/// of its pair.
struct ObservationWeighting {
  std::int32_t weightItem = 0;   ///< with weights; 0: none
  std::int32_t errorItem = 0;    ///< with standard errors, of which the weights are the inverses; 0: none
  std::int32_t qualityItem = 0;  ///< with quality codes; 0: none
  std::string weightName = {};   ///< the names of these items as the setup has them; empty: of a number
  std::string errorName = {};
  std::string qualityName = {};
  std::vector<double> leftOut;       ///< codes of observations that do not count
  std::vector<double> downWeighted;  ///< codes of those with a factor on their weight
  double qualityWeight = 0.5;        ///< that factor
  /// What begins the detail of an error in weights and in codes, "setup.kdx:75:23: Error_Item_No: "; empty if it is not
  /// known.
  std::string weightLocation = {};
  std::string qualityLocation = {};

  /// Whether the setup tells such an item, whose number need not be known yet.
  bool hasWeights() const { return weightItem != 0 || !weightName.empty(); }
  bool hasErrors() const { return errorItem != 0 || !errorName.empty(); }
  bool hasCodes() const { return qualityItem != 0 || !qualityName.empty(); }
  /// Whether an observation may have a weight other than 0 and 1.
  bool weighs() const { return hasWeights() || hasErrors() || !downWeighted.empty(); }
  bool isUsed() const { return weighs() || !leftOut.empty(); }
  /// Its items, without 0.
  std::vector<int> items() const;

  /// Whether the same observations count in the same way.
  bool operator==(const ObservationWeighting& other) const;
};

/// One weight per step of an observation file; empty if all are 1. 0: there is no observation that counts. NaN: there
/// is one whose weight is invalid (a weight that is neither 0 nor from 1e-12 to 1e12, or a standard error that is not
/// from 1e-12 to 1e12 or missing). Throws FatalError if an item cannot be read.
std::vector<double> stepWeights(TimeSeriesObject& observation, const OutputMeasure& measure);
/// The same; throws FatalError, with file, item and time, if there is an invalid one in the period.
std::vector<double> observationWeights(TimeSeriesObject& observation, const OutputMeasure& measure,
                                       const EvaluationPeriod& period);

/// What the user should know of the codes of a file: each list of which no observation in the period has a code.
std::vector<std::string> doubtsOfCodes(TimeSeriesObject& observation, const OutputMeasure& measure,
                                       const EvaluationPeriod& period);
/// Throws FatalError if there are observations in the period, and none of them counts.
void requireCounting(TimeSeriesObject& observation, const OutputMeasure& measure, const EvaluationPeriod& period);

/// For people: "standard errors in item No. 2, left out 5 7"; empty if all weights are 1.
std::string describeWeighting(const ObservationWeighting& weighting);

}  // namespace mirevo
