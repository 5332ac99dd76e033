#include "measures/objective_functions.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/statistics.h"

namespace mirevo {
namespace {

constexpr double kUnknown = std::numeric_limits<double>::quiet_NaN();

bool usesTransformation(AggregationMethod method) {
  return method == AggregationMethod::commonDistance || method == AggregationMethod::commonProbability;
}

/// The standard normal distribution function.
double normalDistribution(double z) {
  constexpr double kOneBySquareRootOfTwo = 0.7071067811865476;
  return 0.5 + 0.5 * std::erf(z * kOneBySquareRootOfTwo);
}

/// Statistics of one objective function over the sample.
struct SampleStatistics {
  double smallest = std::numeric_limits<double>::infinity();
  double largest = -std::numeric_limits<double>::infinity();
  double mean = 0.0;
  double standardDeviation = 0.0;
};

/// Two passes; `sample` holds at least two rows.
SampleStatistics statisticsOf(std::span<const std::vector<double>> sample, std::size_t function) {
  SampleStatistics statistics;
  const auto n = static_cast<double>(sample.size());
  for (const std::vector<double>& row : sample) {
    statistics.smallest = std::min(statistics.smallest, row[function]);
    statistics.largest = std::max(statistics.largest, row[function]);
    statistics.mean += row[function] / n;
  }
  double sumOfSquares = 0.0;
  for (const std::vector<double>& row : sample) {
    const double deviation = row[function] - statistics.mean;
    sumOfSquares += deviation * deviation;
  }
  statistics.standardDeviation = std::sqrt(sumOfSquares / (n - 1.0));
  return statistics;
}

[[noreturn]] void refuseConstant(const std::string& name, double value) {
  fatalError(fmt::format("Error: Objective function \"{}\" has no spread over the initial sample", name),
             fmt::format("every evaluation of it that succeeded gave {}, so it has no scale of its own\n"
                         "check that its output measures respond to the parameters, or give its section "
                         "Standard_Deviation, or use Aggregation_Method = 0",
                         formatReal(value)));
}

}  // namespace

MeasureTerm::MeasureTerm(std::size_t measureIndex, const OutputMeasure& measure) : index(measureIndex) {
  if (!isCriterion(measure)) return;  // the differences have their weights already
  weight = measure.weight;
  contribution = statisticOf(measure.statisticType).inObjective;
}

std::string aggregationMethodName(AggregationMethod method) {
  switch (method) {
    case AggregationMethod::none:
      return "No transformation";
    case AggregationMethod::commonDistance:
      return "Transformation to a common distance scale";
    case AggregationMethod::commonProbability:
      return "Transformation to a common probability scale";
    case AggregationMethod::zero:
      return "";
  }
  return "";
}

std::vector<double> objectiveFunctionValues(std::span<const ObjectiveFunction> functions,
                                            std::span<const double> measureValues) {
  std::vector<double> values(functions.size(), 0.0);
  for (std::size_t j = 0; j < functions.size(); ++j) {
    for (const MeasureTerm& term : functions[j].measures) {
      assert(term.index < measureValues.size());
      const double v = term.valueOf(measureValues[term.index]);
      switch (functions[j].functionType) {
        case FunctionType::sum:
          values[j] += v;
          break;
        case FunctionType::sumOfAbsolutes:
          values[j] += std::abs(v);
          break;
        case FunctionType::sumOfSquares:
          values[j] += v * v;
          break;
      }
    }
  }
  return values;
}

double aggregateObjective(std::span<const double> values, std::span<const double> weights,
                          std::span<const double> sigma, std::span<const double> mu, AggregationMethod method) {
  double aggregate = 0.0;
  for (std::size_t i = 0; i < values.size(); ++i) {
    switch (method) {
      case AggregationMethod::none:
        aggregate += weights[i] * values[i];
        break;
      // μ is added after the division here and subtracted before it below: deliberately different.
      case AggregationMethod::commonDistance:
        aggregate += weights[i] * (values[i] / sigma[i] + mu[i]);
        break;
      case AggregationMethod::commonProbability:
        aggregate += weights[i] * normalDistribution((values[i] - mu[i]) / sigma[i]);
        break;
      case AggregationMethod::zero:
        break;
    }
  }
  return aggregate;
}

ObjectiveAggregator::ObjectiveAggregator(std::span<const ObjectiveFunction> functions, AggregationMethod method)
    : method_(method) {
  for (const ObjectiveFunction& function : functions) {
    names_.push_back(function.name);
    weights_.push_back(function.weight);
    sigma_.push_back(function.standardDeviation.value_or(kUnknown));
    mu_.push_back(function.location.value_or(kUnknown));
  }
}

bool ObjectiveAggregator::isSettled() const {
  const auto isUnknown = [](double value) { return std::isnan(value); };
  return !usesTransformation(method_) ||
         (std::none_of(sigma_.begin(), sigma_.end(), isUnknown) && std::none_of(mu_.begin(), mu_.end(), isUnknown));
}

double ObjectiveAggregator::aggregate(std::span<const double> objectiveValues) const {
  assert(objectiveValues.size() == weights_.size());
  if (!isSettled()) return kUnknown;
  return aggregateObjective(objectiveValues, weights_, sigma_, mu_, method_);
}

void ObjectiveAggregator::fit(std::span<const std::vector<double>> sample) {
  if (isSettled()) return;
  constexpr std::size_t kFewestEvaluations = 2;
  if (sample.size() < kFewestEvaluations) {
    fatalError("Error: Too few evaluations of the initial sample succeeded to transform the objective functions",
               fmt::format("expected at least {}, found {}\nuse a larger initial sample, or give every objective "
                           "function Standard_Deviation and Location",
                           kFewestEvaluations, sample.size()));
  }
  std::vector<double> scaledBest;  // best_i/σ_i
  std::vector<double> means;
  for (std::size_t i = 0; i < names_.size(); ++i) {
    const SampleStatistics statistics = statisticsOf(sample, i);
    if (std::isnan(sigma_[i])) {
      const bool hasSpread = statistics.smallest < statistics.largest && statistics.standardDeviation > 0.0;
      if (!hasSpread) refuseConstant(names_[i], statistics.smallest);
      sigma_[i] = statistics.standardDeviation;
    }
    scaledBest.push_back(statistics.smallest / sigma_[i]);
    means.push_back(statistics.mean);
  }
  const double target = *std::max_element(scaledBest.begin(), scaledBest.end());
  for (std::size_t i = 0; i < names_.size(); ++i) {
    if (!std::isnan(mu_[i])) continue;
    mu_[i] = method_ == AggregationMethod::commonProbability ? means[i] : target - scaledBest[i];
  }
}

std::vector<std::string> ObjectiveAggregator::scaleLines() const {
  std::vector<std::string> lines;
  if (!usesTransformation(method_) || !isSettled()) return lines;
  const char* muName = method_ == AggregationMethod::commonProbability ? "Mean" : "Location parameter";
  for (std::size_t i = 0; i < names_.size(); ++i) {
    lines.push_back(fmt::format("Scale of {}: Standard deviation = {}, {} = {}", names_[i], formatReal(sigma_[i]),
                                muName, formatReal(mu_[i])));
  }
  return lines;
}

}  // namespace mirevo
