#include "algorithms/analyses/evaluated_sample.h"

#include <limits>

namespace mirevo {
namespace {

void addRow(std::vector<std::vector<double>>& columns, std::span<const double> values, std::size_t before,
            bool isKnown) {
  constexpr double kNone = std::numeric_limits<double>::quiet_NaN();
  if (columns.size() < values.size()) columns.resize(values.size(), std::vector<double>(before, kNone));
  for (std::size_t j = 0; j < columns.size(); ++j) {
    columns[j].push_back(isKnown && j < values.size() ? values[j] : kNone);
  }
}

}  // namespace

void EvaluatedSample::add(std::span<const double> parameterValues, const EvaluationResult& result) {
  const std::size_t before = size();
  numbers.push_back(result.number);
  ok.push_back(result.ok());
  addRow(parameters, parameterValues, before, true);
  addRow(measures, result.measureValues, before, result.ok());
  addRow(objectives, result.objectiveValues, before, result.ok());
  addRow(validation, result.validationValues, before, result.ok());
}

}  // namespace mirevo
