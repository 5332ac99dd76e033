#pragma once

#include <functional>
#include <span>
#include <string>
#include <vector>

#include "parameters/parameter_model.h"
#include "parameters/value_format.h"

namespace mirevo {

/// The fields of the parameter files from which a model gets its values: the widest placeholder of each parameter.
struct ParameterFields {
  struct Dependent {
    std::string name;
    ValueField field = 0;
  };

  /// One per variable parameter; of width 0, or no entry: it has no field.
  std::vector<ValueField> ofVariables = {};
  std::vector<Dependent> dependents = {};  ///< those that have a field
  /// The values of `dependents` for a set (search scale), on the model scale; empty for a set that cannot be run.
  std::function<std::vector<double>(std::span<const double> set)> dependentValues = {};

  ValueField fieldOf(std::size_t variable) const {
    return variable < ofVariables.size() ? ofVariables[variable] : ValueField();
  }
};

/// What the model reads of a set (search scale): the values in all fields as they are written there, infinite where a
/// field holds no number; of a model without fields, the values themselves.
std::vector<double> valuesAsWritten(const ParameterFields& fields, const SearchSpace& space,
                                    std::span<const double> set);

/// The fields of the model's parameters, by `widest`, of one entry per parameter of any type. The model must outlive
/// them.
ParameterFields parameterFields(ParameterModel& model, std::span<const ValueField> widest);

}  // namespace mirevo
