#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <span>
#include <vector>

namespace mirevo {

/// A statistic with the limits between which it lies at 95 %; NaN where there is none.
struct LimitedValue {
  double value = std::numeric_limits<double>::quiet_NaN();
  double lower = std::numeric_limits<double>::quiet_NaN();
  double upper = std::numeric_limits<double>::quiet_NaN();

  bool hasLimits() const { return lower <= upper; }
};

/// Whether a parameter may be fixed, as far as an output goes. Without limits nothing is said.
enum class ScreeningVerdict { none, fix, keep, undecided };

/// The elementary effects of one parameter on one output.
struct ParameterEffects {
  std::size_t count = 0;  ///< effects that are known
  LimitedValue mu;        ///< their mean
  LimitedValue muStar;    ///< the mean of their absolute values
  LimitedValue sigma;     ///< their standard deviation, divisor n - 1
  LimitedValue share;     ///< mu* over the largest mu*
  /// How sure it is that the share is below the negligible one: the confidence of an upper limit that equals that. NaN
  /// where all effects are 0.
  double certainty = std::numeric_limits<double>::quiet_NaN();
  ScreeningVerdict verdict = ScreeningVerdict::none;
  /// The largest of the absolute effects over their sum: near 1, mu* is that of one step.
  double largestPart = std::numeric_limits<double>::quiet_NaN();
  /// By mu*, from 1; 0: it has no effects. Parameters with the same mu* have the same rank, the lowest of theirs.
  std::size_t rank = 0;
  std::size_t rankLower = 0;
  std::size_t rankUpper = 0;
  /// Share of the bootstrap samples with this rank; NaN where another parameter has it, too.
  double rankStability = std::numeric_limits<double>::quiet_NaN();
};

/// Those of all parameters on one output.
struct OutputEffects {
  std::vector<ParameterEffects> parameters;
  /// Of the parameters whose share is not negligible: how many, and in which share of the bootstrap samples as many
  /// largest mu* are theirs.
  std::size_t topCount = 0;
  double topStability = std::numeric_limits<double>::quiet_NaN();
  /// How sure it is that the shares of all parameters that may be fixed are negligible together, but for those whose
  /// effects are all 0; NaN without any.
  double fixedTogether = std::numeric_limits<double>::quiet_NaN();
  /// Trajectories that would decide the undecided parameters if the values hold; 0 where there are none.
  double trajectoriesToDecide = 0.0;
};

/// r rows, the trajectories, of p effects; NaN where one is not known.
using EffectRows = std::vector<std::vector<double>>;

/// How often each of the r trajectories is in each of the bootstrap samples.
using Resamples = std::vector<std::vector<std::uint16_t>>;
Resamples drawResamples(std::size_t trajectories, std::size_t samples, std::int32_t seed);

/// Effects of a parameter below which there are no limits of mu, mu* and the share, and none of sigma.
inline constexpr std::size_t kFewestEffects = 5;
inline constexpr std::size_t kFewestEffectsForSigma = 8;

/// mu, mu* and sigma (Morris 1991; Campolongo, Cariboni and Saltelli 2007, doi:10.1016/j.envsoft.2006.10.004), with the
/// limits of the studentised bootstrap (Efron and Tibshirani 1993, 12.5) over whole trajectories: the percentile
/// interval of a few effects is too narrow. sigma and the share are resampled as logarithms. The share of a sample is
/// that of its own largest mu*, so that limits know by how much the largest of several is too large; its standard error
/// is linearised, with the parameter that has the largest of all. Where more than 1 % of the samples have no standard
/// error, as few effects differ from one value, limits comprise those of the percentiles, too.
OutputEffects effectStatistics(const EffectRows& effects, const Resamples& resamples, double negligibleShare);

}  // namespace mirevo
