#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/analyses/morris_settings.h"
#include "algorithms/distributions/parameter_distributions.h"
#include "common/parameter_set.h"
#include "parameters/feasibility.h"
#include "parameters/search_space.h"

namespace mirevo {

/// A base point of the unit cube and one step of each of the p parameters.
struct EffectTrajectory {
  std::vector<double> base;        ///< p coordinates
  std::vector<double> moved;       ///< of each parameter after its step
  std::vector<double> width;       ///< of each parameter's step, signed, in shares of its range; 0: it makes none
  std::vector<std::size_t> order;  ///< in which the parameters step
  /// The 1-based number of the evaluation of the base point, then of the point after each step in `order`; 0: it is not
  /// run.
  std::vector<int> evaluations;
};

/// The two evaluations (1-based) whose difference, divided by the width, is an elementary effect.
struct EffectPair {
  std::size_t parameter = 0;
  int from = 0;
  int to = 0;
  double width = 0.0;
};

/// The sets of an analysis by elementary effects (Morris 1991, doi:10.1080/00401706.1991.10484804), r trajectories of
/// up to p + 1 sets. Effects are per share of a parameter's distribution, so that a continuous parameter whose
/// distribution is uniform has the change of the output over its whole range, at the rate of the step.
struct EffectPlan {
  EffectDesign design = EffectDesign::radial;
  std::vector<EffectTrajectory> trajectories;
  int evaluationCount = 0;
  /// By parameter, in how many trajectories it makes no step, as none changes its value or as none leads to a set that
  /// can be run.
  std::vector<std::size_t> unchanged;
  std::vector<std::size_t> infeasible;
  std::size_t infeasiblePoints = 0;  ///< points that are not run, as their sets cannot be
  std::string violation;             ///< of the first of these
  std::string stepViolation;         ///< of a step tried for the first parameter for which none can be run
  bool isCorrelated = false;         ///< a step of a parameter moves others, those that its distribution is joined with
};

/// Plans the trajectories. Equal arguments give equal plans; the stream of random numbers starts afresh from the seed.
///
/// Radial: base point and steps from a scrambled Sobol' sequence of 2 p coordinates (Campolongo, Saltelli and Cariboni
/// 2011, doi:10.1016/j.cpc.2010.12.039). Unlike there, each step is combined with a base point at random, as few Sobol'
/// points may lie badly in two dimensions and effects then vary more than those of random points; and a step is at
/// least a tenth of the distribution, so that what rounding does to the outputs is not magnified. Of more than 1833
/// parameters, for which there are no Sobol' numbers, the points are a Latin hypercube sample. The step of an integer
/// parameter changes its value, and no point is one that cannot be run, as far as some tries find others.
///
/// Trajectories: the levels are the middles of `levels` equal strata, as an unbounded distribution has no value at the
/// ends, where Morris has them; a step goes over half of them. Each parameter begins at all levels nearly equally
/// often. Of the candidates, designs of r random trajectories, the one is taken whose two most similar trajectories
/// differ most: the mean squared distance between the points of two of them is, but for a constant, the squared
/// distance of their centroids. Campolongo, Cariboni and Saltelli (2007, doi:10.1016/j.envsoft.2006.10.004) choose r of
/// many trajectories; that prefers those at the border, and mu* is then not that of the distribution.
EffectPlan planEffects(const MorrisSettings& settings, const SearchSpace& space,
                       const ParameterDistributions& distributions, std::int32_t seed,
                       const Feasibility& feasibility = {});

/// The sets of a trajectory that are run, in the order of their evaluations.
std::vector<ParameterSet> setsOf(const EffectPlan& plan, const EffectTrajectory& trajectory,
                                 const ParameterDistributions& distributions);

/// The effects of a trajectory whose two sets are run.
std::vector<EffectPair> pairsOf(const EffectPlan& plan, const EffectTrajectory& trajectory);

}  // namespace mirevo
