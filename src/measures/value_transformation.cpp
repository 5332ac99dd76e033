#include "measures/value_transformation.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "common/text.h"
#include "measures/criteria.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

double logarithm(double value) {
  return value > 0.0 ? std::log(value) : kNaN;
}

double transformedValue(double value, ValueTransformation transformation, double epsilon, double lambda) {
  switch (transformation) {
    case ValueTransformation::logarithm:
      return logarithm(value + epsilon);
    case ValueTransformation::squareRoot:
      return value >= 0.0 ? std::sqrt(value) : kNaN;
    case ValueTransformation::inverse:
      return value + epsilon != 0.0 ? 1.0 / (value + epsilon) : kNaN;
    case ValueTransformation::boxCox:
      if (lambda == 0.0) return logarithm(value + epsilon);
      return std::expm1(lambda * logarithm(value + epsilon)) / lambda;
    case ValueTransformation::none:
    case ValueTransformation::rank:
      break;
  }
  return value;
}

}  // namespace

std::optional<ValueTransformation> findTransformation(std::string_view name) {
  for (std::size_t i = 0; i < std::size(kValueTransformationNames); ++i) {
    if (equalIgnoringCase(kValueTransformationNames[i].name, name)) return static_cast<ValueTransformation>(i);
  }
  return std::nullopt;
}

std::vector<double> transformed(std::span<const double> values, ValueTransformation transformation, double epsilon,
                                double lambda) {
  if (transformation == ValueTransformation::rank) return ranksOf(values);
  std::vector<double> found(values.begin(), values.end());
  std::transform(values.begin(), values.end(), found.begin(),
                 [&](double value) { return transformedValue(value, transformation, epsilon, lambda); });
  return found;
}

}  // namespace mirevo
