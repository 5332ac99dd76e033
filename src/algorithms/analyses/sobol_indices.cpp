#include "algorithms/analyses/sobol_indices.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>

#include <boost/math/distributions/students_t.hpp>

#include "algorithms/numbers/sample_summary.h"

namespace mirevo {
namespace {

/// The sums of which the indices are made, as one row of numbers, so that those of several replicates can be added: the
/// values of A and B, then a sum and its number of terms for each index.
class SobolSums {
 public:
  SobolSums(std::size_t factors, std::size_t pairs) : factors_(factors), numbers_(3 + 2 * (2 * factors + pairs), 0.0) {}

  void addValue(double value) {
    numbers_[0] += 1.0;
    numbers_[1] += value;
    numbers_[2] += value * value;
  }
  /// A term of the first-order, total or second-order index; one that is NaN has no runs.
  void addFirst(std::size_t factor, double term) { add(3 + 2 * factor, term); }
  void addTotal(std::size_t factor, double term) { add(3 + 2 * (factors_ + factor), term); }
  void addPair(std::size_t pair, double term) { add(3 + 2 * (2 * factors_ + pair), term); }

  void addTimes(double count, const SobolSums& other) { addRange(count, other, 0, numbers_.size()); }
  /// Of the pairs only some.
  void addTimes(double count, const SobolSums& other, std::size_t firstPair, std::size_t endPair) {
    const std::size_t pairs = 3 + 4 * factors_;
    addRange(count, other, 0, pairs);
    addRange(count, other, pairs + 2 * firstPair, pairs + 2 * endPair);
  }
  void clear() { std::ranges::fill(numbers_, 0.0); }

  double mean() const { return numbers_[1] / numbers_[0]; }
  double variance() const { return std::max(0.0, numbers_[2] / numbers_[0] - mean() * mean()); }
  double first(std::size_t factor) const { return meanAt(3 + 2 * factor); }
  double total(std::size_t factor) const { return meanAt(3 + 2 * (factors_ + factor)); }
  double pair(std::size_t pair) const { return meanAt(3 + 2 * (2 * factors_ + pair)); }

 private:
  void add(std::size_t at, double term) {
    if (std::isnan(term)) return;
    numbers_[at] += term;
    numbers_[at + 1] += 1.0;
  }
  void addRange(double count, const SobolSums& other, std::size_t begin, std::size_t end) {
    for (std::size_t i = begin; i < end; ++i) numbers_[i] += count * other.numbers_[i];
  }
  double meanAt(std::size_t at) const { return numbers_[at] / numbers_[at + 1]; }

  std::size_t factors_;
  std::vector<double> numbers_;
};

/// The mean of those of the two that are numbers.
double meanOf(double a, double b) {
  if (std::isnan(a)) return b;
  return std::isnan(b) ? a : 0.5 * (a + b);
}

double square(double value) {
  return value * value;
}

/// One block of the design: the values of its sets, NaN where a run failed.
class BlockTerms {
 public:
  BlockTerms(const SobolDesign& design, std::span<const double> values, std::size_t row, double centre)
      : design_(design),
        values_(values),
        row_(row),
        centre_(centre),
        a_(at(design.ofA(row))),
        b_(at(design.ofB(row))) {}

  double a() const { return a_; }
  double b() const { return b_; }
  double first(std::size_t j) const {
    const double ofA = b_ * (aWithB(j) - a_);
    return design_.hasSecondOrder ? meanOf(ofA, a_ * (bWithA(j) - b_)) : ofA;
  }
  double total(std::size_t j) const {
    const double ofA = 0.5 * square(a_ - aWithB(j));
    return design_.hasSecondOrder ? meanOf(ofA, 0.5 * square(b_ - bWithA(j))) : ofA;
  }
  /// Of the two factors together: first-order indices and interaction.
  double pair(std::size_t j, std::size_t l) const {
    return meanOf(bWithA(j) * aWithB(l), bWithA(l) * aWithB(j)) - a_ * b_;
  }

 private:
  double at(std::size_t set) const { return values_[set] - centre_; }
  double aWithB(std::size_t j) const { return at(design_.ofAWithB(row_, j)); }
  double bWithA(std::size_t j) const { return at(design_.ofBWithA(row_, j)); }

  const SobolDesign& design_;
  std::span<const double> values_;
  std::size_t row_;
  double centre_;
  double a_;
  double b_;
};

/// Least, mean and largest of the values of A and B.
struct Extent {
  double least = std::numeric_limits<double>::infinity();
  double largest = -std::numeric_limits<double>::infinity();
  double sum = 0.0;
  std::size_t count = 0;

  void add(double value) {
    if (std::isnan(value)) return;
    least = std::min(least, value);
    largest = std::max(largest, value);
    sum += value;
    ++count;
  }
  /// Apart from what rounding leaves of equal values.
  bool isConstant() const { return largest - least <= 1e-12 * std::max(std::abs(least), std::abs(largest)); }
};

constexpr std::size_t kMostDominating = 3;
constexpr double kNearlyAll = 0.9;
constexpr std::size_t kRowsPerDominating = 10;  // of fewer rows three may well be most of the variance

/// Notes the blocks that make nearly all of the squared deviations from the mean.
void findDominating(const SobolDesign& design, std::span<const double> values, SobolIndices& found) {
  double farthest = 0.0;
  for (std::size_t set = 0; set < design.setCount(); ++set) {
    const double deviation = std::abs(values[set] - found.mean);
    if (!(deviation > farthest)) continue;
    farthest = deviation;
    found.farthestSet = set;
  }
  const std::size_t most = std::min(kMostDominating, design.rows / kRowsPerDominating);
  std::vector<double> squares(design.rows, 0.0);  // in those of the farthest value, which are finite
  for (std::size_t set = 0; set < design.setCount(); ++set) {
    if (!std::isnan(values[set])) squares[set / design.setsPerRow()] += square((values[set] - found.mean) / farthest);
  }
  const double all = std::accumulate(squares.begin(), squares.end(), 0.0);
  std::ranges::partial_sort(squares, squares.begin() + static_cast<std::ptrdiff_t>(most), std::ranges::greater{});
  double part = 0.0;
  for (std::size_t i = 0; i < most; ++i) {
    part += squares[i];
    if (!(part > kNearlyAll * all)) continue;
    found.dominatingBlocks = i + 1;
    return;
  }
}

/// The indices that follow from sums, in the order: first, total and interactions of the factors, the pairs, the sums
/// of first and total.
void indicesOf(const SobolSums& sums, const SobolDesign& design,
               std::span<const std::pair<std::size_t, std::size_t>> pairs, std::vector<double>& indices) {
  const std::size_t k = design.factors;
  const double variance = sums.variance();
  indices.assign(3 * k + pairs.size() + 2, 0.0);
  double sumOfFirst = 0.0;
  double sumOfTotal = 0.0;
  for (std::size_t j = 0; j < k; ++j) {
    indices[j] = sums.first(j) / variance;
    indices[k + j] = sums.total(j) / variance;
    indices[2 * k + j] = indices[k + j] - indices[j];
    sumOfFirst += indices[j];
    sumOfTotal += indices[k + j];
  }
  for (std::size_t m = 0; m < pairs.size(); ++m) {
    indices[3 * k + m] = sums.pair(m) / variance - indices[pairs[m].first] - indices[pairs[m].second];
  }
  indices[3 * k + pairs.size()] = sumOfFirst;
  indices[3 * k + pairs.size() + 1] = sumOfTotal;
}

/// The probability of the lower quantile of a bootstrap over n independent values for the limit of a 95 % interval:
/// that of a normal deviate which lies as far out as Student's t, and farther as a bootstrap sample varies less than
/// the values do.
double expandedProbability(std::size_t n) {
  const auto count = static_cast<double>(n);
  const double t = boost::math::quantile(boost::math::students_t(count - 1.0), 0.975);
  return 0.5 * std::erfc(t * std::sqrt(count / (count - 1.0)) / std::sqrt(2.0));
}

std::vector<SobolSums> sumsOfReplicates(const SobolDesign& design, std::span<const double> values, double centre,
                                        std::span<const std::pair<std::size_t, std::size_t>> pairs,
                                        std::vector<std::size_t>& blocks) {
  const std::size_t k = design.factors;
  std::vector<SobolSums> sums(kSobolReplicates, SobolSums(k, pairs.size()));
  blocks.assign(3 * k + pairs.size() + 2, 0);
  for (std::size_t row = 0; row < design.rows; ++row) {
    SobolSums& replicate = sums[row % kSobolReplicates];
    const BlockTerms block(design, values, row, centre);
    if (!std::isnan(block.a())) replicate.addValue(block.a());
    if (!std::isnan(block.b())) replicate.addValue(block.b());
    bool isWhole = true;
    for (std::size_t j = 0; j < k; ++j) {
      const double first = block.first(j);
      const double total = block.total(j);
      replicate.addFirst(j, first);
      replicate.addTotal(j, total);
      if (!std::isnan(first)) ++blocks[j];
      if (!std::isnan(total)) ++blocks[k + j];
      if (!std::isnan(first) && !std::isnan(total)) ++blocks[2 * k + j];
      isWhole = isWhole && !std::isnan(first) && !std::isnan(total);
    }
    for (std::size_t m = 0; m < pairs.size(); ++m) {
      const double pair = block.pair(pairs[m].first, pairs[m].second);
      replicate.addPair(m, pair);
      if (!std::isnan(pair)) ++blocks[3 * k + m];
    }
    if (isWhole) {
      ++blocks[3 * k + pairs.size()];
      ++blocks[3 * k + pairs.size() + 1];
    }
  }
  return sums;
}

/// Fills in the limits of all indices, of as many at a time as `mostDrawn` of bootstrap samples are.
void takeLimits(const SobolDesign& design, std::span<const SobolSums> replicates,
                std::span<const std::pair<std::size_t, std::size_t>> pairs, const ReplicateBootstrap& bootstrap,
                std::size_t samples, std::size_t mostDrawn, std::vector<SobolIndex>& indices) {
  const std::size_t k = design.factors;
  SobolSums sums = replicates.front();
  std::vector<double> ofSample;
  // Of how many replicates each index has terms: after failed runs not of all.
  std::vector<std::size_t> used(indices.size(), 0);
  for (const SobolSums& replicate : replicates) {
    indicesOf(replicate, design, pairs, ofSample);
    for (std::size_t i = 0; i < used.size(); ++i) used[i] += std::isnan(ofSample[i]) ? 0 : 1;
  }
  const std::size_t atOnce = std::max<std::size_t>(1, mostDrawn / std::max<std::size_t>(samples, 1));
  for (std::size_t begin = 0; begin < indices.size(); begin += atOnce) {
    const std::size_t end = std::min(begin + atOnce, indices.size());
    const auto pairAt = [&](std::size_t i) { return std::clamp(i, 3 * k, 3 * k + pairs.size()) - 3 * k; };
    std::vector<std::vector<double>> drawn(end - begin);
    for (std::size_t sample = 0; sample < samples; ++sample) {
      sums.clear();
      for (std::size_t r = 0; r < replicates.size(); ++r) {
        const double count = bootstrap.counts(sample)[r];
        if (count > 0.0) sums.addTimes(count, replicates[r], pairAt(begin), pairAt(end));
      }
      indicesOf(sums, design, pairs, ofSample);
      for (std::size_t i = begin; i < end; ++i) {
        if (std::isfinite(ofSample[i])) drawn[i - begin].push_back(ofSample[i]);
      }
    }
    for (std::size_t i = begin; i < end; ++i) {
      std::vector<double>& values = drawn[i - begin];
      if (std::isnan(indices[i].value) || used[i] < 2 || values.empty()) continue;
      std::ranges::sort(values);
      const double probability = expandedProbability(used[i]);
      indices[i].lower = std::min(indices[i].value, sortedQuantile(values, probability));
      indices[i].upper = std::max(indices[i].value, sortedQuantile(values, 1.0 - probability));
    }
  }
}

}  // namespace

ReplicateBootstrap::ReplicateBootstrap(std::size_t samples, UniformGenerator& random) : counts_(samples) {
  for (auto& counts : counts_) {
    counts.fill(0);
    for (std::size_t draw = 0; draw < kSobolReplicates; ++draw) {
      ++counts[std::min(static_cast<std::size_t>(random.next() * kSobolReplicates), kSobolReplicates - 1)];
    }
  }
}

SobolIndices sobolIndices(const SobolDesign& design, std::span<const double> values,
                          const ReplicateBootstrap& bootstrap, std::size_t bootstrapSamples, bool withPairs,
                          std::size_t mostDrawn) {
  const std::size_t k = design.factors;
  Extent extent;
  for (std::size_t row = 0; row < design.rows; ++row) {
    extent.add(values[design.ofA(row)]);
    extent.add(values[design.ofB(row)]);
  }
  const auto pairs = withPairs ? design.pairs() : std::vector<std::pair<std::size_t, std::size_t>>{};
  std::vector<SobolIndex> all(3 * k + pairs.size() + 2);
  SobolIndices found;
  found.valueCount = extent.count;
  if (extent.count > 0) found.mean = extent.sum / static_cast<double>(extent.count);
  found.isConstant = extent.count > 0 && extent.isConstant();
  if (extent.count > 1) {
    std::vector<std::size_t> blocks;
    const std::vector<SobolSums> replicates = sumsOfReplicates(design, values, found.mean, pairs, blocks);
    SobolSums sums(k, pairs.size());
    for (const SobolSums& replicate : replicates) sums.addTimes(1.0, replicate);
    found.variance = found.isConstant ? 0.0 : sums.variance();
    std::vector<double> estimates;
    indicesOf(sums, design, pairs, estimates);
    for (std::size_t i = 0; i < all.size(); ++i) {
      all[i].blocks = blocks[i];
      if (!found.isConstant && std::isfinite(estimates[i])) all[i].value = estimates[i];
    }
    if (!found.isConstant) findDominating(design, values, found);
    if (!found.isConstant && found.dominatingBlocks == 0) {
      takeLimits(design, replicates, pairs, bootstrap, std::min(bootstrapSamples, bootstrap.size()), mostDrawn, all);
    }
  }
  const auto part = [&all](std::size_t from, std::size_t count) {
    const auto begin = all.begin() + static_cast<std::ptrdiff_t>(from);
    return std::vector<SobolIndex>(begin, begin + static_cast<std::ptrdiff_t>(count));
  };
  found.first = part(0, k);
  found.total = part(k, k);
  found.interactions = part(2 * k, k);
  found.second = part(3 * k, pairs.size());
  found.sumOfFirst = all[all.size() - 2];
  found.sumOfTotal = all.back();
  return found;
}

}  // namespace mirevo
