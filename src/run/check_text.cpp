#include "run/check_text.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/validation_period.h"
#include "run/setup/setup_summary.h"

namespace mirevo {
namespace {

std::string dateOf(std::int64_t second) {
  return formatDate(dateOfSecond(second));
}

std::string valueAt(std::int64_t second, float value) {
  return fmt::format("{:.6g} at {}", value, dateOf(second));
}

/// "730 values, the first 0.42 at 2002-01-01 00:00, the last 1.7 at 2003-12-31 00:00", of those in the period.
std::string spanText(const PeriodSeries& series, const EvaluationPeriod& period) {
  const std::int64_t start = secondNumber(period.start);
  const std::int64_t end = secondNumber(period.end);
  std::vector<std::size_t> found;
  for (std::size_t i = 0; i < series.seconds.size(); ++i) {
    const bool isInside = series.seconds[i] >= start && series.seconds[i] <= end;
    if (isInside && !std::isnan(series.values[i])) found.push_back(i);
  }
  if (found.empty()) return fmt::format("no value from {} to {}", dateOf(start), dateOf(end));
  const auto at = [&series](std::size_t i) { return valueAt(series.seconds[i], series.values[i]); };
  return fmt::format("{}, the first {}, the last {}", countText(found.size(), "value"), at(found.front()),
                     at(found.back()));
}

/// "simulated 0.5, observed 0.42 at 2002-01-01 00:00"; without observations the simulated value alone.
std::string pairAt(std::int64_t second, const PeriodSeries& simulated, const PeriodSeries* observed, double gap) {
  const auto value = [second](const PeriodSeries& series, double largestGap) {
    return valuesAt(series, std::span(&second, 1), largestGap).front();
  };
  const std::string other = observed != nullptr ? fmt::format(", observed {:.6g}", value(*observed, kAnyGap)) : "";
  return fmt::format("simulated {:.6g}{} at {}", value(simulated, gap), other, dateOf(second));
}

class Lines final {
 public:
  explicit Lines(const CheckedRun& run) : run_(run), period_(hullOf(run.config.period, run.config.validationPeriods)) {}

  std::vector<std::string> take() {
    for (std::size_t i = 0; i < run_.config.measures.size(); ++i) addMeasure(i);
    line("Objective functions:");
    for (std::size_t i = 0; i < run_.config.objectives.size(); ++i) {
      line("   {} = {:.6g}", run_.config.objectives[i].name, run_.result.objectiveValues.at(i));
    }
    if (run_.hasAggregate) {
      line("Aggregate: {:.6g}", run_.result.aggregate);
    } else {
      line("Aggregate: not known before the initial sample, which scales the objective functions");
    }
    return std::move(lines_);
  }

 private:
  template <typename... Arguments>
  void line(fmt::format_string<Arguments...> form, Arguments&&... arguments) {
    lines_.push_back(fmt::format(form, std::forward<Arguments>(arguments)...));
  }

  void addMeasure(std::size_t index) {
    const OutputMeasure& measure = run_.config.measures[index];
    const MeasureSource& source = run_.sources[index];
    const std::string statistic = source.isSeries ? ", " + statisticWithBest(measure) : std::string();
    line("Output measure {}{}: {:.6g}", source.name, statistic, run_.result.measureValues.at(index));
    if (!source.isSeries) {
      const std::string_view name = trim(measure.measurementName);
      line("   number No. {} of {}{}", measure.measurementNo, source.fileName,
           name.empty() ? "" : fmt::format(", {}", name));
      return;
    }
    addSeries(index);
  }

  /// The place of the series that `isIts` says are those of the measure.
  template <class IsIts>
  std::optional<std::size_t> placeOf(const IsIts& isIts) const {
    const auto shown = std::find_if(run_.shown.begin(), run_.shown.end(), isIts);
    if (shown == run_.shown.end()) return std::nullopt;
    return static_cast<std::size_t>(shown - run_.shown.begin());
  }

  void addSeries(std::size_t index) {
    const std::vector<OutputMeasure>& measures = run_.config.measures;
    auto place = placeOf([&](std::size_t other) { return other == index; });
    if (!place) place = placeOf([&](std::size_t other) { return isSamePair(measures[other], measures[index]); });
    const bool hasOwn = place.has_value();
    // Of many pairs series are shared by measures that may count other observations.
    if (!place) place = placeOf([&](std::size_t other) { return isMatchedAlike(measures[other], measures[index]); });
    if (!place) return;
    const MeasureSource& source = run_.sources[index];
    const PeriodSeries& simulated = run_.result.shownSeries.at(*place);
    const PeriodSeries* const observed = hasOwn ? &run_.observations[*place] : nullptr;
    line("   simulated: {}: {}", source.simulated, spanText(simulated, period_));
    line("   observed: {}{}", source.observed, observed != nullptr ? ": " + spanText(*observed, period_) : "");
    const auto& all = run_.result.pairs;
    const auto pairs =
        std::find_if(all.begin(), all.end(), [index](const MeasurePairs& each) { return each.measure == index; });
    if (pairs == all.end()) return;
    const double gap = run_.config.period.largestGapDays();
    line("   {}, {} without a simulated value", countText(pairs->count, "pair"),
         countText(pairs->missingCount, "observation"));
    line("   first pair: {}", pairAt(pairs->first, simulated, observed, gap));
    line("   last pair: {}", pairAt(pairs->last, simulated, observed, gap));
    line("   in the pairs: simulated {}; observed {}", rangeOf(pairs->simulated), rangeOf(pairs->observed));
  }

  static std::string rangeOf(const ValueSummary& values) {
    return fmt::format("{:.6g} to {:.6g}, mean {:.6g}", values.least, values.largest, values.mean);
  }

  const CheckedRun& run_;
  EvaluationPeriod period_;
  std::vector<std::string> lines_;
};

}  // namespace

std::vector<std::string> checkedRunLines(const CheckedRun& run) {
  return Lines(run).take();
}

}  // namespace mirevo
