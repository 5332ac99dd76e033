#include "run/tasks/dream_target.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/period_series.h"
#include "measures/statistics.h"

namespace mirevo {
namespace {

constexpr double kInfinity = std::numeric_limits<double>::infinity();

/// The value of a term with one number, or its bounds; the default where the setup says nothing.
std::vector<double> numbersOf(ErrorTerm term, const ErrorModelSettings& common, const ErrorModelSettings* own,
                              LikelihoodForm form) {
  const ErrorTermRow& row = errorTermRows()[term];
  if (!readsTerm(form, term)) return {row.neutral};
  if (own != nullptr && !own->terms[term].empty()) return own->terms[term];
  if (!common.terms[term].empty()) return common.terms[term];
  if (!hasTerm(form, term)) return {row.neutral};
  return {row.lower, row.upper};
}

}  // namespace

DreamTarget::DreamTarget(const DreamSection& settings, const ParameterDistributions& prior,
                         const LikelihoodBasis& basis)
    : prior_(prior), lower_(basis.space.lower), upper_(basis.space.upper) {
  if (settings.errors.form == LikelihoodForm::objective) {
    objective_ = static_cast<std::size_t>(settings.objective);
  } else {
    addSeries(settings, basis);
  }
  for (const Dimension& dimension : errors_) {
    lower_.push_back(dimension.lower);
    upper_.push_back(dimension.upper);
  }
}

void DreamTarget::addSeries(const DreamSection& settings, const LikelihoodBasis& basis) {
  std::size_t first = 0;
  const std::vector<std::size_t> compared = measuresOfLikelihood(basis.measures, basis.objectives);
  for (std::size_t k = 0; k < basis.observed.size(); ++k) {
    const ObservedSeries& observed = basis.observed[k];
    const std::size_t begin = std::exchange(first, first + 2 * observed.values.size());  // values, then their units
    const OutputMeasure& measure = basis.measures[observed.measure];
    if (std::ranges::find(compared, observed.measure) == compared.end()) continue;
    const auto found = settings.own.find(observed.measure + 1);
    const ErrorModelSettings* const own = found == settings.own.end() ? nullptr : &found->second;
    const LikelihoodForm form = own != nullptr && own->form ? *own->form : *settings.errors.form;
    const double shift = own != nullptr && own->shift ? *own->shift : settings.errors.shift.value_or(0.0);
    SeriesErrors errors(form, shift, observed.days, observed.values, observed.weights);
    const std::size_t count = errors.count();
    series_.push_back({measure.name, k, begin, std::move(errors), count, neutralErrors(), {}});
    addTerms(settings, own, form, series_.back());
  }
  // Two measures that compare the same, by the number and by the name of an item, are told apart until here.
  for (const auto& [number, own] : settings.own) {
    if (std::ranges::find(compared, number - 1) != compared.end()) continue;
    fatalError(kDreamLikelihoodRefusal, fmt::format("{}{}: {}", kErrorModelPrefix, number, kErrorModelMeasure));
  }
}

void DreamTarget::addTerms(const DreamSection& settings, const ErrorModelSettings* own, LikelihoodForm form,
                           Series& series) {
  const ErrorModelSettings& common = settings.errors;
  const std::string& measure = series.name;
  const std::vector<double> lambda = numbersOf(kLambda, common, own, form);
  const bool isTransformed = lambda != std::vector<double>{1.0};
  if (isTransformed) {
    if (const auto value = series.errors.untransformable()) {
      fatalError(kDreamLikelihoodRefusal,
                 fmt::format("{}: the observation {:g} of {} has no Box-Cox transformation: expected a Box_Cox_Shift "
                             "with which all observations are above 0",
                             settings.place, *value, quotedForMessage(measure)));
    }
  }
  for (std::size_t k = 0; k < kErrorTermCount; ++k) {
    const auto term = static_cast<ErrorTerm>(k);
    const ErrorTermRow& row = errorTermRows()[k];
    std::vector<double> numbers = numbersOf(term, common, own, form);
    if (term == kDeviation && numbers.back() == 0.0) {
      const double one = series.errors.deviation(lambda.front());
      const double other = series.errors.deviation(lambda.back());
      numbers = {kLeastDeviation * std::min(one, other), kMostDeviation * std::max(one, other)};
      if (!(numbers.front() > 0.0)) {
        fatalError(kDreamLikelihoodRefusal,
                   fmt::format("{}: the observations of {} do not vary{}: expected {} with a value or with bounds{}",
                               settings.place, quotedForMessage(measure),
                               isTransformed ? " after the Box-Cox transformation, or too widely for a number" : "",
                               row.keyword, isTransformed ? ", or another Box_Cox_Shift or Box_Cox_Lambda" : ""));
      }
    }
    if (numbers.size() == 1) {
      series.fixed[k] = numbers.front();
      continue;
    }
    const bool isLogarithmic = row.isLogarithmic && numbers.front() > 0.0;
    series.dimensions[k] = prior_.size() + errors_.size();
    errors_.push_back({fmt::format("{} of {}", row.symbol, measure),
                       isLogarithmic ? std::log(numbers.front()) : numbers.front(),
                       isLogarithmic ? std::log(numbers.back()) : numbers.back(), isLogarithmic});
  }
}

std::vector<double> DreamTarget::pointAt(std::span<const double> unit) const {
  std::vector<double> point = prior_.setAt(unit.first(prior_.size()));
  for (std::size_t j = point.size(); j < lower_.size(); ++j) {
    point.push_back(lower_[j] + unit[j] * (upper_[j] - lower_[j]));
  }
  return point;
}

double DreamTarget::logPrior(const Feasibility& feasibility, std::span<const double> point) const {
  const std::span<const double> set = point.first(prior_.size());
  double sum = prior_.logDensity(set);
  if (!(sum > -kInfinity) || !feasibility.holds(set)) return -kInfinity;
  for (const Dimension& dimension : errors_) sum -= std::log(dimension.upper - dimension.lower);
  return sum;
}

ErrorValues DreamTarget::errorsOf(const Series& series, std::span<const double> point) const {
  ErrorValues values = series.fixed;
  for (std::size_t k = 0; k < kErrorTermCount; ++k) {
    const auto place = series.dimensions[k];
    if (!place) continue;
    values[k] = errors_[*place - prior_.size()].isLogarithmic ? std::exp(point[*place]) : point[*place];
  }
  return values;
}

double DreamTarget::objectiveOf(const TaskContext& context, const EvaluationResult& result) const {
  const std::vector<double> values = result.exactMeasures.empty()
                                         ? result.objectiveValues
                                         : objectiveFunctionValues(context.objectives, result.exactMeasures);
  if (*objective_ > 0) return values[*objective_ - 1];
  return context.aggregate ? context.aggregate(values) : result.aggregate;
}

/// The observations of each series that the most complete of these runs, if one succeeded, has values for. Which they
/// are must not change behind that: likelihoods of other observations cannot be compared.
void DreamTarget::countObservations(const TaskContext& context, std::span<const EvaluationResult> results) {
  for (Series& series : series_) {
    std::vector<double> most;
    for (const EvaluationResult& result : results) {
      if (!result.ok()) continue;
      const std::size_t count = context.observedSeries[series.observed].values.size();
      std::vector<double> simulated = context.simulatedColumns(std::span(&result.number, 1), series.first, count);
      if (most.empty() || series.errors.countIn(simulated) > series.errors.countIn(most)) most = std::move(simulated);
    }
    if (most.empty()) return;
    series.errors.countWhere(most);
  }
  hasCounted_ = true;
  for (const CountLine& line : countLines()) {
    if (line.isWarning) {
      context.log.warning(line.text);
    } else {
      context.log.line(line.text);
    }
  }
}

/// Of a run that succeeded.
double DreamTarget::logLikelihood(const TaskContext& context, int number, std::span<const double> point) const {
  double sum = 0.0;
  for (const Series& series : series_) {
    const std::size_t count = context.observedSeries[series.observed].values.size();
    const std::vector<double> simulated = context.simulatedColumns(std::span(&number, 1), series.first, count);
    sum += series.errors.logLikelihood(simulated, errorsOf(series, point));
  }
  return std::isnan(sum) ? -kInfinity : sum;
}

/// Notes why a model run has no likelihood, by the first series without one.
void DreamTarget::countLack(const TaskContext& context, const EvaluationResult& result, std::span<const double> point) {
  RunsWithoutLikelihood& runs = withoutLikelihood_;
  if (!result.ok()) {
    ++runs.failed;
    return;
  }
  if (objective_) {
    ++runs.notNumbers;
    return;
  }
  for (const Series& series : series_) {
    const std::size_t count = context.observedSeries[series.observed].values.size();
    const std::vector<double> simulated = context.simulatedColumns(std::span(&result.number, 1), series.first, count);
    switch (series.errors.lackIn(simulated, errorsOf(series, point))) {
      case LikelihoodLack::none:
        continue;
      case LikelihoodLack::missing:
        ++runs.missing;
        return;
      case LikelihoodLack::untransformed:
        ++runs.untransformed;
        return;
      case LikelihoodLack::notFinite:
        ++runs.notFinite;
        return;
    }
  }
  ++runs.notFinite;  // of the sum alone
}

std::vector<ProposalResult> DreamTarget::evaluate(const TaskContext& context,
                                                  std::span<const DreamProposal> proposals) {
  std::vector<ParameterSet> sets;
  for (const DreamProposal& proposal : proposals) {
    if (proposal.knownRun == 0) sets.emplace_back(proposal.point.begin(), proposal.point.begin() + prior_.size());
  }
  std::vector<EvaluationResult> results;
  if (!sets.empty()) results = context.evaluator.evaluateParameterSets(sets, DispatchMode::task);
  if (!hasCounted_) countObservations(context, results);
  std::vector<ProposalResult> found;
  std::size_t next = 0;
  for (const DreamProposal& proposal : proposals) {
    const bool isNew = proposal.knownRun == 0;
    const EvaluationResult* const result = isNew ? &results[next++] : nullptr;
    const int number = isNew ? result->number : proposal.knownRun;
    if (isNew && !result->ok()) {
      known_[number] = -kInfinity;
    } else if (isNew && objective_) {
      const double value = -objectiveOf(context, *result);
      known_[number] = std::isnan(value) ? -kInfinity : value;
    }
    const auto known = known_.find(number);
    found.push_back({known != known_.end() ? known->second : logLikelihood(context, number, proposal.point), number});
    if (isNew && found.back().logLikelihood == -kInfinity) countLack(context, *result, proposal.point);
  }
  return found;
}

DreamProblem DreamTarget::problem(const TaskContext& context) {
  DreamProblem problem;
  problem.lower = lower_;
  problem.upper = upper_;
  problem.modelParameterCount = prior_.size();
  problem.drawPrior = [this](std::span<const double> unit) { return pointAt(unit); };
  problem.logPrior = [this, &context](std::span<const double> point) { return logPrior(context.feasibility, point); };
  problem.evaluate = [this, &context](std::span<const DreamProposal> proposals) {
    return evaluate(context, proposals);
  };
  problem.usedValue = [&space = context.space](std::size_t j, double value) {
    const bool isInteger = j < space.size() && space.transformation[j] == TransformationType::integer;
    return isInteger ? toModelScale(space, j, value) : value;
  };
  return problem;
}

ShownDimensions DreamTarget::shown(const SearchSpace& space) const {
  ShownDimensions dimensions{space.names, space.size(), {}};
  for (const Dimension& dimension : errors_) dimensions.names.push_back(dimension.name);
  dimensions.shown = [this, &space](std::span<const double> point) {
    std::vector<double> values = ToModelScale(space, point.first(space.size()));
    for (std::size_t k = 0; k < errors_.size(); ++k) {
      const double value = point[space.size() + k];
      values.push_back(errors_[k].isLogarithmic ? std::exp(value) : value);
    }
    return values;
  };
  return dimensions;
}

std::vector<std::vector<double>> DreamTarget::priorDraws(const Feasibility& feasibility, std::size_t count) const {
  constexpr int kMostTries = 1'000'000;
  ChainRandom random(1);
  std::vector<std::vector<double>> draws;
  std::vector<double> unit(lower_.size());
  for (int i = 0; i < kMostTries && draws.size() < count; ++i) {
    for (double& value : unit) value = random.uniform();
    std::vector<double> point = pointAt(unit);
    bool isPossible = true;
    for (std::size_t j = 0; j < point.size(); ++j) {
      isPossible = isPossible && point[j] >= lower_[j] && point[j] <= upper_[j];
    }
    if (isPossible && logPrior(feasibility, point) > -kInfinity) draws.push_back(std::move(point));
  }
  return draws;
}

std::vector<DreamTarget::CountLine> DreamTarget::countLines() const {
  std::vector<CountLine> lines;
  for (const Series& series : series_) {
    const std::size_t count = series.errors.count();
    const bool lacksSome = count < series.observationCount;
    lines.push_back(
        {lacksSome ? fmt::format("The likelihood is of {} of the {} observations of {}: for the others the most "
                                 "complete of the first runs has no simulated value. They do not count in any run",
                                 count, series.observationCount, series.name)
                   : fmt::format("The likelihood is of all {} observations of {}", count, series.name),
         lacksSome});
  }
  return lines;
}

std::vector<std::string> DreamTarget::descriptionLines() const {
  std::vector<std::string> lines;
  for (const Dimension& dimension : errors_) {
    const double lower = dimension.isLogarithmic ? std::exp(dimension.lower) : dimension.lower;
    const double upper = dimension.isLogarithmic ? std::exp(dimension.upper) : dimension.upper;
    lines.push_back(fmt::format("   {}: estimated between {:.6g} and {:.6g}{}", dimension.name, lower, upper,
                                dimension.isLogarithmic ? ", log-uniform prior" : ", uniform prior"));
  }
  return lines;
}

}  // namespace mirevo
