#pragma once

#include <map>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "common/parameter_set.h"
#include "parameters/model_parameter.h"

namespace mirevo {

enum class TransformDirection : std::int32_t { forward = 0, backward = 1 };

/// Transforms one value between the model scale and the search scale. `lowerBound` anchors the grid of an integer
/// parameter. `failed` becomes true, and the result 0, only for the forward logarithm of a value not greater than 0.
double TransformParameterValue(double value, double lowerBound, TransformationType type, TransformDirection direction,
                               bool& failed);

/// The value that a run gets for one on the model scale: of an integer parameter that on its grid, else the same.
double onGrid(const ModelParameter& parameter, double value);
/// Whether it is the same but for rounding.
bool isOnGrid(const ModelParameter& parameter, double value);

/// The variable parameters on the search scale, in setup order; every vector has one entry per variable parameter.
struct SearchSpace {
  std::vector<std::string> names;
  std::vector<double> initial;
  std::vector<double> lower;
  /// For an integer parameter deliberately one more than the transformed bound: the searches draw continuous values in
  /// [lower, upper + 1), so that truncation gives every integer the same width.
  std::vector<double> upper;
  std::vector<TransformationType> transformation;
  /// The values that the setup gives for logarithmic parameters, by parameter and value on the search scale: exp(ln(x))
  /// is not always x, but a run gets a given value as it was given.
  std::map<std::pair<std::size_t, double>, double> givenValues = {};

  std::size_t size() const { return names.size(); }
};

/// Derives the search space from all parameters. Throws FatalError for an initial value outside its bounds, a
/// transformation that fails, or no variable parameter at all.
SearchSpace BuildSearchSpace(std::span<const ModelParameter> parameters);

/// The model-scale value of parameter k for a value on the search scale.
double toModelScale(const SearchSpace& space, std::size_t k, double value);

/// The values of a set on the model scale, in the order of the set.
std::vector<double> ToModelScale(const SearchSpace& space, std::span<const double> set);

/// The first parameter of which an earlier run of `set` would have had another value than `earlier` has, bit for bit;
/// empty if that was this set. `earlier` is on the model scale.
std::optional<std::size_t> findOtherValue(const SearchSpace& space, std::span<const double> set,
                                          std::span<const double> earlier);

}  // namespace mirevo
