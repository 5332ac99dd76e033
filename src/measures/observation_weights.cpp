#include "measures/observation_weights.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <limits>
#include <map>
#include <optional>
#include <span>
#include <string_view>
#include <tuple>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/measure_statistics.h"
#include "measures/observation_selection.h"
#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// Also in 32 bits, as a file may hold them: 1.1 is 1.1 in each.
bool contains(std::span<const double> codes, double code) {
  constexpr double kLargestExact = 16777216.0;  // of the whole numbers in 32 bits
  return std::ranges::any_of(codes, [code](double listed) {
    const bool isAsFloat = static_cast<float>(listed) == static_cast<float>(code);
    return listed == code || (isAsFloat && std::abs(listed) < kLargestExact);
  });
}

/// The values of another item of the file, NaN where one is missing; empty for item 0.
std::span<const double> itemValues(TimeSeriesObject& observation, const OutputMeasure& measure, std::int32_t item,
                                   const std::string& location) {
  if (item == 0) return {};
  requireItem(observation, {.fileName = measure.observation.fileName, .itemNo = item, .itemLocation = location});
  return observation.exactValues(item);
}

/// Beyond these the square of a weighted difference may leave the range of 32 bits, which statistics may use.
constexpr double kSmallest = 1e-12;
constexpr double kLargest = 1e12;

double weightOf(const ObservationWeighting& weighting, double value) {
  const bool isUsable = value >= kSmallest && value <= kLargest;
  if (weighting.errorItem != 0) return isUsable ? 1.0 / value : kNaN;
  if (std::isnan(value) || value == 0.0) return 0.0;
  return isUsable ? value : kNaN;
}

/// By their numbers where both are known, as a name may be written in several ways.
bool isSameItem(std::int32_t a, const std::string& nameOfA, std::int32_t b, const std::string& nameOfB) {
  if (a != 0 && b != 0) return a == b;
  return nameOfA == nameOfB && (!nameOfA.empty() || a == b);
}

/// Whether the observed item has a value, per step.
std::vector<bool> observedSteps(TimeSeriesObject& observation, const OutputMeasure& measure) {
  requireItem(observation, measure.observation);
  const std::span<const float> values = observation.values(measure.observation.itemNo);
  const std::optional<float> deleteValue = observation.deleteValue();
  std::vector<bool> observed;
  for (const float value : values) observed.push_back(!isMissing(value, deleteValue));
  return observed;
}

/// Calls `use(step)` for each step in the period, 0-based.
template <class Use>
void forEachStepIn(const EvaluationPeriod& period, const TimeSeriesObject& observation, const Use& use) {
  const std::optional<DateRecord> start = observation.startTime();
  if (!start) return;
  const double first = daysSince(*start, period.start) - kSameTimeDays;
  const double last = daysSince(*start, period.end) + kSameTimeDays;
  const std::span<const double> times = observation.times();
  for (std::size_t k = 0; k < times.size(); ++k) {
    if (times[k] >= first && times[k] <= last) use(k);
  }
}

/// Calls `use(step)` for each step in the period whose observation the measure's selection does not leave out.
template <class Use>
void forEachCounted(TimeSeriesObject& observation, const OutputMeasure& measure, const EvaluationPeriod& period,
                    const Use& use) {
  const std::optional<DateRecord> start = observation.startTime();
  if (!start) return;
  const ObservationFilter filter(measure.selection, *start);
  const std::span<const float> values = observation.values(measure.observation.itemNo);
  forEachStepIn(countedPeriod(measure, period), observation, [&](std::size_t step) {
    if (filter.counts(observation.times()[step], values[step])) use(step);
  });
}

std::string nameOf(const TimeSeriesObject& observation, std::int32_t item) {
  return fmt::format("item No. {} ({})", item, observation.itemName(item));
}

[[noreturn]] void refuseWeight(TimeSeriesObject& observation, const OutputMeasure& measure, std::size_t step) {
  const ObservationWeighting& weighting = measure.weighting;
  const bool isError = weighting.errorItem != 0;
  const std::int32_t item = isError ? weighting.errorItem : weighting.weightItem;
  const double value = observation.exactValues(item)[step];
  const std::int64_t second = secondAfter(secondNumber(observation.startTime().value()), observation.times()[step]);
  fatalError(
      "Error: Invalid weight of an observation for output measure " + measure.name,
      fmt::format("{}{}: {} is {} at {}, where the observation counts\n{}", weighting.weightLocation,
                  trimTrailing(measure.observation.fileName), nameOf(observation, item),
                  std::isnan(value) ? "missing" : formatReal(value), formatDate(dateOfSecond(second)),
                  isError
                      ? "expected a standard error from 1e-12 to 1e12; leave out observations without one by a "
                        "quality code, or mark them as missing"
                      : "expected a weight from 1e-12 to 1e12, or 0; 0, or a missing one, leaves the observation out"));
}

/// "no observation in the evaluation period has a code of Quality_Left_Out (5); there are 0 (360 times), 1 (5)"
std::string doubtOfList(std::string_view keyword, std::span<const double> codes,
                        const std::map<double, std::size_t>& counts) {
  constexpr std::size_t kMostNamed = 10;
  const auto isListed = [codes](const auto& count) { return contains(codes, count.first); };
  if (codes.empty() || std::ranges::any_of(counts, isListed)) return {};
  std::string present;
  std::size_t named = 0;
  for (const auto& [code, count] : counts) {
    if (++named > kMostNamed) break;
    present +=
        fmt::format("{}{} ({})", present.empty() ? "; there are " : ", ", formatReal(code), countText(count, "time"));
  }
  if (named > kMostNamed) present += ", ...";
  return fmt::format("no observation in the evaluation period has a code of {} ({}){}", keyword, fmt::join(codes, ", "),
                     present);
}

}  // namespace

std::vector<int> ObservationWeighting::items() const {
  std::vector<int> found;
  for (const std::int32_t item : {weightItem, errorItem, qualityItem}) {
    if (item != 0) found.push_back(item);
  }
  return found;
}

bool ObservationWeighting::operator==(const ObservationWeighting& other) const {
  const auto meaning = [](const ObservationWeighting& w) {
    return std::tie(w.leftOut, w.downWeighted, w.qualityWeight);
  };
  return isSameItem(weightItem, weightName, other.weightItem, other.weightName) &&
         isSameItem(errorItem, errorName, other.errorItem, other.errorName) &&
         isSameItem(qualityItem, qualityName, other.qualityItem, other.qualityName) && meaning(*this) == meaning(other);
}

std::vector<double> stepWeights(TimeSeriesObject& observation, const OutputMeasure& measure) {
  const ObservationWeighting& weighting = measure.weighting;
  if (!weighting.isUsed()) return {};
  const std::vector<bool> observed = observedSteps(observation, measure);
  const std::span<const double> given =
      itemValues(observation, measure, std::max(weighting.weightItem, weighting.errorItem), weighting.weightLocation);
  const std::span<const double> codes =
      itemValues(observation, measure, weighting.qualityItem, weighting.qualityLocation);
  std::vector<double> weights(observed.size(), 0.0);
  for (std::size_t k = 0; k < weights.size(); ++k) {
    if (!observed[k] || (!codes.empty() && contains(weighting.leftOut, codes[k]))) continue;
    double weight = given.empty() ? 1.0 : weightOf(weighting, given[k]);
    if (!codes.empty() && contains(weighting.downWeighted, codes[k])) weight *= weighting.qualityWeight;
    weights[k] = weight;
  }
  return weights;
}

std::vector<double> observationWeights(TimeSeriesObject& observation, const OutputMeasure& measure,
                                       const EvaluationPeriod& period) {
  std::vector<double> weights = stepWeights(observation, measure);
  if (weights.empty()) return weights;
  forEachCounted(observation, measure, period, [&](std::size_t step) {
    if (std::isnan(weights[step])) refuseWeight(observation, measure, step);
  });
  return weights;
}

std::vector<std::string> doubtsOfCodes(TimeSeriesObject& observation, const OutputMeasure& measure,
                                       const EvaluationPeriod& period) {
  const ObservationWeighting& weighting = measure.weighting;
  std::vector<std::string> doubts;
  if (weighting.qualityItem == 0) return doubts;
  const std::vector<bool> observed = observedSteps(observation, measure);
  const std::span<const double> codes =
      itemValues(observation, measure, weighting.qualityItem, weighting.qualityLocation);
  std::map<double, std::size_t> counts;
  forEachStepIn(period, observation, [&](std::size_t step) {
    if (observed[step] && !std::isnan(codes[step])) ++counts[codes[step]];
  });
  for (const std::string& doubt : {doubtOfList("Quality_Left_Out", weighting.leftOut, counts),
                                   doubtOfList("Quality_Down_Weighted", weighting.downWeighted, counts)}) {
    if (doubt.empty()) continue;
    doubts.push_back(fmt::format("{}: {}: {}", trimTrailing(measure.observation.fileName),
                                 nameOf(observation, weighting.qualityItem), doubt));
  }
  return doubts;
}

void requireCounting(TimeSeriesObject& observation, const OutputMeasure& measure, const EvaluationPeriod& period) {
  const std::vector<double> weights = observationWeights(observation, measure, period);
  if (weights.empty()) return;
  const std::vector<bool> observed = observedSteps(observation, measure);
  std::size_t count = 0;
  bool anyCounts = false;
  forEachCounted(observation, measure, period, [&](std::size_t step) {
    count += observed[step] ? 1 : 0;
    anyCounts = anyCounts || weights[step] != 0.0;
  });
  if (count == 0 || anyCounts) return;
  const ObservationWeighting& weighting = measure.weighting;
  std::string causes;
  if (!weighting.leftOut.empty()) {
    causes = fmt::format("a code of Quality_Left_Out ({})", fmt::join(weighting.leftOut, ", "));
  }
  if (weighting.weightItem != 0) {
    causes += fmt::format("{}the weight 0 or none in {}", causes.empty() ? "" : ", or ",
                          nameOf(observation, weighting.weightItem));
  }
  fatalError("Error: No observation counts for output measure " + measure.name,
             fmt::format("{}{}: each of {} of item No. {} ({}) that the measure's period, months and limits leave in "
                         "the evaluation period has {}\n"
                         "{}compare another item or period",
                         weighting.leftOut.empty() ? weighting.weightLocation : weighting.qualityLocation,
                         trimTrailing(measure.observation.fileName), countText(count, "value"),
                         measure.observation.itemNo, observation.itemName(measure.observation.itemNo), causes,
                         weighting.leftOut.empty() ? "" : "take codes out of the list, or "));
}

std::string describeWeighting(const ObservationWeighting& weighting) {
  std::vector<std::string> parts;
  const auto addItem = [&parts](std::string_view what, std::int32_t item, const std::string& name) {
    if (!name.empty()) parts.push_back(fmt::format("{} in item {}", what, quotedForMessage(name)));
    if (name.empty() && item != 0) parts.push_back(fmt::format("{} in item No. {}", what, item));
  };
  addItem("weights", weighting.weightItem, weighting.weightName);
  addItem("standard errors", weighting.errorItem, weighting.errorName);
  addItem("quality codes", weighting.qualityItem, weighting.qualityName);
  if (!weighting.leftOut.empty()) parts.push_back(fmt::format("left out {}", fmt::join(weighting.leftOut, " ")));
  if (!weighting.downWeighted.empty()) {
    parts.push_back(fmt::format("weight {} for {}", weighting.qualityWeight, fmt::join(weighting.downWeighted, " ")));
  }
  return fmt::format("{}", fmt::join(parts, ", "));
}

}  // namespace mirevo
