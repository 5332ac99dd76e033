#include "evaluation/evaluation_result.h"

#include <algorithm>
#include <array>
#include <limits>
#include <utility>

namespace mirevo {
namespace {

struct KindNames {
  std::string_view key;
  std::string_view name;
};

/// In the order of the kinds. The keys are used in files and never change; the names are for people.
constexpr std::array<KindNames, 14> kKinds = {{
    {"constraintsViolated", "parameter constraints violated"},
    {"equationNotFinite", "equation without a finite value"},
    {"valueNotWritable", "value that cannot be written in its field"},
    {"couldNotStart", "batch could not be started"},
    {"exitCode", "batch ended with an exit code"},
    {"signal", "batch ended by a signal"},
    {"timedOut", "batch ran too long"},
    {"resultsNotWritten", "results not written"},
    {"resultsNotReadable", "results not readable"},
    {"resultNotFinite", "result not finite"},
    {"resultsCutOff", "results cut off"},
    {"tooFewPairs", "too few pairs of simulated and observed values"},
    {"notKnown", "reason not known any more"},
    {"notMade", "not made"},
}};

}  // namespace

std::string_view failureKindName(EvaluationFailure::Kind kind) {
  return kKinds.at(static_cast<std::size_t>(kind)).name;
}

std::string_view failureKindKey(EvaluationFailure::Kind kind) {
  return kKinds.at(static_cast<std::size_t>(kind)).key;
}

std::optional<EvaluationFailure::Kind> failureKindOfKey(std::string_view key) {
  const auto found =
      std::find_if(kKinds.begin(), kKinds.end(), [key](const KindNames& kind) { return kind.key == key; });
  if (found == kKinds.end()) return std::nullopt;
  return static_cast<EvaluationFailure::Kind>(found - kKinds.begin());
}

void EvaluationResult::fail(EvaluationFailure why) {
  measureValues.assign(measureValues.size(), kFailedRunValue);
  objectiveValues.assign(objectiveValues.size(), kFailedRunValue);
  aggregate = kFailedRunValue;
  validationValues.assign(validationValues.size(), std::numeric_limits<double>::quiet_NaN());
  exactMeasures.clear();
  simulatedValues.clear();
  shownSeries.clear();
  validationPairs.clear();
  unusedObservations.clear();
  pairs.clear();
  lastOutput.clear();
  failure = std::move(why);
}

}  // namespace mirevo
