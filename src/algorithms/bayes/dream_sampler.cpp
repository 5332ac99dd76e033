#include "algorithms/bayes/dream_sampler.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <functional>
#include <limits>
#include <numeric>
#include <utility>

#include <fmt/format.h>

#include "algorithms/bayes/chain_diagnostics.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/fatal_error.h"

namespace mirevo {
namespace {

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kWholeJumpShare = 0.2;             // of jumps with gamma = 1
constexpr double kJumpSpread = 0.1;                 // lambda ~ U(-c, c), of the other jumps
constexpr double kJumpNoise = 1e-6;                 // standard deviation of zeta, of the range
constexpr std::array kAdaptations{0.5, 0.75, 1.0};  // of burn-in
constexpr std::size_t kFirstCheck = 50;             // generations behind burn-in
constexpr double kCheckGrowth = 1.3;
constexpr double kLeastValues = 1000.0;  // of a chain, that a check looks at if there are so many
constexpr double kValuesPerDraw = 4.0;   // all chains together, for each independent draw that is wanted

/// The place in [lower, upper) at which a way that leaves it on one side and comes in on the other ends.
double folded(double value, double lower, double upper) {
  const double width = upper - lower;
  if (value >= lower && value <= upper) return value;
  const double rest = std::fmod(value - lower, width);
  return std::clamp(lower + (rest < 0.0 ? rest + width : rest), lower, upper);
}

bool isWithin(const DreamProblem& problem, std::span<const double> point) {
  for (std::size_t j = 0; j < point.size(); ++j) {
    if (!(point[j] >= problem.lower[j] && point[j] <= problem.upper[j])) return false;
  }
  return true;
}

/// Whether no chain stands still.
bool isMoving(std::span<const std::vector<double>> columns) {
  return std::ranges::all_of(columns, [](const std::vector<double>& column) {
    return std::ranges::adjacent_find(column, std::not_equal_to()) != column.end();
  });
}

bool isConstant(std::span<const std::vector<double>> columns) {
  const double first = columns.front().front();
  return std::ranges::all_of(columns, [first](const std::vector<double>& column) {
    return std::ranges::all_of(column, [first](double value) { return value == first; });
  });
}

}  // namespace

std::optional<std::vector<double>> drawAllowed(const DreamProblem& problem, ChainRandom& random) {
  std::vector<double> unit(problem.lower.size());
  for (int k = 0; k < kMostPriorDraws; ++k) {
    for (double& value : unit) value = random.uniform();
    std::vector<double> point = problem.drawPrior(unit);
    if (isWithin(problem, point) && problem.logPrior(point) > -kInfinity) return point;
  }
  return std::nullopt;
}

void ChainHistory::add(const State& state) {
  points_.insert(points_.end(), state.point.begin(), state.point.end());
  logLikelihoods_.push_back(state.logLikelihood);
  logPriors_.push_back(state.logPrior);
  evaluations_.push_back(state.evaluation);
  accepted_.push_back(state.accepted);
}

ChainHistory::State ChainHistory::at(std::size_t generation, std::size_t chain) const {
  const std::size_t index = generation * chainCount_ + chain;
  return {std::span(points_).subspan(index * dimension_, dimension_), logLikelihoods_[index], logPriors_[index],
          evaluations_[index], accepted_[index]};
}

std::vector<std::vector<double>> ChainHistory::columns(std::size_t dimension, std::size_t first,
                                                       std::size_t stride) const {
  std::vector<std::vector<double>> values(chainCount_);
  for (std::size_t g = first; g < generations(); g += stride) {
    for (std::size_t c = 0; c < chainCount_; ++c) {
      values[c].push_back(points_[(g * chainCount_ + c) * dimension_ + dimension]);
    }
  }
  return values;
}

std::vector<ChainHistory::State> ChainHistory::spread(std::size_t first, std::size_t most) const {
  const std::size_t taken = std::max<std::size_t>(most / std::max<std::size_t>(chainCount_, 1), 1);
  const std::size_t count = generations() - std::min(first, generations());
  const std::size_t stride = std::max<std::size_t>((count + taken - 1) / taken, 1);
  std::vector<State> states;
  for (std::size_t g = first; g < generations(); g += stride) {
    for (std::size_t c = 0; c < chainCount_; ++c) states.push_back(at(g, c));
  }
  return states;
}

double ConvergenceCheck::largestRHat() const {
  double largest = 0.0;
  for (const double value : rHat) largest = std::max(largest, std::isnan(value) ? kInfinity : value);
  return largest;
}

double ConvergenceCheck::leastEffectiveSize() const {
  double least = kInfinity;
  for (const double value : effectiveSizes) least = std::min(least, std::isnan(value) ? 0.0 : value);
  return least;
}

DreamSampler::DreamSampler(const DreamSettings& settings, DreamProblem problem, std::int32_t seed)
    : settings_(settings),
      problem_(std::move(problem)),
      random_(seed),
      history_(static_cast<std::size_t>(settings.chainCount), problem_.lower.size()) {
  const auto crossovers = static_cast<std::size_t>(settings_.crossoverCount);
  crossoverProbabilities_.assign(crossovers, 1.0 / static_cast<double>(crossovers));
  crossoverDistances_.assign(crossovers, 0.0);
  crossoverUses_.assign(crossovers, 0.0);
  archiveMeans_.assign(dimension(), 0.0);
  archiveSquares_.assign(dimension(), 0.0);
}

bool DreamSampler::isInside(std::span<const double> point) const {
  return isWithin(problem_, point);
}

std::vector<double> DreamSampler::drawAllowed() {
  std::optional<std::vector<double>> point = mirevo::drawAllowed(problem_, random_);
  if (point) return *std::move(point);
  fatalError("Error: No parameter set found in the prior that can be run",
             fmt::format("none of {} draws lies within the bounds and meets the constraints", kMostPriorDraws));
}

void DreamSampler::addToArchive(ArchiveMember member) {
  archive_.push_back(std::move(member));
  const std::vector<double>& point = archive_.back().point;
  const auto count = static_cast<double>(archive_.size());
  for (std::size_t j = 0; j < point.size(); ++j) {
    const double change = point[j] - archiveMeans_[j];
    archiveMeans_[j] += change / count;
    archiveSquares_[j] += change * (point[j] - archiveMeans_[j]);
  }
}

std::size_t DreamSampler::leastArchive() const {
  // A third of it may be states of the chain itself, of three chains.
  const std::size_t ofJumps = 3 * static_cast<std::size_t>(settings_.pairCount) + 3;
  const std::size_t wanted =
      settings_.archiveStart > 0 ? static_cast<std::size_t>(settings_.archiveStart) : 10 * dimension();
  return std::max(wanted, ofJumps);
}

/// Differences of prior draws are far larger than the posterior: up to half of the archive gives way to states.
void DreamSampler::forgetOldestArchive() {
  const std::size_t kept = std::max(archive_.size() - archive_.size() / 2, leastArchive());
  if (kept >= archive_.size()) return;
  std::vector<ArchiveMember> all = std::exchange(archive_, {});
  archiveMeans_.assign(dimension(), 0.0);
  archiveSquares_.assign(dimension(), 0.0);
  for (std::size_t k = all.size() - kept; k < all.size(); ++k) addToArchive(std::move(all[k]));
}

void DreamSampler::initialise() {
  const std::size_t chains = history_.chainCount();
  while (archive_.size() < leastArchive()) addToArchive({drawAllowed(), std::nullopt});
  std::vector<DreamProposal> proposals;
  for (std::size_t c = 0; c < chains; ++c) proposals.push_back({drawAllowed(), 0});
  const std::vector<ProposalResult> results = problem_.evaluate(proposals);
  runs_ += static_cast<int>(chains);
  for (std::size_t c = 0; c < chains; ++c) {
    currentPoints_.push_back(std::move(proposals[c].point));
    current_.push_back(
        {{}, results[c].logLikelihood, problem_.logPrior(currentPoints_[c]), results[c].evaluation, true});
  }
}

/// Members of the archive that were no states of this chain.
std::vector<std::size_t> DreamSampler::pickArchive(std::size_t count, std::size_t chain) {
  std::vector<std::size_t> picked;
  while (picked.size() < count) {
    const std::size_t index = random_.below(archive_.size());
    if (archive_[index].chain == chain) continue;
    if (std::ranges::find(picked, index) == picked.end()) picked.push_back(index);
  }
  return picked;
}

/// The dimensions that a jump changes, by a crossover value drawn with the probabilities found so far.
std::vector<std::size_t> DreamSampler::pickDimensions(std::size_t& crossover) {
  const double choice = random_.uniform();
  double sum = 0.0;
  for (crossover = 0; crossover + 1 < crossoverProbabilities_.size(); ++crossover) {
    sum += crossoverProbabilities_[crossover];
    if (choice < sum) break;
  }
  const double share = static_cast<double>(crossover + 1) / static_cast<double>(crossoverProbabilities_.size());
  std::vector<std::size_t> changed;
  for (std::size_t j = 0; j < dimension(); ++j) {
    if (random_.uniform() < share) changed.push_back(j);
  }
  if (changed.empty()) changed.push_back(random_.below(dimension()));
  return changed;
}

void DreamSampler::proposeParallel(std::size_t chain, Candidate& candidate) {
  std::vector<std::size_t> changed(dimension());
  std::iota(changed.begin(), changed.end(), std::size_t{0});
  std::size_t pairs = 1;
  double gamma = 1.0;  // from one peak or ridge to another, whose difference all dimensions share
  if (!(random_.uniform() < kWholeJumpShare)) {
    changed = pickDimensions(candidate.crossover.emplace());
    pairs = 1 + random_.below(static_cast<std::size_t>(settings_.pairCount));
    gamma = (1.0 + random_.uniform(-kJumpSpread, kJumpSpread)) * 2.38 /
            std::sqrt(2.0 * static_cast<double>(pairs * changed.size()));
  }
  const std::vector<std::size_t> picked = pickArchive(2 * pairs, chain);
  std::vector<double>& point = candidate.proposal.point;
  point = currentPoints_[chain];
  for (const std::size_t j : changed) {
    double difference = 0.0;
    for (std::size_t k = 0; k < pairs; ++k) {
      difference += archive_[picked[2 * k]].point[j] - archive_[picked[2 * k + 1]].point[j];
    }
    const double noise = kJumpNoise * (problem_.upper[j] - problem_.lower[j]) * random_.normal();
    point[j] += gamma * difference + noise;
    if (settings_.boundary == BoundaryHandling::fold) point[j] = folded(point[j], problem_.lower[j], problem_.upper[j]);
  }
}

/// Along the line through the state x and an archive member z: x + g (P(a) - P(b)) with the projections of two others.
/// The density along the line changes with the distance from z to the power d - 1, which the factor corrects.
void DreamSampler::proposeSnooker(std::size_t chain, Candidate& candidate) {
  const std::vector<double>& state = currentPoints_[chain];
  const std::vector<std::size_t> picked = pickArchive(3, chain);
  const double gamma = random_.uniform(1.2, 2.2);
  const std::vector<double>& centre = archive_[picked[0]].point;
  std::vector<double>& point = candidate.proposal.point;
  point = state;
  double squares = 0.0;
  double projection = 0.0;
  const auto scaled = [&](std::size_t j, double value) { return value / (problem_.upper[j] - problem_.lower[j]); };
  for (std::size_t j = 0; j < point.size(); ++j) {
    const double axis = scaled(j, state[j] - centre[j]);
    squares += axis * axis;
    projection += axis * scaled(j, archive_[picked[1]].point[j] - archive_[picked[2]].point[j]);
  }
  if (!(squares > 0.0) || projection == 0.0) {
    // The state is that of the member, or the two others are equal: the way has no direction or no length.
    candidate.logFactor = -kInfinity;
    return;
  }
  const double step = gamma * projection / squares;
  for (std::size_t j = 0; j < point.size(); ++j) point[j] += step * (state[j] - centre[j]);
  candidate.logFactor = static_cast<double>(dimension() - 1) * std::log(std::abs(1.0 + step));
}

bool DreamSampler::isSameModel(std::span<const double> a, std::span<const double> b) const {
  return std::equal(a.begin(), a.begin() + static_cast<std::ptrdiff_t>(problem_.modelParameterCount), b.begin());
}

DreamSampler::Candidate DreamSampler::propose(std::size_t chain) {
  Candidate candidate;
  const std::span<const double> state = currentPoints_[chain];
  candidate.isSnooker = random_.uniform() < settings_.snookerShare;
  if (candidate.isSnooker) {
    proposeSnooker(chain, candidate);
  } else {
    proposeParallel(chain, candidate);
  }
  const std::vector<double>& point = candidate.proposal.point;
  const bool isPossible = candidate.logFactor > -kInfinity && isInside(point);
  candidate.logPrior = isPossible ? problem_.logPrior(point) : -kInfinity;
  if (isSameModel(point, state)) candidate.proposal.knownRun = current_[chain].evaluation;
  candidate.uniform = random_.uniform();
  return candidate;
}

void DreamSampler::noteJump(std::span<const double> from, std::span<const double> to, std::size_t crossover) {
  const auto count = static_cast<double>(archive_.size() - 1);
  double distance = 0.0;
  for (std::size_t j = 0; j < from.size(); ++j) {
    const double variance = archiveSquares_[j] / count;
    if (variance > 0.0) distance += (to[j] - from[j]) * (to[j] - from[j]) / variance;
  }
  crossoverDistances_[crossover] += distance;
}

/// Metropolis: the state stays, and is counted once more, unless the proposal is accepted.
void DreamSampler::decide(std::size_t chain, const Candidate& candidate, const ProposalResult& result) {
  ChainHistory::State& state = current_[chain];
  const bool isPossible = candidate.logPrior > -kInfinity && result.logLikelihood > -kInfinity;
  const double before = state.logLikelihood + state.logPrior;
  const double after = result.logLikelihood + candidate.logPrior;
  state.accepted =
      isPossible && (before == -kInfinity || std::log(candidate.uniform) < after - before + candidate.logFactor);
  if (candidate.crossover && !burnIn_) {
    crossoverUses_[*candidate.crossover] += 1.0;
    if (state.accepted) noteJump(currentPoints_[chain], candidate.proposal.point, *candidate.crossover);
  }
  if (burnIn_) {
    DreamCounts& counts = candidate.isSnooker ? snooker_ : parallel_;
    ++counts.proposals;
    if (state.accepted) ++counts.accepted;
  }
  if (!state.accepted) return;
  currentPoints_[chain] = candidate.proposal.point;
  state.logLikelihood = result.logLikelihood;
  state.logPrior = candidate.logPrior;
  state.evaluation = result.evaluation;
}

void DreamSampler::advance() {
  if (current_.empty()) {
    initialise();
    endGeneration();
    return;
  }
  std::vector<Candidate> candidates;
  std::vector<DreamProposal> wanted;
  std::vector<std::size_t> places;
  int needed = 0;
  for (std::size_t c = 0; c < history_.chainCount(); ++c) {
    candidates.push_back(propose(c));
    if (!(candidates[c].logPrior > -kInfinity)) continue;
    wanted.push_back(candidates[c].proposal);
    places.push_back(c);
    if (wanted.back().knownRun == 0) ++needed;
  }
  if (runs_ + needed > settings_.mostRuns) {
    end_ = DreamEnd::budget;
    return;
  }
  std::vector<ProposalResult> results(candidates.size(), ProposalResult{-kInfinity, 0});
  if (!wanted.empty()) {
    const std::vector<ProposalResult> found = problem_.evaluate(wanted);
    for (std::size_t k = 0; k < places.size(); ++k) results[places[k]] = found[k];
  }
  runs_ += needed;
  for (std::size_t c = 0; c < candidates.size(); ++c) decide(c, candidates[c], results[c]);
  endGeneration();
}

void DreamSampler::adaptCrossover() {
  std::vector<double> means(crossoverDistances_.size());
  double sum = 0.0;
  for (std::size_t m = 0; m < means.size(); ++m) {
    if (crossoverUses_[m] == 0.0) return;
    means[m] = crossoverDistances_[m] / crossoverUses_[m];
    sum += means[m];
  }
  if (!(sum > 0.0)) return;
  constexpr double kLeast = 0.02;  // so that every value goes on being tried
  double total = 0.0;
  for (double& mean : means) total += mean = std::max(mean / sum, kLeast);
  for (std::size_t m = 0; m < means.size(); ++m) crossoverProbabilities_[m] = means[m] / total;
}

/// A chain that is caught far from the others goes on from the state of the best of them.
void DreamSampler::resetOutliers() {
  const std::size_t chains = history_.chainCount();
  const std::size_t count = history_.generations();
  const std::size_t first = count - (count + 3) / 4;
  std::vector<double> means(chains, 0.0);
  for (std::size_t c = 0; c < chains; ++c) {
    for (std::size_t g = first; g < count; ++g) {
      const ChainHistory::State state = history_.at(g, c);
      // A failed run's state has no density; it counts as lower than any.
      means[c] += std::max(state.logLikelihood + state.logPrior, -1e100) / static_cast<double>(count - first);
    }
  }
  std::vector<double> sorted = means;
  std::ranges::sort(sorted);
  const double lower = sortedQuantile(sorted, 0.25);
  const double range = sortedQuantile(sorted, 0.75) - lower;
  const double limit = lower - std::max(2.0 * range, static_cast<double>(dimension()));
  const auto best = static_cast<std::size_t>(std::ranges::max_element(means) - means.begin());
  for (std::size_t c = 0; c < chains; ++c) {
    if (!(means[c] < limit)) continue;
    currentPoints_[c] = currentPoints_[best];
    current_[c] = current_[best];
    ++outlierCount_;
  }
}

void DreamSampler::endGeneration() {
  for (std::size_t c = 0; c < current_.size(); ++c) {
    current_[c].point = currentPoints_[c];
    history_.add(current_[c]);
  }
  const std::size_t generation = history_.generations();
  if (generation % static_cast<std::size_t>(settings_.archiveInterval) == 0) {
    for (std::size_t c = 0; c < currentPoints_.size(); ++c) addToArchive({currentPoints_[c], c});
    if (!burnIn_) adaptCrossover();
  }
  const double burnInRuns = settings_.burnInRuns();
  const std::size_t before = adaptations_;
  // In a short burn-in a generation may be the last before several of them.
  while (adaptations_ < kAdaptations.size() && runs_ >= kAdaptations[adaptations_] * burnInRuns) ++adaptations_;
  if (adaptations_ > before) {
    resetOutliers();
    forgetOldestArchive();
  }
  if (!burnIn_ && runs_ >= burnInRuns) {
    burnIn_ = generation;
    nextCheck_ = generation + kFirstCheck;
  }
  if (burnIn_ && generation >= nextCheck_) {
    nextCheck_ = *burnIn_ + static_cast<std::size_t>(kCheckGrowth * static_cast<double>(generation - *burnIn_)) + 1;
    if (auto check = checkNow()) {
      checks_.push_back(std::move(*check));
      const bool isEnough = checks_.back().largestRHat() <= settings_.rHatLimit &&
                            checks_.back().leastEffectiveSize() >= settings_.effectiveSize;
      if (isEnough && runs_ >= settings_.leastRuns) end_ = DreamEnd::converged;
    }
  }
  // Of proposals that need no evaluation there could be any number.
  constexpr std::size_t kMostPerRun = 10;
  if (end_ == DreamEnd::none && runs_ >= settings_.mostRuns) end_ = DreamEnd::budget;
  if (end_ == DreamEnd::none &&
      generation * history_.chainCount() >= kMostPerRun * static_cast<std::size_t>(settings_.mostRuns)) {
    end_ = DreamEnd::generations;
  }
}

std::vector<std::vector<double>> DreamSampler::usedColumns(std::size_t dimension,
                                                           std::vector<std::vector<double>> columns) const {
  if (!problem_.usedValue) return columns;
  for (std::vector<double>& column : columns) {
    for (double& value : column) value = problem_.usedValue(dimension, value);
  }
  return columns;
}

std::optional<ConvergenceCheck> DreamSampler::checkNow() const {
  if (!burnIn_ || history_.generations() < *burnIn_ + 4) return std::nullopt;
  ConvergenceCheck check{history_.generations(), runs_, {}, {}};
  // More values cost time, but thinned ones must suffice for the effective size that is wanted, if the budget does.
  const double wanted = settings_.effectiveSize <= settings_.mostRuns ? settings_.effectiveSize : 0.0;
  const auto values = static_cast<std::size_t>(
      std::max(kLeastValues, kValuesPerDraw * wanted / static_cast<double>(history_.chainCount())));
  const std::size_t stride = (history_.generations() - *burnIn_ + values - 1) / values;
  for (std::size_t j = 0; j < dimension(); ++j) {
    const auto columns = history_.columns(j, *burnIn_, stride);
    const auto used = usedColumns(j, columns);
    const bool isKnown = isConstant(used) && isMoving(columns);
    const std::size_t draws = (history_.generations() - *burnIn_) * history_.chainCount();
    check.rHat.push_back(isKnown ? 1.0 : mirevo::largestRHat(used));
    check.effectiveSizes.push_back(isKnown ? static_cast<double>(draws) : leastEffectiveSampleSize(used));
  }
  return check;
}

}  // namespace mirevo
