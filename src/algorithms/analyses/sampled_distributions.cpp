#include "algorithms/analyses/sampled_distributions.h"

#include <cmath>

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// The 95 % quantile of the standard normal distribution.
constexpr double kQuantile95 = 1.6448536269514722;

bool isInteger(const SearchSpace& space, std::size_t j) {
  return space.transformation[j] == TransformationType::integer;
}

/// The largest value of the model; the search range of an integer parameter ends one above it.
double modelUpperBound(const SearchSpace& space, std::size_t j) {
  return isInteger(space, j) ? space.upper[j] - 1.0 : toModelScale(space, j, space.upper[j]);
}

/// Whether the model gets a value within the bounds.
bool isWithinBounds(const SearchSpace& space, std::size_t j, double value) {
  if (!isInteger(space, j)) return value >= space.lower[j] && value <= space.upper[j];
  const double step = toModelScale(space, j, value);
  return step >= space.lower[j] && step <= modelUpperBound(space, j);
}

/// Whether a mean is a value between the bounds. A mean above an integer's largest value, but below the next, is that
/// of values around it.
bool isMeanWithinBounds(const SearchSpace& space, std::size_t j, double mean) {
  return mean >= space.lower[j] && isWithinBounds(space, j, mean);
}

/// The share of the drawn values that the model gets within the bounds.
double shareWithinBounds(const SearchSpace& space, std::size_t j, const NormalDistribution& distribution) {
  const auto& [mean, deviation] = distribution;
  const double lower = space.lower[j] - (isInteger(space, j) ? 1.0 : 0.0);  // truncated upwards
  const double scale = deviation * std::sqrt(2.0);
  return 0.5 * (std::erf((space.upper[j] - mean) / scale) - std::erf((lower - mean) / scale));
}

/// The model takes the step below a drawn value, so that a mean on a step has half of its values on the step below.
std::string integerLine(const SearchSpace& space, std::size_t j, double mean) {
  const double step = toModelScale(space, j, mean);
  if (step <= space.lower[j]) return "    an integer: a drawn value is truncated to a step of its grid";
  const std::string half = std::abs(mean - step) < 1.0e-6
                               ? fmt::format(", so that half of the values are below {:.6g}", step)
                               : std::string();
  return fmt::format(
      "    an integer: values drawn from {0:.6g} to below {1:.6g} become {0:.6g}{2}; the mean to give for "
      "values around {0:.6g} is {3:.6g}",
      step, step + 1.0, half, step + 0.5);
}

/// Truncation is towards the lower bound, from either side of it; empty where hardly any value is below it.
std::string belowBoundText(const SearchSpace& space, std::size_t j, double lowest) {
  if (lowest >= space.lower[j]) return {};
  return fmt::format(
      "; values below the lower bound are truncated upwards, towards it: those from above {:.6g} to below {:.6g} all "
      "become {:.6g}",
      space.lower[j] - 1.0, space.lower[j] + 1.0, space.lower[j]);
}

}  // namespace

std::vector<std::string> distributionLines(const UncertaintySettings& settings, const SearchSpace& space) {
  std::vector<std::string> lines{
      "Normal distributions: PARAMETER_n of UNCERTAINTY_ESTIMATION is that of the n-th variable parameter"};
  for (std::size_t j = 0; j < settings.parameters.size(); ++j) {
    const auto& [mean, deviation] = settings.parameters[j];
    const bool isLogarithm = space.transformation[j] == TransformationType::logarithmic;
    std::string line =
        fmt::format("  PARAMETER_{}: {}, mean {}, standard deviation {}{}; on the model scale ", j + 1, space.names[j],
                    formatReal(mean), formatReal(deviation), isLogarithm ? " of the natural logarithm" : "");
    if (!isInteger(space, j)) line += fmt::format("median {:.6g}, ", toModelScale(space, j, mean));
    line += fmt::format("5 to 95 % from {:.6g} to {:.6g}", toModelScale(space, j, mean - kQuantile95 * deviation),
                        toModelScale(space, j, mean + kQuantile95 * deviation));
    lines.push_back(std::move(line));
    if (!isInteger(space, j)) continue;
    lines.push_back(integerLine(space, j, mean) + belowBoundText(space, j, mean - kQuantile95 * deviation));
  }
  return lines;
}

std::vector<std::string> distributionWarnings(const UncertaintySettings& settings, const SearchSpace& space) {
  constexpr double kHardlyMeant = 0.45;  // a mean on a bound leaves half
  std::vector<std::string> warnings;
  for (std::size_t j = 0; j < settings.parameters.size(); ++j) {
    const auto& [mean, deviation] = settings.parameters[j];
    const std::string bounds =
        fmt::format("bounds {:.6g} to {:.6g}", toModelScale(space, j, space.lower[j]), modelUpperBound(space, j));
    if (isMeanWithinBounds(space, j, mean)) {
      const double share = shareWithinBounds(space, j, settings.parameters[j]);
      if (share > kHardlyMeant) continue;
      warnings.push_back(fmt::format(
          "Standard_Deviation of PARAMETER_{} ({}) is {}: about {:.0f} % of the values drawn are outside the {}", j + 1,
          space.names[j], formatReal(deviation), 100.0 * (1.0 - share), bounds));
      continue;
    }
    const std::string onModelScale =
        isInteger(space, j) ? "" : fmt::format(", on the model scale {:.6g}", toModelScale(space, j, mean));
    std::string text = fmt::format("Mean_Value of PARAMETER_{} ({}) is {}{}: outside the {}", j + 1, space.names[j],
                                   formatReal(mean), onModelScale, bounds);
    const bool isLogarithm = space.transformation[j] == TransformationType::logarithmic;
    if (isLogarithm && mean > 0.0 && isWithinBounds(space, j, std::log(mean))) {
      text += fmt::format("; the mean of a logarithmic parameter is that of its natural logarithm, ln({}) = {:.6g}",
                          formatReal(mean), std::log(mean));
    }
    warnings.push_back(std::move(text));
  }
  return warnings;
}

std::string setsOutsideBounds(std::span<const ParameterSet> sample, const SearchSpace& space) {
  std::vector<std::size_t> counts(space.size());
  std::size_t outside = 0;
  for (const ParameterSet& set : sample) {
    bool isInside = true;
    for (std::size_t j = 0; j < set.size(); ++j) {
      if (isWithinBounds(space, j, set[j])) continue;
      isInside = false;
      ++counts[j];
    }
    outside += isInside ? 0 : 1;
  }
  std::string line = fmt::format("Sets outside the bounds of a parameter: {} of {}", outside, sample.size());
  std::string_view separator = " (";
  for (std::size_t j = 0; j < counts.size(); ++j) {
    if (counts[j] == 0) continue;
    line += fmt::format("{}{} in {}", separator, space.names[j], counts[j]);
    separator = ", ";
  }
  return outside > 0 ? line + ")" : line;
}

}  // namespace mirevo
