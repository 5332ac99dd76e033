#include "parameters/parameter_fields.h"

#include <utility>
#include <variant>

#include "common/text.h"

namespace mirevo {

ParameterFields parameterFields(ParameterModel& model, std::span<const int> widths) {
  ParameterFields fields;
  std::vector<std::size_t> dependents;
  for (std::size_t i = 0; i < widths.size(); ++i) {
    const ModelParameter& parameter = model.parameters()[i];
    if (parameter.parameterType == ParameterType::variable) fields.widths.push_back(widths[i]);
    if (parameter.parameterType != ParameterType::dependent || widths[i] == 0) continue;
    fields.dependents.push_back({std::string(trimTrailing(parameter.name)), widths[i]});
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

}  // namespace mirevo
