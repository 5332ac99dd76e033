#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/numbers/sample_summary.h"

namespace mirevo {

/// What words need to know of a sampled dimension. Numbers that are not known are NaN.
struct DimensionFigures {
  std::string name;
  double rHat = 0.0;
  double effectiveSize = 0.0;
  double narrowing = 0.0;  ///< narrowingOf() its quantiles
};

/// Whether the prior is one of orders of magnitude: positive, over more than a factor of ten, and with its median
/// nearer to the middle of the logarithms than to that of the values. `priorQuantiles`: an odd number of them,
/// ascending.
bool isOfMagnitudes(std::span<const double> priorQuantiles);

/// The range of the posterior, from its first to its last quantile, as a part of that of the prior; of the logarithms
/// where the prior isOfMagnitudes(), whose range is otherwise that of its largest values alone. NaN where the prior has
/// none.
double narrowingOf(std::span<const double> quantiles, std::span<const double> priorQuantiles);

/// The limits at which chains count as converged.
struct ConvergenceLimits {
  double rHat = 0.0;           ///< at most
  double effectiveSize = 0.0;  ///< at least
};

enum class Convergence {
  reached,
  fewDraws,  ///< the chains agree, and tell too little
  apart,     ///< the chains do not agree
};

/// What chains say of themselves, the same in the log and in the report.
struct ConvergenceWords {
  Convergence state = Convergence::reached;
  std::vector<std::string> findings;  ///< without "Warning: " and without a full stop at the end
};

/// "1.31"; where chains do not move, "not finite: chains stand still"; where they hardly do, "over 1000".
std::string rHatText(double rHat, int digits = 3);

/// A dimension counts as apart before its effective size is looked at; the worst stands first.
ConvergenceWords convergenceWords(std::span<const DimensionFigures> dimensions, const ConvergenceLimits& limits);

/// What is usual where few proposals are accepted; empty if they are not few.
std::optional<std::string> acceptanceWords(double rate);

/// A line for each strong correlation of `largest`, in which the strongest stands first, up to kLargestShown.
std::vector<std::string> tradeOffWords(std::span<const std::string> names, std::span<const PairCorrelation> largest);

/// Whether the data say little of it.
bool isHardlyNarrower(const DimensionFigures& dimension);
std::string hardlyNarrowerWords(const DimensionFigures& dimension);

/// What else a user may do where chains are not converged, beyond convergenceWords(): one sentence each.
std::vector<std::string> adviceWords(std::span<const DimensionFigures> dimensions, const ConvergenceLimits& limits,
                                     std::span<const std::vector<double>> matrix);

}  // namespace mirevo
