#include "parameters/parameter_fields.h"

#include <limits>
#include <utility>
#include <variant>

#include "common/text.h"
#include "parameters/value_format.h"

namespace mirevo {

ParameterFields parameterFields(ParameterModel& model, std::span<const ValueField> widest) {
  ParameterFields fields;
  std::vector<std::size_t> dependents;
  for (std::size_t i = 0; i < widest.size(); ++i) {
    const ModelParameter& parameter = model.parameters()[i];
    if (parameter.parameterType == ParameterType::variable) fields.ofVariables.push_back(widest[i]);
    if (parameter.parameterType != ParameterType::dependent || widest[i].width == 0) continue;
    fields.dependents.push_back({std::string(trimTrailing(parameter.name)), widest[i]});
    dependents.push_back(i);
  }
  if (dependents.empty()) return fields;
  fields.dependentValues = [&model, dependents = std::move(dependents)](std::span<const double> set) {
    std::vector<double> values;
    const auto mapped = model.MapToModelValues(set);
    if (const auto* all = std::get_if<std::span<const double>>(&mapped)) {
      for (const std::size_t i : dependents) values.push_back((*all)[i]);
    }
    return values;
  };
  return fields;
}

std::vector<double> valuesAsWritten(const ParameterFields& fields, const SearchSpace& space,
                                    std::span<const double> set) {
  std::vector<double> written;
  const auto add = [&written](double value, ValueField field) {
    if (field.width > 0)
      written.push_back(valueAsWritten(value, field).value_or(std::numeric_limits<double>::infinity()));
  };
  const std::vector<double> values = ToModelScale(space, set);
  for (std::size_t j = 0; j < values.size(); ++j) add(values[j], fields.fieldOf(j));
  if (fields.dependentValues) {
    const std::vector<double> ofDependents = fields.dependentValues(set);
    for (std::size_t i = 0; i < ofDependents.size(); ++i) add(ofDependents[i], fields.dependents[i].field);
  }
  return written.empty() ? values : written;
}

}  // namespace mirevo
