#include "algorithms/analyses/elementary_effects.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <numeric>
#include <utility>

#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/numbers/sobol.h"
#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {
namespace {

constexpr double kLeastStep = 0.1;
constexpr double kGoldenRatio = 0.6180339887498949;  // its multiples fill an interval evenly
constexpr int kMostTries = 64;                       // for a step
constexpr int kMostBaseTries = 1000;                 // for a base point that can be run
constexpr double kEdge = 1.0e-6;  // the cube is open; closer to 1 the rounding of an integer parameter would show

double insideCube(double u) {
  return std::clamp(u, kEdge, 1.0 - kEdge);
}

/// Where u, uniform in (0, 1), comes to lie at least `least` from `a`, uniform there, too.
double awayFrom(double a, double u, double least) {
  const double below = std::max(0.0, a - least);
  const double above = std::max(0.0, 1.0 - a - least);
  const double x = u * (below + above);
  return insideCube(x < below ? x : a + least + (x - below));
}

class Planner {
 public:
  Planner(const MorrisSettings& settings, const SearchSpace& space, const ParameterDistributions& distributions,
          std::int32_t seed, const Feasibility& feasibility)
      : settings_(settings), space_(space), distributions_(distributions), feasibility_(feasibility), random_(seed) {
    plan_.design = settings.design;
    plan_.unchanged.assign(size(), 0);
    plan_.infeasible.assign(size(), 0);
    plan_.isCorrelated = distributions_.copula() && !distributions_.copula()->correlatedOnes().empty();
  }

  EffectPlan make() {
    if (settings_.design == EffectDesign::radial) {
      planRadial();
    } else {
      planChains();
    }
    return std::move(plan_);
  }

 private:
  /// A trajectory on levels.
  struct Chain {
    std::vector<double> from;
    std::vector<double> to;
    std::vector<std::uint32_t> order;
    std::vector<float> centroid;
  };

  std::size_t size() const { return distributions_.size(); }
  double valueAt(std::size_t j, std::span<const double> point) const {
    return toModelScale(space_, j, distributions_.valueAt(j, point));
  }
  bool isCorrelated(std::size_t j) const { return distributions_.copula() && distributions_.copula()->isCorrelated(j); }
  /// Whether a set can be run; if not, that is noted when `isNoted`.
  bool canRun(std::span<const double> set, bool isNoted);
  /// Before and after these, which move in coordinate j meanwhile, the point is the same.
  double position(std::size_t j, std::vector<double>& point);
  double middleOfValue(std::size_t j, std::vector<double>& point);
  double widthOf(std::size_t j, std::vector<double>& point, double target);

  void planRadial();
  bool takeBase(std::vector<double>& base);
  void stepFromBase(EffectTrajectory& trajectory, const ParameterSet& base, std::size_t j, double target);
  /// Empty where it is not tested whether sets can be run.
  ParameterSet testedSetAt(std::span<const double> point) const {
    return feasibility_.isTested() ? distributions_.setAt(point) : ParameterSet();
  }
  void planChains();
  std::vector<Chain> drawChains();
  static double spreadOf(std::span<const Chain> chains, double enough);
  void follow(const Chain& chain);
  double steppedFrom(double u);

  const MorrisSettings& settings_;
  const SearchSpace& space_;
  const ParameterDistributions& distributions_;
  const Feasibility& feasibility_;
  UniformGenerator random_;
  EffectPlan plan_;
  std::string lastViolation_;                                 ///< of the last set that cannot be run
  std::map<std::pair<std::size_t, double>, double> middles_;  ///< by integer parameter and value
};

bool Planner::canRun(std::span<const double> set, bool isNoted) {
  if (!feasibility_.isTested()) return true;
  auto violation = feasibility_.violation(set);
  if (!violation) return true;
  if (isNoted && plan_.infeasiblePoints++ == 0) plan_.violation = *violation;
  lastViolation_ = *std::move(violation);
  return false;
}

/// The middle of the coordinates at which an integer parameter has the value that it has at the point.
double Planner::middleOfValue(std::size_t j, std::vector<double>& point) {
  constexpr int kHalvings = 40;
  const double value = valueAt(j, point);
  const auto known = middles_.find({j, value});
  if (known != middles_.end()) return known->second;
  const double inside = point[j];
  const auto edge = [&](double outside) {
    point[j] = outside;
    if (valueAt(j, point) == value) return outside;
    double within = inside;
    for (int i = 0; i < kHalvings; ++i) {
      point[j] = 0.5 * (within + outside);
      (valueAt(j, point) == value ? within : outside) = point[j];
    }
    return within;
  };
  const double below = edge(kEdge);
  const double middle = 0.5 * (below + edge(1.0 - kEdge));
  point[j] = inside;
  if (!isCorrelated(j)) middles_[{j, value}] = middle;
  return middle;
}

/// Where the parameter is in its distribution: 0 at the beginning, 1 at the end. Of an integer parameter the first
/// value is at 0 and the last one at 1; uniform between its bounds, it has the others evenly between.
double Planner::position(std::size_t j, std::vector<double>& point) {
  const double from = point[j];
  if (space_.transformation[j] != TransformationType::integer) return from;
  const double middle = middleOfValue(j, point);
  point[j] = kEdge;
  const double first = middleOfValue(j, point);
  point[j] = 1.0 - kEdge;
  const double last = middleOfValue(j, point);
  point[j] = from;
  return last > first ? (middle - first) / (last - first) : 0.0;
}

/// The width of a step to `target`; 0 if it leaves the value as it is.
double Planner::widthOf(std::size_t j, std::vector<double>& point, double target) {
  const double from = point[j];
  const double value = valueAt(j, point);
  point[j] = target;
  const bool isChanged = valueAt(j, point) != value;
  double width = isChanged ? position(j, point) : 0.0;
  point[j] = from;
  if (isChanged) width -= position(j, point);
  return width;
}

/// Another point in place of one that cannot be run, if one is found.
bool Planner::takeBase(std::vector<double>& base) {
  if (canRun(testedSetAt(base), false)) return true;
  for (int i = 0; i < kMostBaseTries; ++i) {
    for (double& u : base) u = random_.next();
    if (canRun(testedSetAt(base), false)) return true;
  }
  return canRun(testedSetAt(base), true);
}

void Planner::stepFromBase(EffectTrajectory& trajectory, const ParameterSet& base, std::size_t j, double target) {
  bool wasChanged = false;
  for (int i = 0; i < kMostTries; ++i) {
    double u = target + i * kGoldenRatio;
    u -= std::floor(u);
    // A value that only short steps lead to is better than none.
    const double least = wasChanged || i < kMostTries / 2 ? kLeastStep : 0.0;
    trajectory.moved[j] = awayFrom(trajectory.base[j], u, least);
    const double width = widthOf(j, trajectory.base, trajectory.moved[j]);
    if (width == 0.0) continue;
    wasChanged = true;
    if (feasibility_.isTested()) {
      ParameterSet set = base;
      const double from = std::exchange(trajectory.base[j], trajectory.moved[j]);
      distributions_.move(set, j, trajectory.base);
      trajectory.base[j] = from;
      if (!canRun(set, false)) continue;
    }
    trajectory.width[j] = width;
    trajectory.evaluations[j + 1] = ++plan_.evaluationCount;
    return;
  }
  ++(wasChanged ? plan_.infeasible : plan_.unchanged)[j];
  if (wasChanged && plan_.stepViolation.empty()) plan_.stepViolation = lastViolation_;
}

void Planner::planRadial() {
  const auto r = static_cast<std::size_t>(settings_.trajectories);
  const std::size_t p = size();
  UnitPoints points =
      2 * p <= kMaxSobolDimension ? scrambledSobol(r, 2 * p, random_) : latinHypercube(r, 2 * p, random_);
  for (std::size_t j = p; j < 2 * p; ++j) {
    for (std::size_t left = r; left > 1; --left) {
      const auto pick = static_cast<std::size_t>(random_.next() * static_cast<double>(left));
      std::swap(points[left - 1][j], points[pick][j]);
    }
  }
  for (const std::vector<double>& point : points) {
    EffectTrajectory& trajectory = plan_.trajectories.emplace_back();
    for (std::size_t j = 0; j < p; ++j) trajectory.base.push_back(insideCube(point[j]));
    trajectory.moved.assign(p, 0.0);
    trajectory.width.assign(p, 0.0);
    trajectory.order.resize(p);
    std::iota(trajectory.order.begin(), trajectory.order.end(), std::size_t{0});
    trajectory.evaluations.assign(p + 1, 0);
    if (!takeBase(trajectory.base)) continue;
    trajectory.evaluations[0] = ++plan_.evaluationCount;
    const ParameterSet base = testedSetAt(trajectory.base);
    for (std::size_t j = 0; j < p; ++j) stepFromBase(trajectory, base, j, point[p + j]);
  }
}

/// By a quarter to three quarters of the levels, beyond the last of which comes the first. With steps of one width an
/// output that repeats itself at that distance would show no effect.
double Planner::steppedFrom(double u) {
  const int least = (settings_.levels + 3) / 4;
  const int most = settings_.levels - least;
  const int by = least + static_cast<int>(random_.next() * (most - least + 1));
  const double next = u + static_cast<double>(by) / settings_.levels;
  return insideCube(next < 1.0 ? next : next - 1.0);
}

std::vector<Planner::Chain> Planner::drawChains() {
  const std::size_t p = size();
  const auto r = static_cast<std::size_t>(settings_.trajectories);
  std::vector<Chain> chains(r);
  const UnitPoints starts = latinHypercube(r, p, random_);
  for (std::size_t t = 0; t < r; ++t) {
    Chain& chain = chains[t];
    for (const double u : starts[t]) {
      chain.from.push_back(insideCube(u));
      chain.to.push_back(steppedFrom(u));
    }
    chain.order.resize(p);
    std::iota(chain.order.begin(), chain.order.end(), std::uint32_t{0});
    for (std::size_t left = p; left > 1; --left) {
      const auto pick = static_cast<std::size_t>(random_.next() * static_cast<double>(left));
      std::swap(chain.order[left - 1], chain.order[pick]);
    }
    // The parameter that steps k-th, from 0, has its first value in k + 1 of the p + 1 points.
    chain.centroid.resize(p);
    for (std::size_t k = 0; k < p; ++k) {
      const std::uint32_t j = chain.order[k];
      const double share = static_cast<double>(k + 1) / static_cast<double>(p + 1);
      chain.centroid[j] = static_cast<float>(share * chain.from[j] + (1.0 - share) * chain.to[j]);
    }
  }
  return chains;
}

/// The squared distance of the two nearest centroids, or any value not above `enough` once it is known to be that
/// small.
double Planner::spreadOf(std::span<const Chain> chains, double enough) {
  double least = std::numeric_limits<double>::infinity();
  for (std::size_t a = 0; a < chains.size() && least > enough; ++a) {
    for (std::size_t b = 0; b < a; ++b) {
      double squared = 0.0;
      for (std::size_t j = 0; j < chains[a].centroid.size(); ++j) {
        const double difference = chains[a].centroid[j] - chains[b].centroid[j];
        squared += difference * difference;
      }
      least = std::min(least, squared);
    }
  }
  return least;
}

void Planner::follow(const Chain& chain) {
  const std::size_t p = size();
  EffectTrajectory& trajectory = plan_.trajectories.emplace_back();
  trajectory.base = chain.from;
  trajectory.moved = chain.to;
  trajectory.order.assign(chain.order.begin(), chain.order.end());
  trajectory.width.assign(p, 0.0);
  trajectory.evaluations.assign(p + 1, 0);
  std::vector<double> point = trajectory.base;
  ParameterSet set = testedSetAt(point);
  if (canRun(set, true)) trajectory.evaluations[0] = ++plan_.evaluationCount;
  for (std::size_t k = 0; k < p; ++k) {
    const std::size_t j = trajectory.order[k];
    trajectory.width[j] = widthOf(j, point, trajectory.moved[j]);
    if (trajectory.width[j] == 0.0) {
      // Half of the range takes an integer parameter to another value, if it has two of the same probability.
      trajectory.moved[j] = point[j] < 0.5 ? point[j] + 0.5 : point[j] - 0.5;
      trajectory.width[j] = widthOf(j, point, trajectory.moved[j]);
    }
    if (trajectory.width[j] == 0.0) {
      ++plan_.unchanged[j];
      continue;
    }
    point[j] = trajectory.moved[j];
    if (feasibility_.isTested()) distributions_.move(set, j, point);
    if (canRun(set, true)) trajectory.evaluations[k + 1] = ++plan_.evaluationCount;
  }
  std::vector<bool> hasEffect(p);
  for (const EffectPair& pair : pairsOf(plan_, trajectory)) hasEffect[pair.parameter] = true;
  for (std::size_t j = 0; j < p; ++j) {
    if (trajectory.width[j] != 0.0 && !hasEffect[j]) ++plan_.infeasible[j];
  }
}

void Planner::planChains() {
  std::vector<Chain> best = drawChains();
  double spread = settings_.candidates > 1 ? spreadOf(best, 0.0) : 0.0;
  for (int i = 1; i < settings_.candidates; ++i) {
    std::vector<Chain> chains = drawChains();
    const double another = spreadOf(chains, spread);
    if (!(another > spread)) continue;
    spread = another;
    best = std::move(chains);
  }
  for (const Chain& chain : best) follow(chain);
}

}  // namespace

EffectPlan planEffects(const MorrisSettings& settings, const SearchSpace& space,
                       const ParameterDistributions& distributions, std::int32_t seed, const Feasibility& feasibility) {
  return Planner(settings, space, distributions, seed, feasibility).make();
}

std::vector<ParameterSet> setsOf(const EffectPlan& plan, const EffectTrajectory& trajectory,
                                 const ParameterDistributions& distributions) {
  std::vector<ParameterSet> sets;
  std::vector<double> point = trajectory.base;
  ParameterSet set = distributions.setAt(point);
  const ParameterSet base = set;
  if (trajectory.evaluations[0] > 0) sets.push_back(set);
  for (std::size_t k = 0; k < trajectory.order.size(); ++k) {
    const std::size_t j = trajectory.order[k];
    if (trajectory.width[j] == 0.0) continue;
    const double from = std::exchange(point[j], trajectory.moved[j]);
    distributions.move(set, j, point);
    if (trajectory.evaluations[k + 1] > 0) sets.push_back(set);
    if (plan.design == EffectDesign::trajectories) continue;
    point[j] = from;
    set = base;
  }
  return sets;
}

std::vector<EffectPair> pairsOf(const EffectPlan& plan, const EffectTrajectory& trajectory) {
  std::vector<EffectPair> pairs;
  int from = trajectory.evaluations[0];
  for (std::size_t k = 0; k < trajectory.order.size(); ++k) {
    const std::size_t j = trajectory.order[k];
    const int to = trajectory.evaluations[k + 1];
    if (trajectory.width[j] == 0.0) continue;
    if (from > 0 && to > 0) pairs.push_back({j, from, to, trajectory.width[j]});
    if (plan.design == EffectDesign::trajectories) from = to;
  }
  return pairs;
}

}  // namespace mirevo
