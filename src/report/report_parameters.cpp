#include "report/report_parameters.h"

#include <cmath>
#include <cstddef>
#include <limits>
#include <string>

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// Whether a value lies within a hundredth of the range of a bound, on the scale on which the parameter is searched.
std::string nearBound(const ModelParameter& parameter, double value) {
  constexpr double kNear = 0.01;
  const bool isLogarithmic = parameter.transformationType == TransformationType::logarithmic;
  const auto onScale = [isLogarithmic](double x) { return isLogarithmic ? std::log(x) : x; };
  const double lower = onScale(parameter.lowerBound);
  const double upper = onScale(parameter.upperBound);
  const double reach = kNear * (upper - lower);
  if (parameter.parameterType != ParameterType::variable || !(reach > 0.0)) return {};
  if (onScale(value) <= lower + reach) return "lower";
  return onScale(value) >= upper - reach ? "upper" : "";
}

}  // namespace

std::vector<ReportedParameter> reportedParameters(const RunConfig& config, ParameterModel& parameters,
                                                  const ResultRow* best) {
  const SearchSpace& space = parameters.searchSpace();
  const std::vector<double> startValues = allModelValues(parameters, ToModelScale(space, space.initial));
  std::vector<double> bestValues(config.parameters.size(), kNaN);
  if (best != nullptr) bestValues = allModelValues(parameters, best->parameters);
  std::vector<ReportedParameter> all;
  for (std::size_t i = 0; i < config.parameters.size(); ++i) {
    const ModelParameter& parameter = config.parameters[i];
    ReportedParameter& reported = all.emplace_back();
    reported.name = parameter.name;
    reported.comment = parameter.comment;
    const bool isDependent = parameter.parameterType == ParameterType::dependent;
    if (isDependent) reported.equation = parameter.equation;
    const bool isVariable = parameter.parameterType == ParameterType::variable;
    reported.kind = isVariable ? "variable" : isDependent ? "dependent" : "fixed";
    const bool isLogarithmic = parameter.transformationType == TransformationType::logarithmic;
    reported.transformation = isLogarithmic ? "logarithmic" : "none";
    reported.isInteger = parameter.transformationType == TransformationType::integer;
    reported.lower = isDependent ? kNaN : parameter.lowerBound;
    reported.upper = isDependent ? kNaN : parameter.upperBound;
    reported.start = isDependent ? startValues[i] : parameter.initialValue;
    reported.best = bestValues[i];
    reported.nearBound = nearBound(parameter, bestValues[i]);
  }
  return all;
}

}  // namespace mirevo
