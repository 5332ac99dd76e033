#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "parameters/model_parameter.h"
#include "report/json_writer.h"

namespace mirevo {

/// What GLUE has found of one parameter.
struct ReportedGlueParameter {
  std::string name;
  bool isLogarithmic = false;       ///< its bins are of equal width in logarithms
  std::vector<double> values;       ///< of the sets of ReportedGlue::numbers
  std::vector<double> edges;        ///< of the bins, ascending; one more than there are bins
  std::vector<double> drawnShare;   ///< of the successful sets, one per bin
  std::vector<double> weightShare;  ///< of the weight of the behavioural sets
  double distance = 0.0;            ///< of the two distributions, as in the log; NaN without a behavioural set
};

/// The weights of GLUE. Dots of more than a few thousand behavioural sets are thinned; shares are of all.
struct ReportedGlue {
  std::vector<std::string> choices;  ///< what is behavioural, and the likelihood
  std::size_t successCount = 0;
  std::size_t behaviouralCount = 0;
  double effectiveCount = 0.0;
  double distanceLimit = 0.0;  ///< below which a distance may be chance; NaN without a behavioural set
  std::vector<int> numbers;    ///< evaluations with a dot, rising
  std::vector<double> weights;
  std::vector<double> judged;  ///< their values of what judges
  std::vector<ReportedGlueParameter> parameters;
};

/// The weights that GLUE has written beside its results; empty if they cannot be read, with the reason in `fault`.
std::optional<ReportedGlue> reportedGlue(const std::string& filePrefix, std::span<const ModelParameter> parameters,
                                         std::string& fault);

/// As the member "glue".
void writeGlue(JsonWriter& json, const ReportedGlue& glue);

}  // namespace mirevo
