#include "algorithms/bayes/posterior_words.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <string_view>
#include <utility>

#include <fmt/format.h>

#include "common/short_list.h"

namespace mirevo {
namespace {

constexpr double kTradeOff = 0.7;  // correlation from which two parameters are said to trade off
constexpr double kLittle = 0.9;    // of the prior's range, from which the data are said to say little
constexpr double kFewAccepted = 0.05;
constexpr std::size_t kMostNamed = 20;
constexpr std::string_view kGoOn = "A larger Sample_Size and Restart = 1 go on from here";

bool isApart(const DimensionFigures& one, const ConvergenceLimits& limits) {
  return !(one.rHat <= limits.rHat);
}

bool hasFewDraws(const DimensionFigures& one, const ConvergenceLimits& limits) {
  return !isApart(one, limits) && !(one.effectiveSize >= limits.effectiveSize);
}

/// "X4 (1.31), X1 (1.12)"
std::string listed(std::span<const std::pair<std::string, std::string>> named) {
  ShortList list(kMostNamed);
  for (const auto& [name, figure] : named) list.add(fmt::format("{} ({})", name, figure));
  return list.text();
}

/// Of the dimensions that `isMeant` holds for, those with the largest `badness` first; not a number is the worst.
template <class IsMeant, class Badness>
std::vector<const DimensionFigures*> worstFirst(std::span<const DimensionFigures> dimensions, const IsMeant& isMeant,
                                                const Badness& badness) {
  std::vector<const DimensionFigures*> found;
  for (const DimensionFigures& one : dimensions) {
    if (isMeant(one)) found.push_back(&one);
  }
  const auto key = [&](const DimensionFigures* one) {
    const double value = badness(*one);
    return std::isnan(value) ? std::numeric_limits<double>::infinity() : value;
  };
  std::ranges::stable_sort(found, std::greater<>(), key);
  return found;
}

}  // namespace

std::string rHatText(double rHat, int digits) {
  constexpr double kLarge = 1000.0;
  if (std::isnan(rHat)) return "not known";
  if (std::isinf(rHat)) return "not finite: chains stand still";
  return rHat > kLarge ? fmt::format("over {:g}", kLarge) : fmt::format("{:.{}g}", rHat, digits);
}

bool isOfMagnitudes(std::span<const double> priorQuantiles) {
  constexpr double kManyfold = 10.0;
  const double low = priorQuantiles.front();
  const double high = priorQuantiles.back();
  const double middle = priorQuantiles[priorQuantiles.size() / 2];
  if (!(low > 0.0 && high > kManyfold * low)) return false;
  const double place = (middle - low) / (high - low);
  const double placeOfLogarithm = std::log(middle / low) / std::log(high / low);
  return std::abs(placeOfLogarithm - 0.5) < std::abs(place - 0.5);
}

double narrowingOf(std::span<const double> quantiles, std::span<const double> priorQuantiles) {
  const auto ratio = [&](const auto& scaled) {
    const double before = scaled(priorQuantiles.back()) - scaled(priorQuantiles.front());
    return before > 0.0 ? (scaled(quantiles.back()) - scaled(quantiles.front())) / before
                        : std::numeric_limits<double>::quiet_NaN();
  };
  if (isOfMagnitudes(priorQuantiles) && quantiles.front() > 0.0)
    return ratio([](double value) { return std::log(value); });
  return ratio([](double value) { return value; });
}

ConvergenceWords convergenceWords(std::span<const DimensionFigures> dimensions, const ConvergenceLimits& limits) {
  std::vector<std::pair<std::string, std::string>> apart;
  std::vector<std::pair<std::string, std::string>> few;
  for (const DimensionFigures* one : worstFirst(
           dimensions, [&](const DimensionFigures& of) { return isApart(of, limits); },
           [](const DimensionFigures& of) { return of.rHat; })) {
    apart.emplace_back(one->name, rHatText(one->rHat));
  }
  for (const DimensionFigures* one : worstFirst(
           dimensions, [&](const DimensionFigures& of) { return hasFewDraws(of, limits); },
           [](const DimensionFigures& of) { return -of.effectiveSize; })) {
    few.emplace_back(one->name, fmt::format("{:.0f}", one->effectiveSize));
  }
  ConvergenceWords words;
  if (apart.empty() && few.empty()) {
    words.findings.emplace_back("The chains have converged, as far as R-hat and the effective sample sizes tell");
  }
  const std::string fewText =
      few.empty() ? ""
                  : fmt::format("the effective sample size is below {:g} for {}", limits.effectiveSize, listed(few));
  if (!apart.empty()) {
    words.findings.push_back(
        fmt::format("The chains have not converged: R-hat is above {:g} for {}{}{}. The quantiles below are not those "
                    "of the posterior yet. {}; where R-hat stays large, the posterior may have several peaks (more "
                    "chains help: Chain_Count) or burn-in is too short (Burn_In_Share), which the states in "
                    "_Chains.dat show; the run then begins anew",
                    limits.rHat, listed(apart), few.empty() ? "" : ", and ", fewText, kGoOn));
  } else if (!few.empty()) {
    words.findings.push_back(fmt::format(
        "The chains have not converged: R-hat is at most {:g} for all parameters, but {}. Means are known to about a "
        "standard deviation divided by its square root, the 5 and 95 % quantiles less well. {}",
        limits.rHat, fewText, kGoOn));
  }
  words.state = !apart.empty() ? Convergence::apart : !few.empty() ? Convergence::fewDraws : Convergence::reached;
  return words;
}

std::optional<std::string> acceptanceWords(double rate) {
  if (!(rate < kFewAccepted)) return std::nullopt;
  return "Few proposals are accepted: the chains mix slowly. Bounds far wider than the posterior, a posterior at a "
         "bound, a likelihood far too sharp (a fixed Error_Deviation that is too small) or rough results of the model "
         "are usual reasons";
}

std::vector<std::string> tradeOffWords(std::span<const std::string> names, std::span<const PairCorrelation> largest) {
  std::vector<std::string> lines;
  for (const auto& [i, j, value] : largest.first(std::min(largest.size(), kLargestShown))) {
    if (std::abs(value) < kTradeOff) continue;
    lines.push_back(
        fmt::format("{} and {} trade off: a correlation of {:.2f}. The data know a combination of them "
                    "better than either",
                    names[i], names[j], value));
  }
  return lines;
}

bool isHardlyNarrower(const DimensionFigures& dimension) {
  return dimension.narrowing > kLittle;
}

std::string hardlyNarrowerWords(const DimensionFigures& dimension) {
  return fmt::format("{}: the data say little of it, its posterior is hardly narrower than its prior", dimension.name);
}

std::vector<std::string> adviceWords(std::span<const DimensionFigures> dimensions, const ConvergenceLimits& limits,
                                     std::span<const std::vector<double>> matrix) {
  const auto isPoor = [&](const DimensionFigures& one) { return isApart(one, limits) || hasFewDraws(one, limits); };
  std::vector<std::string> advice;
  for (const DimensionFigures& one : dimensions) {
    if (!isPoor(one) || !isHardlyNarrower(one)) continue;
    advice.push_back(
        fmt::format("{} cannot be told from these data, and the chains wander over all of its prior. Fix "
                    "it, or give it a narrower prior",
                    one.name));
  }
  for (const auto& [i, j] : largestEntries(matrix)) {
    if (std::abs(matrix[i][j]) < kTradeOff || !isPoor(dimensions[i]) || !isPoor(dimensions[j])) continue;
    advice.push_back(
        fmt::format("{} and {} trade off, and chains move slowly along their ridge. Fix one of them, or "
                    "calibrate their ratio, product or sum instead of one",
                    dimensions[i].name, dimensions[j].name));
  }
  return advice;
}

}  // namespace mirevo
