#include "algorithms/analyses/sampled_distributions.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostListed = 50;  // parameters in the log

/// The form in which earlier versions had all of them.
bool isNormalOnSearchScale(const Distribution& distribution) {
  return distribution.name() == "normal" && !distribution.isGivenOnModelScale();
}

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
double shareWithinBounds(const SearchSpace& space, std::size_t j, const Distribution& distribution) {
  const double lower = space.lower[j] - (isInteger(space, j) ? 1.0 : 0.0);  // truncated upwards
  return distribution.cumulative(space.upper[j]) - distribution.cumulative(lower);
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

std::string distributionLine(const Distribution& distribution, const SearchSpace& space, std::size_t j) {
  const bool isLogarithm = space.transformation[j] == TransformationType::logarithmic;
  std::string line = fmt::format("  PARAMETER_{}: {}, ", j + 1, space.names[j]);
  if (!isNormalOnSearchScale(distribution)) line += fmt::format("{}, ", distribution.name());
  line += distribution.text();
  if (distribution.isGivenOnModelScale()) {
    line += "; ";
  } else {
    line += fmt::format("{}; on the model scale ", isLogarithm ? " of the natural logarithm" : "");
  }
  const auto at = [&](double p) { return toModelScale(space, j, distribution.quantile(p)); };
  if (!isInteger(space, j)) line += fmt::format("median {:.6g}, ", at(0.5));
  return line + fmt::format("5 to 95 % from {:.6g} to {:.6g}", at(0.05), at(0.95));
}

/// Of a normal distribution whose mean is not between the bounds; else empty.
std::string meanWarning(const Distribution& distribution, const SearchSpace& space, std::size_t j,
                        const std::string& bounds) {
  const double mean = distribution.quantile(0.5);
  if (!isNormalOnSearchScale(distribution) || isMeanWithinBounds(space, j, mean)) return {};
  const std::string onModelScale =
      isInteger(space, j) ? "" : fmt::format(", on the model scale {:.6g}", toModelScale(space, j, mean));
  std::string text = fmt::format("Mean_Value of PARAMETER_{} ({}) is {}{}: outside the {}", j + 1, space.names[j],
                                 formatReal(mean), onModelScale, bounds);
  const bool isLogarithm = space.transformation[j] == TransformationType::logarithmic;
  if (isLogarithm && mean > 0.0 && isWithinBounds(space, j, std::log(mean))) {
    text += fmt::format("; the mean of a logarithmic parameter is that of its natural logarithm, ln({}) = {:.6g}",
                        formatReal(mean), std::log(mean));
  }
  return text;
}

/// Of a distribution most of whose values are outside the bounds; else empty.
std::string shareWarning(const Distribution& distribution, const SearchSpace& space, std::size_t j,
                         const std::string& bounds) {
  constexpr double kHardlyMeant = 0.45;  // a mean on a bound leaves half
  if (space.lower[j] == space.upper[j] && distribution.quantile(0.05) == distribution.quantile(0.95)) {
    return fmt::format("{} has one value alone, {:.6g}, and is not varied: its bounds are equal", space.names[j],
                       toModelScale(space, j, distribution.quantile(0.5)));
  }
  const double share = shareWithinBounds(space, j, distribution);
  if (share > kHardlyMeant) return {};
  const std::string what = isNormalOnSearchScale(distribution)
                               ? fmt::format("Standard_Deviation of PARAMETER_{} ({}) is {:.10g}", j + 1,
                                             space.names[j], distribution.atScore(1.0) - distribution.atScore(0.0))
                               : fmt::format("Distribution of PARAMETER_{} ({})", j + 1, space.names[j]);
  std::string text =
      fmt::format("{}: about {:.0f} % of the values drawn are outside the {}", what, 100.0 * (1.0 - share), bounds);
  const bool isLogarithm = space.transformation[j] == TransformationType::logarithmic;
  if (isLogarithm && !distribution.isGivenOnModelScale() && !isNormalOnSearchScale(distribution)) {
    text += "; it is that of the natural logarithm, unless Distribution_Scale = 'model'";
  }
  return text;
}

}  // namespace

std::vector<std::string> distributionLines(const ParameterDistributions& distributions, const SearchSpace& space,
                                           std::string_view section) {
  bool areNormal = true;
  for (std::size_t j = 0; j < distributions.size(); ++j) {
    areNormal = areNormal && isNormalOnSearchScale(distributions[j]);
  }
  std::vector<std::string> lines{fmt::format("{}: PARAMETER_n of {} is that of the n-th variable parameter",
                                             areNormal ? "Normal distributions" : "Distributions", section)};
  for (std::size_t j = 0; j < std::min(distributions.size(), kMostListed); ++j) {
    lines.push_back(distributionLine(distributions[j], space, j));
    if (!isInteger(space, j) || !isNormalOnSearchScale(distributions[j])) continue;
    const double mean = distributions[j].quantile(0.5);
    lines.push_back(integerLine(space, j, mean) + belowBoundText(space, j, distributions[j].quantile(0.05)));
  }
  if (distributions.size() > kMostListed) {
    lines.push_back(fmt::format("  and those of {}: see {} and the bounds of the parameters in the setup",
                                countText(distributions.size() - kMostListed, "more parameter"), section));
  }
  if (!distributions.copula()) return lines;
  const std::vector<std::vector<double>>& correlations = distributions.copula()->correlations();
  lines.emplace_back("  Correlations of the normal scores:");
  for (const auto& [i, j] : largestEntries(correlations)) {
    if (correlations[i][j] == 0.0) break;
    const bool hasTies = isInteger(space, i) || isInteger(space, j) || !distributions[i].isContinuous() ||
                         !distributions[j].isContinuous();
    lines.back() += fmt::format("{} {} and {} {:.4g} (of the ranks {}{:.4g})", lines.back().ends_with(':') ? "" : ",",
                                space.names[i], space.names[j], correlations[i][j],
                                hasTies ? "nearer to 0, as equal values share their rank, than " : "",
                                rankCorrelationOf(correlations[i][j]));
  }
  return lines;
}

std::vector<std::string> distributionWarnings(const ParameterDistributions& distributions, const SearchSpace& space) {
  std::vector<std::string> warnings;
  std::size_t further = 0;
  for (std::size_t j = 0; j < distributions.size(); ++j) {
    const std::string bounds =
        fmt::format("bounds {:.6g} to {:.6g}", toModelScale(space, j, space.lower[j]), modelUpperBound(space, j));
    std::string warning = meanWarning(distributions[j], space, j, bounds);
    if (warning.empty()) warning = shareWarning(distributions[j], space, j, bounds);
    if (warning.empty()) continue;
    if (warnings.size() < kMostListed) {
      warnings.push_back(std::move(warning));
    } else {
      ++further;
    }
  }
  if (further > 0) {
    warnings.push_back(
        fmt::format("The distributions of {} fit their bounds as little", countText(further, "more parameter")));
  }
  return warnings;
}

void BoundsCount::add(std::span<const double> set) {
  bool isInside = true;
  for (std::size_t j = 0; j < set.size(); ++j) {
    if (isWithinBounds(space_, j, set[j])) continue;
    isInside = false;
    ++ofParameters_[j];
  }
  outside_ += isInside ? 0 : 1;
  ++sets_;
}

std::string BoundsCount::line() const {
  std::string line = fmt::format("Sets outside the bounds of a parameter: {} of {}", outside_, sets_);
  std::string_view separator = " (";
  for (std::size_t j = 0; j < ofParameters_.size(); ++j) {
    if (ofParameters_[j] == 0) continue;
    line += fmt::format("{}{} in {}", separator, space_.names[j], ofParameters_[j]);
    separator = ", ";
  }
  return outside_ > 0 ? line + ")" : line;
}

std::string setsOutsideBounds(std::span<const ParameterSet> sample, const SearchSpace& space) {
  BoundsCount count(space);
  for (const ParameterSet& set : sample) count.add(set);
  return count.line();
}

}  // namespace mirevo
