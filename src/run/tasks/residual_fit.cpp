#include "run/tasks/residual_fit.h"

#include <limits>
#include <utility>

#include <fmt/format.h>

#include "algorithms/analyses/covariance.h"
#include "algorithms/searches/glm_constraints.h"
#include "algorithms/searches/initial_sample.h"
#include "common/text.h"
#include "measures/statistics.h"

namespace mirevo {
namespace {

/// The linearised model in the unit of the first measure: all weights are in the residuals and derivatives.
LinearisedModel linearisedAt(const ResidualFit& fit, double scale, const WeightedResiduals& residuals) {
  LinearisedModel model;
  for (const double value : fit.rows.values) model.residuals.push_back(value / scale);
  for (const double unit : fit.rows.units) model.units.push_back(unit / scale);
  for (const std::vector<double>& column : fit.jacobian->columns) {
    std::vector<double>& scaled = model.jacobian.emplace_back();
    for (const double value : column) scaled.push_back(value / scale);
  }
  for (const WeightedResiduals::Label& label : residuals.labels()) model.series.push_back(label.measure);
  // A column that is not of the last runs has no width, and nothing is known of its rounding.
  for (const double width : fit.jacobian->widths) {
    model.widths.push_back(width > 0.0 ? width : std::numeric_limits<double>::infinity());
  }
  model.problems = fit.jacobian->problems;
  return model;
}

}  // namespace

ResidualFitting::ResidualFitting(const TaskContext& context)
    : residuals_(context.measures, context.objectives, context.aggregationMethod, context.observedSeries) {
  problem_.space = context.space;
  problem_.fields = context.fields;
  problem_.residualsOf = [this](const EvaluationResult& result) {
    return residuals_.of(result.simulatedValues, result.measureValues);
  };
}

std::optional<std::string> ResidualFitting::otherMeasuresText(const TaskContext& context) const {
  std::string names;
  for (const std::size_t i : residuals_.otherMeasures()) {
    names += fmt::format("{}{} ({})", names.empty() ? "" : ", ", quotedForMessage(context.measures[i].name),
                         describeStatistic(context.measures[i]));
  }
  if (names.empty()) return std::nullopt;
  return fmt::format("The sum of squares that is minimised is not what these output measures judge by: {}", names);
}

void ResidualFitting::addCovariance(const TaskContext& context, TaskOutcome& outcome) const {
  outcome.report.emplace_back();
  if (!hasDerivatives()) {
    outcome.report.emplace_back("Warning: No covariance matrix: the search has made no derivatives");
    return;
  }
  const ResidualFit& fit = *problem_.fit;
  LinearisedModel model = linearisedAt(fit, residuals_.scale(), residuals_);
  outcome.report.push_back(fmt::format(
      "Covariance at evaluation {}, the estimate, with the derivatives at evaluation {}; observations have the weights "
      "of the sum of squares",
      fit.evaluation, fit.jacobian->evaluation));
  const SearchBounds bounds = searchBounds(context.space);
  for (const std::string& constraint : GlmConstraints(context.feasibility, bounds).holdingTexts(fit.set)) {
    outcome.report.push_back(fmt::format(
        "Warning: The estimate lies at {}, of which covariance, correlation and limits take no account", constraint));
  }
  const std::string prefix = context.filePrefix + "_Optimisation";
  const ParameterCovariance covariance = parameterCovariance(model);
  for (std::string& line : formatCovariance(covariance, context.space, fit.set, prefix)) {
    outcome.report.push_back(std::move(line));
  }
  const RunFile files[] = {run_files::kEstimateCovariance, run_files::kEstimateCorrelation, run_files::kEstimateLimits};
  std::size_t place = 0;
  for (DataTable& table : covarianceTables(covariance, context.space, fit.set)) {
    table.file = files[place++];
    outcome.tables.push_back(std::move(table));
  }
  std::vector<ObservationLabel> labels;
  for (WeightedResiduals::Label& label : residuals_.labels()) {
    labels.push_back({context.measures[label.measure].name, std::move(label.time)});
  }
  DataTable jacobian = jacobianTable(std::move(model), context.space, labels);
  jacobian.file = run_files::kEstimateJacobian;
  jacobian.headLines = {
      "Derivatives of the weighted residuals by the parameters, search scale, and the residuals of the estimate: "
      "simulated less observed value times the root of the weight, in the unit of the first output measure"};
  outcome.tables.push_back(std::move(jacobian));
}

}  // namespace mirevo
