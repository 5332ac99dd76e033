#include "measures/weighted_residuals.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/criteria.h"
#include "measures/dates.h"
#include "measures/period_series.h"
#include "measures/statistics.h"
#include "measures/value_transformation.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// What a measure is of the sum of its squared residuals.
enum class SumOfSquares { itself, share, root, rootOfShare, number, none };

SumOfSquares kindOf(const OutputMeasure& measure) {
  if (measure.interfaceType == InterfaceType::measureFile) return SumOfSquares::number;
  if (measure.transformation == ValueTransformation::rank) return SumOfSquares::none;
  if (measure.statisticType == StatisticType::rootMeanSquare) return SumOfSquares::root;
  const std::string_view name = statisticOf(measure.statisticType).key.name;
  if (name == "sum of squared errors") return SumOfSquares::itself;
  if (name == "NSE" || name == "log-NSE" || name == "sqrt-NSE") return SumOfSquares::share;
  if (name == "RSR") return SumOfSquares::rootOfShare;
  return SumOfSquares::none;
}

bool isRoot(SumOfSquares kind) {
  return kind == SumOfSquares::root || kind == SumOfSquares::rootOfShare || kind == SumOfSquares::number;
}

/// Those whose transformation is the setup's, if the residual can have it: ranks are of all values together.
ValueTransformation usedTransformation(const OutputMeasure& measure) {
  const ValueTransformation found = transformationOf(measure);
  return found == ValueTransformation::rank ? ValueTransformation::none : found;
}

/// The weight of a measure's squares in the sum: that of what the aggregate adds, squared where it adds a root.
double weightOf(const ObjectiveFunction& objective, const MeasureTerm& term, SumOfSquares kind, bool isScaled) {
  double weight = objective.weight;
  if (isScaled && objective.standardDeviation) weight /= *objective.standardDeviation;
  const bool squares = objective.functionType == FunctionType::sumOfSquares;
  if (isRoot(kind)) return (squares ? weight : weight * weight) * term.weight * term.weight;
  return (squares ? std::sqrt(weight) : weight) * term.weight;
}

}  // namespace

std::optional<std::string> WeightedResiduals::problemOf(std::span<const OutputMeasure> measures,
                                                        std::span<const ObjectiveFunction> objectives) {
  bool hasAny = false;
  for (const ObjectiveFunction& objective : objectives) {
    if (objective.weight < 0.0) {
      return fmt::format(
          "objective function {} has the weight {}: expected one that is not negative, as squares are "
          "added",
          quotedForMessage(objective.name), objective.weight);
    }
    for (const MeasureTerm& term : objective.measures) {
      const OutputMeasure& measure = measures[term.index];
      if (term.weight < 0.0) {
        return fmt::format(
            "output measure {} has the weight {}: expected one that is not negative, as squares are "
            "added",
            quotedForMessage(measure.name), term.weight);
      }
      if (measure.interfaceType == InterfaceType::measureFile && !measure.observedValue &&
          objective.functionType != FunctionType::sumOfSquares) {
        return fmt::format(
            "output measure {} is a number that the model computes, without Observed_Value: expected "
            "this, or an objective function with Function_Type = 2, a sum of squares",
            quotedForMessage(measure.name));
      }
      hasAny = hasAny || objective.weight > 0.0;
    }
  }
  if (hasAny) return std::nullopt;
  return "no output measure enters an objective function with a weight";
}

WeightedResiduals::WeightedResiduals(std::span<const OutputMeasure> measures,
                                     std::span<const ObjectiveFunction> objectives, AggregationMethod aggregation,
                                     std::span<const ObservedSeries> observed)
    : measures_(measures) {
  const bool isScaled =
      aggregation == AggregationMethod::commonDistance || aggregation == AggregationMethod::commonProbability;
  for (const bool isOfOthers : {false, true}) {
    for (const ObjectiveFunction& objective : objectives) {
      for (const MeasureTerm& term : objective.measures) {
        const OutputMeasure& measure = measures[term.index];
        const SumOfSquares kind = kindOf(measure);
        if ((kind == SumOfSquares::none) != isOfOthers) continue;
        if (isOfOthers) others_.push_back(term.index);
        const bool isThere = isOfOthers && std::ranges::any_of(terms_, [&](const Term& other) {
                               return isSamePair(measure, measures[other.measure]);
                             });
        const double weight = weightOf(objective, term, kind, isScaled);
        if (!isThere && weight > 0.0) addTerm(term.index, weight, observed);
      }
    }
  }
}

void WeightedResiduals::addTerm(std::size_t measure, double weight, std::span<const ObservedSeries> observed) {
  Term term;
  term.measure = measure;
  term.weight = weight;
  if (measures_[measure].interfaceType == InterfaceType::timeSeries) {
    for (const ObservedSeries& series : observed) {
      if (series.measure == measure) {
        term.observed = &series;
        break;
      }
      term.first += 2 * series.values.size();
    }
    if (term.observed == nullptr) return;
    constexpr double kShareOfMean = 0.01;  // as the statistics take it where the setup gives none
    const OutputMeasure& of = measures_[measure];
    term.epsilon = of.epsilon.value_or(kShareOfMean * std::abs(meanOf(term.observed->values)));
    term.values = transformed(term.observed->values, usedTransformation(of), term.epsilon, of.boxCoxLambda);
  } else {
    term.factor = std::sqrt(weight);
  }
  terms_.push_back(std::move(term));
}

void WeightedResiduals::settle(std::span<const double> simulated) {
  isSettled_ = true;
  for (Term& term : terms_) {
    if (term.observed == nullptr) continue;
    std::vector<double> values;
    std::vector<double> weights;
    for (std::size_t t = 0; t < term.values.size(); ++t) {
      if (!std::isfinite(simulated[term.first + t]) || !std::isfinite(term.values[t])) continue;
      term.rows.push_back(t);
      values.push_back(term.values[t]);
      if (!term.observed->weights.empty()) weights.push_back(term.observed->weights[t]);
    }
    const OutputMeasure& measure = measures_[term.measure];
    const SumOfSquares kind = kindOf(measure);
    double divisor = 1.0;
    const bool isShare = kind == SumOfSquares::share || kind == SumOfSquares::rootOfShare;
    if (isShare || (kind == SumOfSquares::none && isCriterion(measure))) {
      const double mean = meanOf(values, weights);
      divisor = sumOfSquaredErrors({values, std::vector<double>(values.size(), mean), weights});
    } else if (kind != SumOfSquares::itself) {
      divisor = static_cast<double>(values.size());
    }
    term.factor = divisor > 0.0 ? std::sqrt(term.weight / divisor) : 0.0;
  }
}

void WeightedResiduals::appendRows(const Term& term, std::span<const double> simulated, ResidualRows& rows) const {
  const OutputMeasure& measure = measures_[term.measure];
  const std::size_t count = term.values.size();
  const ValueTransformation transformation = usedTransformation(measure);
  for (const std::size_t t : term.rows) {
    const double value = simulated[term.first + t];
    const double unit = simulated[term.first + count + t];
    const double both[] = {value, value + (std::isfinite(unit) ? unit : 0.0)};
    const std::vector<double> found = transformed(both, transformation, term.epsilon, measure.boxCoxLambda);
    const double difference = found[0] - term.values[t];
    double weight = term.factor;
    // The weights of a criterion's measure are those of its contribution.
    if (!isCriterion(measure)) weight *= difference > 0.0 ? measure.weightAbove : measure.weight;
    if (!term.observed->weights.empty()) weight *= term.observed->weights[t];
    rows.values.push_back(weight * difference);
    const double change = std::abs(weight * (found[1] - found[0]));
    rows.units.push_back(std::isfinite(change) ? change : 0.0);
  }
}

ResidualRows WeightedResiduals::of(std::span<const double> simulated, std::span<const double> measureValues) {
  if (!isSettled_) settle(simulated);
  ResidualRows rows;
  for (const Term& term : terms_) {
    if (term.observed != nullptr) {
      appendRows(term, simulated, rows);
    } else {
      rows.values.push_back(term.measure < measureValues.size() ? term.factor * measureValues[term.measure] : kNaN);
      rows.units.push_back(0.0);
    }
  }
  return rows;
}

std::vector<WeightedResiduals::Label> WeightedResiduals::labels() const {
  std::vector<Label> labels;
  for (const Term& term : terms_) {
    if (term.observed == nullptr) {
      labels.push_back({term.measure, {}});
      continue;
    }
    const std::int64_t origin = secondNumber(term.observed->start);
    for (const std::size_t t : term.rows) {
      labels.push_back({term.measure, isoTime(secondAfter(origin, term.observed->days[t]))});
    }
  }
  return labels;
}

}  // namespace mirevo
