#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/bayes/chain_random.h"
#include "common/settings/code_name.h"

namespace mirevo {

/// What becomes of a parallel-direction proposal that leaves the bounds. Without codes: names only.
enum class BoundaryHandling : std::int32_t { fold, reject };
inline constexpr CodeName kBoundaryNames[] = {{std::nullopt, "fold"}, {std::nullopt, "reject"}};

struct DreamSettings {
  std::int32_t chainCount = 4;        ///< N
  std::int32_t mostRuns = 0;          ///< evaluations, all chains together, also of sets whose results are known
  double burnInShare = 0.2;           ///< of mostRuns, or of burnInOf
  std::int32_t burnInOf = 0;          ///< mostRuns of an earlier run that this one goes on with; 0: none
  std::int32_t leastRuns = 0;         ///< evaluations that an earlier run has made, which are used in any case
  std::int32_t pairCount = 3;         ///< most pairs of archive members in a proposal (delta)
  std::int32_t crossoverCount = 3;    ///< crossover values 1/n, 2/n ... 1 (n_CR)
  double snookerShare = 0.1;          ///< share of snooker updates
  std::int32_t archiveInterval = 10;  ///< generations between additions to the archive (K)
  std::int32_t archiveStart = 0;      ///< prior draws in the archive (m_0); 0: ten per dimension
  BoundaryHandling boundary = BoundaryHandling::fold;
  double rHatLimit = 1.05;       ///< the run may end when largestRHat() of every dimension is at most this ...
  double effectiveSize = 400.0;  ///< ... and its leastEffectiveSampleSize() at least this

  double burnInRuns() const { return burnInShare * (burnInOf > 0 ? burnInOf : mostRuns); }
};

/// What a proposal yields.
struct ProposalResult {
  double logLikelihood = 0.0;  ///< natural logarithm; -infinity: rejected whatever the state
  int evaluation = 0;          ///< the number of its model run
};

/// A point of the d sampled dimensions whose likelihood is wanted.
struct DreamProposal {
  std::vector<double> point;
  int knownRun = 0;  ///< the model run of a point with the same model parameters, which serves it; 0: run the model
};

/// The posterior to sample: m model parameters on the search scale, then the d - m dimensions that need no model run.
struct DreamProblem {
  std::vector<double> lower;  ///< one per dimension
  std::vector<double> upper;
  std::size_t modelParameterCount = 0;  ///< m
  /// A draw from the prior for a point of the open unit cube (d coordinates); it may lie outside the bounds.
  std::function<std::vector<double>(std::span<const double>)> drawPrior;
  /// ln of the prior density on the scale of sampling; -infinity where no model is to be run.
  std::function<double(std::span<const double>)> logPrior;
  /// One result per proposal, all in one batch of model runs. May throw; the chains then end with their last complete
  /// generation.
  std::function<std::vector<ProposalResult>(std::span<const DreamProposal>)> evaluate;
  /// What the likelihood has of a value of dimension j: of an integer parameter the step that the model gets. By these
  /// it is judged whether the chains agree, as nothing depends on where in a step a chain is. Empty: the value itself.
  std::function<double(std::size_t j, double value)> usedValue = {};
};

inline constexpr int kMostPriorDraws = 100'000;

/// A draw from the prior that lies within the bounds and has a density; empty if none of kMostPriorDraws is one.
std::optional<std::vector<double>> drawAllowed(const DreamProblem& problem, ChainRandom& random);

/// The states of all chains, generation by generation. A rejected proposal repeats the state before it.
class ChainHistory final {
 public:
  ChainHistory(std::size_t chainCount, std::size_t dimension) : chainCount_(chainCount), dimension_(dimension) {}

  struct State {
    std::span<const double> point;
    double logLikelihood = 0.0;
    double logPrior = 0.0;
    int evaluation = 0;
    bool accepted = false;
  };

  void add(const State& state);
  std::size_t chainCount() const { return chainCount_; }
  std::size_t dimension() const { return dimension_; }
  std::size_t generations() const { return chainCount_ == 0 ? 0 : logLikelihoods_.size() / chainCount_; }
  State at(std::size_t generation, std::size_t chain) const;
  /// The values of one dimension in every `stride`-th generation from `first` on, one vector per chain.
  std::vector<std::vector<double>> columns(std::size_t dimension, std::size_t first, std::size_t stride = 1) const;
  /// About `most` states or fewer, at equal distances from generation `first` on: all chains of each generation taken.
  std::vector<State> spread(std::size_t first, std::size_t most) const;

 private:
  std::size_t chainCount_;
  std::size_t dimension_;
  std::vector<double> points_;
  std::vector<double> logLikelihoods_;
  std::vector<double> logPriors_;
  std::vector<int> evaluations_;
  std::vector<bool> accepted_;
};

/// How well the chains agreed at some point of the run.
struct ConvergenceCheck {
  std::size_t generations = 0;
  int runs = 0;  ///< evaluations so far
  /// largestRHat() and leastEffectiveSampleSize(), one per dimension. Of one whose used value is the same in all states
  /// of chains that move, R-hat is 1 and the size that of the sample: it is known.
  std::vector<double> rHat;
  std::vector<double> effectiveSizes;

  double largestRHat() const;         ///< infinite if one is not a number
  double leastEffectiveSize() const;  ///< 0 if one is not a number
};

struct DreamCounts {
  std::size_t proposals = 0;
  std::size_t accepted = 0;
  double rate() const { return proposals == 0 ? 0.0 : static_cast<double>(accepted) / static_cast<double>(proposals); }
};

enum class DreamEnd { none, converged, budget, generations };

/// DREAM(ZS): Vrugt et al. (2009, doi:10.1515/IJNSNS.2009.10.3.273) and Vrugt (2016,
/// doi:10.1016/j.envsoft.2015.08.013), with the archive and the snooker update of ter Braak and Vrugt (2008,
/// doi:10.1007/s11222-008-9104-9). Deviations:
/// - The share of burn-in is a setting. Crossover probabilities and outlier chains are dealt with in it alone, and none
///   of it counts as posterior.
/// - A proposal outside the bounds is folded to the opposite side, or rejected; a snooker update is always rejected
///   there, as folding would break the balance that its factor keeps. There is no reflection: where jumps are
///   correlated among dimensions, the way back from a reflected point has another density.
/// - Jumped distances are standardised by the archive, not by the few current states, and the small normal part of a
///   jump is relative to the range of its dimension.
/// - Outlier chains are looked for three times, by the last quarter of the generations, and one must lie d below the
///   lower quartile of the mean log-densities, too: a chain on its way to another peak is none.
/// - At the same three times the older half of the archive is forgotten, as far as more than its first size is left;
///   behind burn-in nothing is.
/// - A chain jumps by members of the archive that were not its own states. A chain that stays long in a tail puts many
///   copies of its state into the archive, and a difference from one of them to the bulk of the posterior leads back
///   there more often than chains of the bulk come out. With its own states in the archive the tails are sampled too
///   rarely.
/// - The stretch 1 + lambda is one number for all dimensions of a jump: one for each leads off a narrow ridge.
/// - A jump from peak to peak (gamma = 1) is by one pair of archive members, in all dimensions and without a stretch:
///   it has to meet the other peak.
/// - Prior draws that the setup does not allow are drawn again.
class DreamSampler final {
 public:
  DreamSampler(const DreamSettings& settings, DreamProblem problem, std::int32_t seed);

  /// One generation: a proposal for each chain, evaluated as one batch. The first one evaluates the initial states.
  void advance();
  bool isFinished() const { return end_ != DreamEnd::none; }

  const ChainHistory& history() const { return history_; }
  DreamEnd end() const { return end_; }
  int runs() const { return runs_; }
  /// The generations that are burn-in; empty while it goes on.
  std::optional<std::size_t> burnIn() const { return burnIn_; }
  const std::vector<ConvergenceCheck>& checks() const { return checks_; }
  /// The agreement of the chains as they are; empty in burn-in, and for fewer than 4 generations behind it.
  std::optional<ConvergenceCheck> checkNow() const;
  const DreamCounts& parallelCounts() const { return parallel_; }  ///< behind burn-in
  const DreamCounts& snookerCounts() const { return snooker_; }
  const std::vector<double>& crossoverProbabilities() const { return crossoverProbabilities_; }
  int outlierCount() const { return outlierCount_; }

 private:
  struct Candidate {
    DreamProposal proposal;
    double logPrior = 0.0;
    double logFactor = 0.0;  ///< of a snooker update
    bool isSnooker = false;
    std::optional<std::size_t> crossover;  ///< index of its value; empty where it changes all dimensions anyway
    double uniform = 0.0;                  ///< with which its acceptance is decided
  };
  struct ArchiveMember {
    std::vector<double> point;
    std::optional<std::size_t> chain;  ///< whose state it was; empty: a draw from the prior
  };

  std::size_t dimension() const { return problem_.lower.size(); }
  std::vector<double> drawAllowed();
  void initialise();
  Candidate propose(std::size_t chain);
  std::vector<std::size_t> pickDimensions(std::size_t& crossover);
  void proposeParallel(std::size_t chain, Candidate& candidate);
  void proposeSnooker(std::size_t chain, Candidate& candidate);
  std::vector<std::size_t> pickArchive(std::size_t count, std::size_t chain);
  bool isInside(std::span<const double> point) const;
  bool isSameModel(std::span<const double> a, std::span<const double> b) const;
  void decide(std::size_t chain, const Candidate& candidate, const ProposalResult& result);
  void noteJump(std::span<const double> from, std::span<const double> to, std::size_t crossover);
  void addToArchive(ArchiveMember member);
  std::size_t leastArchive() const;
  void forgetOldestArchive();
  void adaptCrossover();
  void resetOutliers();
  void endGeneration();
  /// The columns with DreamProblem::usedValue.
  std::vector<std::vector<double>> usedColumns(std::size_t dimension, std::vector<std::vector<double>> columns) const;

  DreamSettings settings_;
  DreamProblem problem_;
  ChainRandom random_;
  ChainHistory history_;
  DreamEnd end_ = DreamEnd::none;
  int runs_ = 0;
  std::optional<std::size_t> burnIn_;
  std::size_t nextCheck_ = 0;  ///< generations
  std::vector<ConvergenceCheck> checks_;
  std::vector<ArchiveMember> archive_;  ///< Z
  std::vector<double> archiveMeans_;    ///< of Z, one per dimension
  std::vector<double> archiveSquares_;  ///< sums of squared deviations from them
  std::vector<double> crossoverProbabilities_;
  std::vector<double> crossoverDistances_;  ///< standardised squared jumps, one per crossover value
  std::vector<double> crossoverUses_;
  std::vector<ChainHistory::State> current_;  ///< points in currentPoints_
  std::vector<std::vector<double>> currentPoints_;
  DreamCounts parallel_;
  DreamCounts snooker_;
  int outlierCount_ = 0;
  std::size_t adaptations_ = 0;  ///< made of the archive, and tests for outliers
};

}  // namespace mirevo
