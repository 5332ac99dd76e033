#include "algorithms/analyses/effect_statistics.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <numeric>
#include <optional>
#include <utility>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kTail = 0.025;  // outside each limit
constexpr double kDegenerateShare = 0.01;
constexpr double kLeastError = 0.05;  // of the standard error of all effects: one of a sample that is smaller is none
constexpr double kRounding = 1.0e-9;  // of an effect: smaller differences between effects are none
constexpr std::size_t kBlock = 64;    // parameters whose sums fit into the fastest memory

/// What is summed over the effects of a parameter in a sample; all centred on the mean of all effects.
struct Sums {
  double n = 0.0;
  std::array<double, 4> powers{};  ///< of the effects, from the first on
  double absolute = 0.0;
  double absoluteSquared = 0.0;
  // With those of the reference parameter, in trajectories that have both.
  double both = 0.0;
  double products = 0.0;
  double ofThis = 0.0;
  double ofReference = 0.0;
};

struct Moments {
  double mean = 0.0;  ///< of the centred effects
  double deviation = 0.0;
  double logDeviationError = 0.0;  ///< standard error of the logarithm of the deviation
  double absoluteMean = 0.0;       ///< of the centred absolute effects
  double absoluteError = 0.0;
};

/// Of a sample of two effects or more.
Moments momentsOf(const Sums& s) {
  Moments m;
  const double n = s.n;
  m.mean = s.powers[0] / n;
  const double second = std::max(0.0, s.powers[1] / n - m.mean * m.mean);
  m.deviation = std::sqrt(second * n / (n - 1.0));
  const double fourth = s.powers[3] / n - 4.0 * m.mean * s.powers[2] / n + 6.0 * m.mean * m.mean * s.powers[1] / n -
                        3.0 * std::pow(m.mean, 4);
  if (second > 0.0) m.logDeviationError = std::sqrt(std::max(0.0, fourth - second * second) / n) / (2.0 * second);
  m.absoluteMean = s.absolute / n;
  m.absoluteError = std::sqrt(std::max(0.0, s.absoluteSquared / n - m.absoluteMean * m.absoluteMean) / (n - 1.0));
  return m;
}

/// The power of 2 next below x; 1 for 0. Multiples of it are exact.
double powerOfTwoOf(double x) {
  return x > 0.0 ? std::ldexp(1.0, std::ilogb(x)) : 1.0;
}

/// One parameter's effects, 0 where they are not known, in units of `scale`: powers of the effects themselves might
/// leave the range of numbers.
struct Column {
  double scale = 1.0;
  std::vector<double> known;     ///< 1 or 0
  std::vector<double> effect;    ///< centred
  std::vector<double> absolute;  ///< centred
  double count = 0.0;
  double mu = 0.0;
  double muStar = 0.0;
  double largest = 0.0;  ///< of the absolute effects
  bool isConstant = true;
  bool isConstantAbsolute = true;
};

Column columnOf(const EffectRows& effects, std::size_t j) {
  Column c;
  double largest = 0.0;
  for (const std::vector<double>& row : effects) {
    if (std::isfinite(row[j])) largest = std::max(largest, std::abs(row[j]));
  }
  c.scale = powerOfTwoOf(largest);
  c.largest = largest / c.scale;
  for (const std::vector<double>& row : effects) {
    const bool isKnown = std::isfinite(row[j]);
    c.known.push_back(isKnown ? 1.0 : 0.0);
    c.effect.push_back(isKnown ? row[j] / c.scale : 0.0);
    c.count += c.known.back();
    c.mu += c.effect.back();
    c.muStar += std::abs(c.effect.back());
  }
  if (c.count == 0.0) return c;
  c.mu /= c.count;
  c.muStar /= c.count;
  for (std::size_t t = 0; t < effects.size(); ++t) {
    c.absolute.push_back(c.known[t] * (std::abs(c.effect[t]) - c.muStar));
    c.effect[t] = c.known[t] * (c.effect[t] - c.mu);
    if (std::abs(c.effect[t]) > kRounding * c.muStar) c.isConstant = false;
    if (std::abs(c.absolute[t]) > kRounding * c.muStar) c.isConstantAbsolute = false;
  }
  return c;
}

/// Of one statistic in all bootstrap samples: its deviations from its value in standard errors, and its values.
struct Replicates {
  double error = 0.0;  ///< standard error of all effects
  std::vector<double> studentised = {};
  std::vector<double> values = {};
  std::size_t degenerate = 0;  ///< samples without a standard error

  bool isDegenerate() const {
    return static_cast<double>(degenerate) > kDegenerateShare * static_cast<double>(values.size());
  }
  /// Whether the sample has a standard error.
  bool add(double value, double deviation, double ofSample) {
    values.push_back(value);
    const bool hasError = ofSample > kLeastError * error && std::isfinite(deviation);
    if (hasError) {
      studentised.push_back(deviation / ofSample);
    } else {
      ++degenerate;
    }
    return hasError;
  }
};

double exponential(double x) {
  return std::exp(x);
}

/// Limits of an estimate; `back` leads from the scale on which it was resampled to that of its value.
template <class Back>
void setLimits(Replicates& r, double estimate, const Back& back, LimitedValue& limited) {
  limited.lower = limited.upper = limited.value;
  if (!r.studentised.empty()) {
    std::ranges::sort(r.studentised);
    limited.lower = std::min(limited.value, back(estimate - sortedQuantile(r.studentised, 1.0 - kTail) * r.error));
    limited.upper = std::max(limited.value, back(estimate - sortedQuantile(r.studentised, kTail) * r.error));
  }
  if (r.isDegenerate()) {
    std::ranges::sort(r.values);
    limited.lower = std::min(limited.lower, sortedQuantile(r.values, kTail));
    limited.upper = std::max(limited.upper, sortedQuantile(r.values, 1.0 - kTail));
  }
}

/// The standard error of the logarithm of a share in a sample.
double shareError(const Sums& s, double muStar, double referenceMuStar, const Sums& reference) {
  const double mean = s.absolute / s.n;
  const double otherMean = reference.absolute / reference.n;
  const double own = (s.absoluteSquared - s.n * mean * mean) / std::pow(s.n * muStar, 2);
  const double other =
      (reference.absoluteSquared - reference.n * otherMean * otherMean) / std::pow(reference.n * referenceMuStar, 2);
  const double both = (s.products - mean * s.ofReference - otherMean * s.ofThis + s.both * mean * otherMean) /
                      (s.n * muStar * reference.n * referenceMuStar);
  const double scale = std::min(s.n, reference.n) / (std::min(s.n, reference.n) - 1.0);
  return std::sqrt(std::max(0.0, (own + other - 2.0 * both) * scale));
}

/// Calls with first and end of each run of positions in `order`, in which values descend, whose values are equal but
/// for rounding.
template <class Value, class Call>
void forEachTie(std::span<const std::size_t> order, std::span<const Value> values, const Call& call) {
  constexpr Value kNearest = std::max(static_cast<Value>(kRounding), 4 * std::numeric_limits<Value>::epsilon());
  std::size_t first = 0;
  for (std::size_t k = 1; k <= order.size(); ++k) {
    if (k < order.size() && values[order[k - 1]] - values[order[k]] <= kNearest * std::abs(values[order[k - 1]]))
      continue;
    call(first, k);
    first = k;
  }
}

class Statistics {
 public:
  Statistics(const EffectRows& effects, const Resamples& resamples, double negligibleShare)
      : resamples_(resamples), negligible_(negligibleShare) {
    for (std::size_t j = 0; !effects.empty() && j < effects[0].size(); ++j) {
      columns_.push_back(columnOf(effects, j));
      if (columns_.back().muStar > 0.0) largestScale_ = std::max(largestScale_, columns_.back().scale);
    }
  }

  OutputEffects compute() {
    found_.parameters.resize(columns_.size());
    isTied_.assign(columns_.size(), false);
    takeValues();
    shares_.assign(columns_.size(), std::vector<bool>(resamples_.size()));
    muStars_.assign(resamples_.size(), std::vector<float>(columns_.size()));
    takeLargest();
    for (std::size_t first = 0; first < columns_.size(); first += kBlock) resampleBlock(first);
    rankSamples();
    judgeTogether();
    for (std::size_t j = 0; j < columns_.size(); ++j) {
      ParameterEffects& p = found_.parameters[j];
      for (LimitedValue* of : {&p.mu, &p.muStar}) {
        for (double* value : {&of->value, &of->lower, &of->upper}) *value *= columns_[j].scale;
      }
    }
    return std::move(found_);
  }

 private:
  void takeValues();
  void takeLargest();
  void resampleBlock(std::size_t first);
  void takeReplicates(std::size_t j, std::vector<Sums>& sums);
  void takeShare(std::size_t j, std::span<const Sums> sums);
  void rankSamples();
  void judgeTogether();
  Sums sumsOf(const Column& column, std::span<const double> weights) const;
  /// A value of a column in units that are the same for all.
  double comparable(const Column& column, double value) const {
    return value == 0.0 ? 0.0 : value * (column.scale / largestScale_);
  }

  const Resamples& resamples_;
  double negligible_;
  std::vector<Column> columns_;
  double largestScale_ = 0.0;             ///< of the columns
  std::optional<std::size_t> reference_;  ///< the parameter with the largest mu*
  std::vector<Sums> referenceSums_;       ///< in each sample
  std::vector<double> largest_;           ///< mu* of all parameters in each sample
  Sums referenceSum_;                     ///< in that of all effects
  OutputEffects found_;
  std::vector<bool> isTied_;                 ///< by parameter, whether another one has its rank
  std::vector<std::vector<bool>> shares_;    ///< by parameter, which samples agree that its share is negligible
  std::vector<std::vector<float>> muStars_;  ///< by sample; enough for ranks
};

Sums Statistics::sumsOf(const Column& column, std::span<const double> weights) const {
  const Column* other = reference_ ? &columns_[*reference_] : nullptr;
  Sums s;
  for (std::size_t t = 0; t < weights.size(); ++t) {
    const double w = weights[t];
    if (w == 0.0) continue;
    const double e = column.effect[t];
    const double a = column.absolute[t];
    s.n += w * column.known[t];
    s.powers[0] += w * e;
    s.powers[1] += w * e * e;
    s.powers[2] += w * e * e * e;
    s.powers[3] += w * e * e * e * e;
    s.absolute += w * a;
    s.absoluteSquared += w * a * a;
    if (other == nullptr) continue;
    s.both += w * column.known[t] * other->known[t];
    s.products += w * a * other->absolute[t];
    s.ofThis += w * a * other->known[t];
    s.ofReference += w * column.known[t] * other->absolute[t];
  }
  return s;
}

void Statistics::takeValues() {
  std::vector<double> muStars;
  for (std::size_t j = 0; j < columns_.size(); ++j) {
    const Column& c = columns_[j];
    ParameterEffects& p = found_.parameters[j];
    p.count = static_cast<std::size_t>(c.count);
    muStars.push_back(p.count > 0 ? comparable(c, c.muStar) : kNaN);
    if (p.count == 0) continue;
    p.mu.value = c.mu;
    p.muStar.value = c.muStar;
    if (c.muStar > 0.0) p.largestPart = c.largest / (c.muStar * c.count);
    if (!reference_ || muStars[j] > muStars[*reference_]) reference_ = j;
  }
  if (reference_ && columns_[*reference_].muStar == 0.0) reference_.reset();
  std::vector<std::size_t> order(columns_.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::ranges::stable_sort(order, [&](std::size_t a, std::size_t b) {
    return muStars[a] > muStars[b] || (std::isnan(muStars[b]) && !std::isnan(muStars[a]));
  });
  forEachTie<double>(order, muStars, [&](std::size_t first, std::size_t end) {
    for (std::size_t k = first; k < end && !std::isnan(muStars[order[k]]); ++k) {
      found_.parameters[order[k]].rank = first + 1;
      if (end - first > 1) isTied_[order[k]] = true;
    }
  });
  if (!reference_) return;
  for (std::size_t j = 0; j < columns_.size(); ++j) {
    ParameterEffects& p = found_.parameters[j];
    if (p.count > 0) p.share.value = muStars[j] / muStars[*reference_];
  }
  const Column& c = columns_[*reference_];
  const std::vector<double> once(c.known.size(), 1.0);
  referenceSum_ = sumsOf(c, once);
  std::vector<double> weights;
  for (const std::vector<std::uint16_t>& sample : resamples_) {
    weights.assign(sample.begin(), sample.end());
    referenceSums_.push_back(sumsOf(c, weights));
  }
}

void Statistics::takeLargest() {
  largest_.assign(resamples_.size(), 0.0);
  for (const Column& c : columns_) {
    if (c.count == 0.0) continue;
    for (std::size_t b = 0; b < resamples_.size(); ++b) {
      double n = 0.0;
      double sum = 0.0;
      for (std::size_t t = 0; t < c.known.size(); ++t) {
        n += resamples_[b][t] * c.known[t];
        sum += resamples_[b][t] * c.absolute[t];
      }
      if (n > 0.0) largest_[b] = std::max(largest_[b], comparable(c, c.muStar + sum / n));
    }
  }
}

void Statistics::resampleBlock(std::size_t first) {
  const std::size_t end = std::min(first + kBlock, columns_.size());
  std::vector<std::vector<Sums>> sums(end - first, std::vector<Sums>(resamples_.size()));
  std::vector<double> weights;
  for (std::size_t b = 0; b < resamples_.size(); ++b) {
    weights.assign(resamples_[b].begin(), resamples_[b].end());
    for (std::size_t j = first; j < end; ++j) {
      if (columns_[j].count > 0.0) sums[j - first][b] = sumsOf(columns_[j], weights);
    }
  }
  for (std::size_t j = first; j < end; ++j) takeReplicates(j, sums[j - first]);
}

void Statistics::takeReplicates(std::size_t j, std::vector<Sums>& sums) {
  const Column& c = columns_[j];
  ParameterEffects& p = found_.parameters[j];
  for (std::size_t b = 0; b < sums.size(); ++b) {
    const double muStar = sums[b].n > 0.0 ? comparable(c, c.muStar + sums[b].absolute / sums[b].n) : -1.0;
    muStars_[b][j] = static_cast<float>(muStar);
  }
  if (p.count < 2) return;
  const std::vector<double> once(c.known.size(), 1.0);
  const Moments all = momentsOf(sumsOf(c, once));
  p.sigma.value = c.isConstant ? 0.0 : all.deviation * c.scale;  // the logarithm of which does not scale exactly
  if (p.count < kFewestEffects) return;
  Replicates mu{all.deviation / std::sqrt(c.count)};
  Replicates muStar{all.absoluteError};
  Replicates sigma{all.logDeviationError};
  for (const Sums& sum : sums) {
    if (sum.n < 2.0) continue;
    const Moments m = momentsOf(sum);
    mu.add(c.mu + m.mean, m.mean - all.mean, m.deviation / std::sqrt(sum.n));
    muStar.add(c.muStar + m.absoluteMean, m.absoluteMean - all.absoluteMean, m.absoluteError);
    sigma.add(m.deviation * c.scale, std::log(m.deviation / all.deviation), m.logDeviationError);
  }
  const auto same = [](double x) { return x; };
  const auto atLeast0 = [](double x) { return std::max(0.0, x); };
  p.mu.lower = p.mu.upper = c.mu;
  p.muStar.lower = p.muStar.upper = c.muStar;
  if (!c.isConstant) setLimits(mu, c.mu, same, p.mu);
  if (!c.isConstantAbsolute) {
    setLimits(muStar, c.muStar, atLeast0, p.muStar);
  }
  if (p.count >= kFewestEffectsForSigma) {
    p.sigma.lower = p.sigma.upper = p.sigma.value;
    if (!c.isConstant) {
      setLimits(sigma, std::log(p.sigma.value), exponential, p.sigma);
    }
  }
  takeShare(j, sums);
}

void Statistics::takeShare(std::size_t j, std::span<const Sums> sums) {
  const Column& c = columns_[j];
  ParameterEffects& p = found_.parameters[j];
  if (!reference_ || found_.parameters[*reference_].count < kFewestEffects) return;
  const Column& reference = columns_[*reference_];
  p.share.lower = p.share.upper = p.share.value;
  if (j == *reference_ || c.muStar == 0.0) {
    const bool isNegligible = p.share.value < negligible_;
    // Of effects that are all 0 the limits know nothing of a corner that no step has met.
    if (j == *reference_) p.certainty = isNegligible ? 1.0 : 0.0;
    p.verdict = isNegligible ? ScreeningVerdict::fix : ScreeningVerdict::keep;
    shares_[j].assign(resamples_.size(), isNegligible);
    return;
  }
  const std::vector<double> once(c.known.size(), 1.0);
  const double logShare = std::log(p.share.value);
  const double error = shareError(sumsOf(c, once), c.muStar, reference.muStar, referenceSum_);
  // The studentised value that a sample must reach for its limit to stay below the negligible share.
  const double needed = (logShare - std::log(negligible_)) / error;
  const bool hasErrors = error > kRounding;
  Replicates share{error};
  std::size_t agreeing = 0;
  std::size_t below = 0;
  for (std::size_t b = 0; b < sums.size(); ++b) {
    if (sums[b].n < 2.0 || referenceSums_[b].n < 2.0) continue;
    const double muStar = std::max(0.0, c.muStar + sums[b].absolute / sums[b].n);
    const double other = reference.muStar + referenceSums_[b].absolute / referenceSums_[b].n;
    const double value = comparable(c, muStar) / largest_[b];
    const double deviation = std::log(value) - logShare;
    const double ofSample = shareError(sums[b], muStar, other, referenceSums_[b]);
    const bool hasError = hasErrors && share.add(value, deviation, ofSample);
    if (value < negligible_) ++below;
    shares_[j][b] = hasError ? deviation / ofSample >= needed : value < negligible_;
    if (hasError && shares_[j][b]) ++agreeing;
  }
  if (hasErrors) setLimits(share, logShare, exponential, p.share);
  p.certainty = share.studentised.empty()
                    ? (p.share.value < negligible_ ? 1.0 : 0.0)
                    : static_cast<double>(agreeing) / static_cast<double>(share.studentised.size());
  if (share.isDegenerate()) {
    p.certainty = std::min(p.certainty, static_cast<double>(below) / static_cast<double>(share.values.size()));
  }
  p.verdict = p.share.upper < negligible_    ? ScreeningVerdict::fix
              : p.share.lower >= negligible_ ? ScreeningVerdict::keep
                                             : ScreeningVerdict::undecided;
  if (p.verdict != ScreeningVerdict::undecided) return;
  // The distance to the limit shrinks with the root of the number of trajectories.
  const double limit = std::log((p.share.value < negligible_ ? p.share.upper : p.share.lower) / p.share.value);
  const double factor = std::pow(limit / std::log(negligible_ / p.share.value), 2);
  if (!(factor * c.count <= found_.trajectoriesToDecide)) found_.trajectoriesToDecide = factor * c.count;
}

void Statistics::rankSamples() {
  const std::size_t p = columns_.size();
  std::size_t known = 0;
  for (const ParameterEffects& one : found_.parameters) {
    if (one.rank > 0) ++known;
    if (one.share.value >= negligible_) ++found_.topCount;
  }
  if (resamples_.empty() || known == 0 || !reference_) return;
  std::vector<std::size_t> holding(p);
  std::vector<std::vector<std::uint32_t>> ranks(p);  // the lowest and the highest that a parameter may have
  std::vector<std::vector<std::uint32_t>> highest(p);
  std::size_t sameTop = 0;
  std::vector<std::size_t> order(p);
  for (const std::vector<float>& muStars : muStars_) {
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::ranges::stable_sort(order, [&](std::size_t a, std::size_t b) { return muStars[a] > muStars[b]; });
    bool isSameTop = true;
    forEachTie<float>(order, muStars, [&](std::size_t first, std::size_t end) {
      for (std::size_t k = first; k < end; ++k) {
        ranks[order[k]].push_back(static_cast<std::uint32_t>(first + 1));
        highest[order[k]].push_back(static_cast<std::uint32_t>(end));
        if (end - first == 1 && found_.parameters[order[k]].rank == end) ++holding[order[k]];
      }
    });
    for (std::size_t k = 0; k < p; ++k) {
      const std::size_t rank = found_.parameters[order[k]].rank;
      if (k < found_.topCount && (rank == 0 || rank > found_.topCount)) isSameTop = false;
    }
    if (isSameTop) ++sameTop;
  }
  const auto count = static_cast<double>(resamples_.size());
  found_.topStability = static_cast<double>(sameTop) / count;
  for (std::size_t j = 0; j < p; ++j) {
    ParameterEffects& one = found_.parameters[j];
    if (one.count < kFewestEffects) continue;
    if (!isTied_[j]) one.rankStability = static_cast<double>(holding[j]) / count;
    const auto at = [&](std::vector<std::uint32_t>& of, double share) {
      std::ranges::sort(of);
      return of[static_cast<std::size_t>(share * (count - 1.0))];
    };
    one.rankLower = at(ranks[j], kTail);
    one.rankUpper = at(highest[j], 1.0 - kTail);
  }
}

void Statistics::judgeTogether() {
  std::vector<bool> agree(resamples_.size(), true);
  bool isAny = false;
  double least = 1.0;
  for (std::size_t j = 0; j < columns_.size(); ++j) {
    const ParameterEffects& one = found_.parameters[j];
    if (one.verdict != ScreeningVerdict::fix || std::isnan(one.certainty)) continue;
    isAny = true;
    least = std::min(least, one.certainty);
    for (std::size_t b = 0; b < agree.size(); ++b) agree[b] = agree[b] && shares_[j][b];
  }
  if (!isAny) return;
  const auto all = static_cast<double>(std::ranges::count(agree, true)) / static_cast<double>(agree.size());
  found_.fixedTogether = std::min(all, least);
}

}  // namespace

Resamples drawResamples(std::size_t trajectories, std::size_t samples, std::int32_t seed) {
  UniformGenerator random(seed);
  Resamples resamples(samples, std::vector<std::uint16_t>(trajectories));
  for (std::vector<std::uint16_t>& sample : resamples) {
    for (std::size_t i = 0; i < trajectories; ++i) {
      const auto pick = static_cast<std::size_t>(random.next() * static_cast<double>(trajectories));
      if (sample[pick] < std::numeric_limits<std::uint16_t>::max()) ++sample[pick];
    }
  }
  return resamples;
}

OutputEffects effectStatistics(const EffectRows& effects, const Resamples& resamples, double negligibleShare) {
  return Statistics(effects, resamples, negligibleShare).compute();
}

}  // namespace mirevo
