#include "run/tasks/sensitivity_task.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <utility>

#include <fmt/format.h>

#include "algorithms/analyses/covariance.h"
#include "algorithms/numbers/lapack_functions.h"
#include "common/calendar.h"
#include "common/text.h"
#include "evaluation/stored_results.h"
#include "measures/dates.h"
#include "measures/period_series.h"
#include "measures/statistics.h"
#include "parameters/parameter_model.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/sensitivity_section.h"

namespace mirevo {
namespace {

constexpr std::string_view kWhatSets = "sets of the analysis";
constexpr TaskForm kLocalForm{kSensitivitySection, kSensitivityTypeKeyword, kSensitivityTypeNames[0]};

/// Refuses the setup unless every parameter has room for its perturbation within its bounds.
void validateLocalSensitivity(const SensitivitySettings& settings, std::span<const ModelParameter> parameters,
                              const SetupSection& section) {
  const SearchSpace space = BuildSearchSpace(parameters);
  std::size_t j = 0;
  for (const ModelParameter& parameter : parameters) {
    // A perturbation that would leave the bounds is made in the other direction, so only both together are refused.
    if (parameter.parameterType != ParameterType::variable || hasRoomForStep(settings, space, j++)) continue;
    section.refuse(
        fmt::format("Error: Perturbed value for parameter {} in local sensitivity analysis out of bounds",
                    parameter.name),
        "Perturbation_Fraction",
        fmt::format("{} of the {}, from {}, leaves the bounds {} to {} both ways{}", settings.perturbationFraction,
                    settings.perturbationOption == PerturbationOption::range ? "range" : "value",
                    parameter.initialValue, parameter.lowerBound, parameter.upperBound,
                    parameter.transformationType == TransformationType::logarithmic ? " (logarithms)" : ""));
  }
}

/// The data of the covariance: one entry per observation, and one row of simulated values per parameter set.
struct ComparedValues {
  std::vector<double> observed;  ///< NaN for an observation that does not count
  std::vector<ObservationLabel> labels;
  std::vector<double> weights;
  std::vector<std::size_t> series;
  std::vector<double> units;                   ///< in which the simulated values are printed
  std::vector<std::vector<double>> simulated;  ///< empty for a set that failed
};

bool isInObjective(const TaskContext& context, std::size_t measure) {
  return std::ranges::any_of(context.objectives, [measure](const ObjectiveFunction& objective) {
    return std::ranges::any_of(objective.measures,
                               [measure](const MeasureTerm& term) { return term.index == measure; });
  });
}

bool hasWeight(const OutputMeasure& measure) {
  return measure.weight != 0.0 || (measure.weightAbove != 0.0 && !isCriterion(measure));
}

/// Every observation that enters an objective function, once, however many measures compare it. The weight of an
/// observation is the square of the weight of its difference, as in a sum of squares.
ComparedValues compareSeries(const TaskContext& context, std::span<const EvaluationResult> results) {
  const std::span<const OutputMeasure> measures = context.measures;
  ComparedValues compared;
  compared.simulated.resize(results.size());
  std::vector<std::size_t> taken;
  /// With the place of its first simulated value.
  std::vector<std::pair<const ObservedSeries*, std::size_t>> weighed;
  std::size_t first = 0;
  for (const ObservedSeries& series : context.observedSeries) {
    const std::size_t count = series.values.size();
    const std::size_t begin = std::exchange(first, first + 2 * count);  // values, then their units
    const OutputMeasure& measure = measures[series.measure];
    const auto isSame = [&](std::size_t other) { return isSamePair(measure, measures[other]); };
    const bool isRepeated = std::any_of(taken.begin(), taken.end(), isSame);
    // One of weight 0, which only shows a value, leaves the pair to another that weighs it.
    const bool isLeft =
        !hasWeight(measure) && std::ranges::any_of(context.observedSeries, [&](const ObservedSeries& other) {
          return isSame(other.measure) && hasWeight(measures[other.measure]) && isInObjective(context, other.measure);
        });
    if (!isInObjective(context, series.measure) || isRepeated || isLeft) continue;
    taken.push_back(series.measure);
    // Of measures that compare the same items in another way, the first that has a simulated value for an observation
    // has it.
    const auto isWeighed = [&](double days) {
      return std::ranges::any_of(weighed, [&](const auto& other) {
        const std::vector<double>& times = other.first->days;
        if (!isSameItems(measure, measures[other.first->measure])) return false;
        const auto found = std::ranges::lower_bound(times, days);
        if (found == times.end() || *found != days) return false;
        const EvaluationResult& base = results.front();
        return base.ok() && std::isfinite(base.simulatedValues[other.second + (found - times.begin())]);
      });
    };
    // The run that shows most digits tells the unit: in another one all values may end with zeros.
    std::vector<double> units(count, std::numeric_limits<double>::quiet_NaN());
    for (std::size_t i = 0; i < results.size(); ++i) {
      if (!results[i].ok()) continue;
      const std::span<const double> kept = std::span(results[i].simulatedValues).subspan(begin, 2 * count);
      compared.simulated[i].insert(compared.simulated[i].end(), kept.begin(), kept.begin() + count);
      for (std::size_t t = 0; t < count; ++t) units[t] = std::fmin(units[t], kept[count + t]);
    }
    for (const double unit : units) compared.units.push_back(std::isnan(unit) ? 0.0 : unit);
    compared.series.insert(compared.series.end(), count, series.measure);
    const std::int64_t origin = secondNumber(series.start);
    for (std::size_t t = 0; t < count; ++t) {
      const bool isAbove = results.front().ok() && results.front().simulatedValues[begin + t] > series.values[t];
      const double own = isAbove && !isCriterion(measure) ? measure.weightAbove : measure.weight;
      const double ofObservation = series.weights.empty() ? 1.0 : series.weights[t];
      const double weight = isWeighed(series.days[t]) ? 0.0 : own * ofObservation;
      compared.observed.push_back(weight == 0.0 ? std::numeric_limits<double>::quiet_NaN() : series.values[t]);
      compared.weights.push_back(weight * weight);
      compared.labels.push_back({measure.name, isoTime(secondAfter(origin, series.days[t]))});
    }
    if (hasWeight(measure)) weighed.emplace_back(&series, begin);
  }
  return compared;
}

/// The model linearised at the base set, with the labels of its rows; or why there is none.
struct Linearised {
  std::optional<LinearisedModel> model;
  std::vector<ObservationLabel> labels;
  std::string problem;
};

/// Takes the simulated values, which nothing else needs.
Linearised linearised(const TaskContext& context, LocalSensitivity& sensitivity) {
  Linearised result;
  if (sensitivity.results.front().ok()) {
    ComparedValues compared = compareSeries(context, sensitivity.results);
    for (EvaluationResult& each : sensitivity.results) each.simulatedValues = std::vector<double>();
    if (compared.observed.empty()) {
      result.problem = "no objective function compares time series";
      return result;
    }
    if (std::ranges::all_of(compared.weights, [](double weight) { return weight == 0.0; })) {
      result.problem = "0 observations count, as the weights of all measures that compare series are 0";
      return result;
    }
    result.model = linearise(sensitivity.plan, compared.simulated, compared.observed, std::move(compared.weights));
    if (result.model) {
      result.model->series = std::move(compared.series);
      result.model->units = std::move(compared.units);
    }
    result.labels = std::move(compared.labels);
  }
  if (!result.model) result.problem = "the model run with the initial values failed";
  return result;
}

/// Says how many observations are single numbers, which have no simulated series and so no rows in the covariance.
std::optional<std::string> numbersLeftOut(const TaskContext& context) {
  std::size_t count = 0;
  for (std::size_t i = 0; i < context.measures.size(); ++i) {
    const OutputMeasure& measure = context.measures[i];
    const bool isNumber = measure.interfaceType == InterfaceType::measureFile && measure.observedValue.has_value();
    if (isNumber && hasWeight(measure) && isInObjective(context, i)) ++count;
  }
  if (count == 0) return std::nullopt;
  return fmt::format("The covariance is of time series alone: {} with Observed_Value {} not in it",
                     countText(count, "output measure"), count == 1 ? "is" : "are");
}

/// Adds the covariance analysis to the outcome.
void addCovariance(const TaskContext& context, const ParameterSet& set, Linearised found, TaskOutcome& outcome) {
  outcome.report.emplace_back();
  if (auto text = numbersLeftOut(context)) outcome.report.push_back(*std::move(text));
  if (!found.model) {
    outcome.report.push_back("Warning: No covariance matrix: " + found.problem);
    return;
  }
  const ParameterCovariance covariance = parameterCovariance(*found.model);
  for (std::string& line : formatCovariance(covariance, context.space, set, context.filePrefix)) {
    outcome.report.push_back(std::move(line));
  }
  for (DataTable& table : covarianceTables(covariance, context.space, set)) outcome.tables.push_back(std::move(table));
  outcome.tables.push_back(jacobianTable(*std::move(found.model), context.space, found.labels));
}

/// The aggregates of 64 bits: what rounding leaves of a change by a small step is not taken for a better fit.
void takeExactAggregates(const TaskContext& context, std::span<EvaluationResult> results) {
  if (!context.aggregate) return;
  for (EvaluationResult& result : results) {
    if (!result.ok() || result.exactMeasures.empty()) continue;
    result.aggregate = context.aggregate(objectiveFunctionValues(context.objectives, result.exactMeasures));
  }
}

}  // namespace

const TaskFacts& SensitivityTask::facts() const {
  static constexpr TaskFacts kFacts{{1, "sensitivity"}, "sensitivity analysis", run_files::kSensitivity, kLocalForm};
  return kFacts;
}

std::vector<const SectionRow*> SensitivityTask::sections() const {
  std::vector<const SectionRow*> rows{&sensitivitySection().row, &localSensitivitySection().row};
  for (const SectionRow* row : distributionSections(kSensitivitySection)) rows.push_back(row);
  return rows;
}

std::vector<std::string> SensitivityTask::neededSections(const SetupSection& /*target*/) const {
  return {std::string(sensitivitySection().row.path), std::string(localSensitivitySection().row.path)};
}

void SensitivityTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open(kSensitivitySection);
  section.read(sensitivitySection(), *static_cast<Task*>(this));
  const SetupSection local = section.open("LOCAL_SA");
  local.read(localSensitivitySection(), settings);
  validateLocalSensitivity(settings, reading.parameters, local);
  ParameterModel model({reading.parameters.begin(), reading.parameters.end()},
                       {reading.constraints.begin(), reading.constraints.end()});
  const SearchSpace& space = model.searchSpace();
  const auto plan = planPerturbations(settings, space, space.initial, {}, model.feasibility());
  planned_ = static_cast<int>(plan.sets.size());
}

std::string SensitivityTask::description() const {
  return fmt::format("Sensitivity analysis: Local sensitivity analysis, {} differences",
                     kDifferencingNames[settings.differencing == Differencing::central ? 1 : 0].name);
}

TaskOutcome SensitivityTask::outcomeOf(const TaskContext& context, Evaluator& evaluator) const {
  if (settings.calculatesCovariance) lapack();  // missed before the model runs, if ever
  TaskOutcome outcome{std::string(kEndOfTask)};
  LocalSensitivity sensitivity = localSensitivity(settings, context.space, evaluator, context.fields,
                                                  context.feasibility, context.objectives, context.measures);
  takeExactAggregates(context, sensitivity.results);
  Linearised found;
  if (settings.calculatesCovariance) found = linearised(context, sensitivity);
  if (found.model) takeObservations(*found.model, sensitivity);
  const AnalysisNames names = analysisNames(context);
  outcome.report = formatSensitivity(sensitivity, names);
  outcome.tables = sensitivityTables(sensitivity, names);
  if (settings.calculatesCovariance) addCovariance(context, sensitivity.plan.sets.front(), std::move(found), outcome);
  return outcome;
}

void SensitivityTask::requireSets(const SearchSpace& /*space*/, const Feasibility& /*feasibility*/) const {
  if (settings.calculatesCovariance) lapack();
}

std::vector<SetDoubt> SensitivityTask::setDoubts(const SearchSpace& space, const Feasibility& feasibility) const {
  const PerturbationPlan plan = planPerturbations(settings, space, space.initial, {}, feasibility);
  return infeasibleSets(feasibility, plan.sets, kWhatSets, static_cast<int>(plan.sets.size())).doubts();
}

TaskOutcome SensitivityTask::run(const TaskContext& context) {
  const PerturbationPlan plan =
      planPerturbations(settings, context.space, context.space.initial, {}, context.feasibility);
  warnOfInfeasibleSets(context, plan.sets, kWhatSets, static_cast<int>(plan.sets.size()));
  TaskOutcome outcome = outcomeOf(context, context.evaluator);
  logReport(context, outcome.report);
  return outcome;
}

std::optional<TaskOutcome> SensitivityTask::unfinishedOutcome(const TaskContext& context,
                                                              const UnfinishedBatch& made) const {
  std::map<int, StoredResults::Record> records;
  int succeeded = 0;
  for (std::size_t i = 0; i < made.results.size(); ++i) {
    const EvaluationResult& result = made.results[i];
    records[result.number] = {ToModelScale(context.space, made.sets[i]), result};
    if (result.ok()) ++succeeded;
  }
  const auto base = records.find(1);
  const bool hasBase = base != records.end() && base->second.result.ok();
  if (!hasBase || succeeded < 2) return std::nullopt;  // a derivative needs the base set and another
  EvaluationResult missing;
  missing.measureValues.assign(context.measures.size(), kFailedRunValue);
  missing.objectiveValues.assign(context.objectives.size(), kFailedRunValue);
  missing.failure = {EvaluationFailure::Kind::notMade, "the run ended before", {}};
  StoredResults evaluator(context.space, std::move(records), std::move(missing));
  return outcomeOf(context, evaluator);
}

}  // namespace mirevo
