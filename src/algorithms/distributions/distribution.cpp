#include "algorithms/distributions/distribution.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <numbers>

#include <boost/math/distributions/beta.hpp>
#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/special_functions.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kSmallestProbability = std::numeric_limits<double>::min();
/// The largest number below 1.
constexpr double kLargestProbability = 1.0 - std::numeric_limits<double>::epsilon() / 2.0;
/// ln sqrt(2 pi)
const double kLogOfNormalArea = 0.5 * std::log(2.0 * std::numbers::pi);

double scoreAt(double probability) {
  int fault = 0;
  return normalQuantile(std::clamp(probability, kSmallestProbability, kLargestProbability), fault);
}

std::string limitsText(double minimum, double maximum) {
  return fmt::format("from {} to {}", formatReal(minimum), formatReal(maximum));
}

class Normal final : public Distribution {
 public:
  Normal(double mean, double deviation) : mean_(mean), deviation_(deviation) {}
  std::string_view name() const override { return "normal"; }
  std::string text() const override {
    return fmt::format("mean {}, standard deviation {}", formatReal(mean_), formatReal(deviation_));
  }
  double cumulative(double x) const override {
    if (deviation_ == 0.0) return x < mean_ ? 0.0 : 1.0;
    return normalProbability((x - mean_) / deviation_);
  }
  double upperTail(double x) const override {
    if (deviation_ == 0.0) return x < mean_ ? 1.0 : 0.0;
    return normalProbability((mean_ - x) / deviation_);
  }
  double quantile(double p) const override {
    int fault = 0;
    return atScore(normalQuantile(p, fault));
  }
  double logDensity(double x) const override {
    if (deviation_ == 0.0) return x == mean_ ? 0.0 : -kInfinity;
    const double z = (x - mean_) / deviation_;
    return -0.5 * z * z - std::log(deviation_) - kLogOfNormalArea;
  }
  bool isContinuous() const override { return deviation_ > 0.0; }
  double atScore(double z) const override { return deviation_ * z + mean_; }
  double scoreOf(double x) const override {
    constexpr double kMost = 38.0;
    return std::clamp((x - mean_) / deviation_, -kMost, kMost);
  }

 private:
  double mean_;
  double deviation_;
};

/// Where most of the interval is above the mean, both are reflected: lower tails alone are exact.
class TruncatedNormal final : public Distribution {
 public:
  TruncatedNormal(double mean, double deviation, double minimum, double maximum)
      : mean_(mean),
        deviation_(deviation),
        minimum_(minimum),
        maximum_(maximum),
        isReflected_(minimum + maximum > 2.0 * mean) {
    below_ = normalProbability(isReflected_ ? score(maximum) : score(minimum));
    share_ = normalProbability(isReflected_ ? score(minimum) : score(maximum)) - below_;
  }
  /// The probability of the interval in the normal distribution.
  double share() const { return share_; }

  std::string_view name() const override { return "truncated normal"; }
  std::string text() const override {
    return fmt::format("mean {}, standard deviation {} before truncation, {}", formatReal(mean_),
                       formatReal(deviation_), limitsText(minimum_, maximum_));
  }
  double cumulative(double x) const override { return isReflected_ ? shareFromFar(x) : shareFromNear(x); }
  double upperTail(double x) const override { return isReflected_ ? shareFromNear(x) : shareFromFar(x); }
  double quantile(double p) const override {
    const double share = isReflected_ ? 1.0 - p : p;
    const double z = scoreAt(below_ + share * share_);
    return std::clamp(mean_ + deviation_ * (isReflected_ ? -z : z), minimum_, maximum_);
  }
  double logDensity(double x) const override {
    if (x < minimum_ || x > maximum_) return -kInfinity;
    const double z = (x - mean_) / deviation_;
    return -0.5 * z * z - std::log(deviation_ * share_) - kLogOfNormalArea;
  }

 private:
  double score(double x) const {
    const double z = (x - mean_) / deviation_;
    return isReflected_ ? -z : z;
  }
  /// The probability of values from the lower limit, after the reflection, to x.
  double shareFromNear(double x) const {
    const double within = std::clamp(x, minimum_, maximum_);
    return std::clamp((normalProbability(score(within)) - below_) / share_, 0.0, 1.0);
  }
  double shareFromFar(double x) const { return 1.0 - shareFromNear(x); }

  double mean_;
  double deviation_;
  double minimum_;
  double maximum_;
  bool isReflected_;
  double below_ = 0.0;
  double share_ = 0.0;
};

class Uniform final : public Distribution {
 public:
  Uniform(double minimum, double maximum) : minimum_(minimum), maximum_(maximum) {}
  std::string_view name() const override { return "uniform"; }
  std::string text() const override { return limitsText(minimum_, maximum_); }
  double cumulative(double x) const override { return std::clamp((x - minimum_) / (maximum_ - minimum_), 0.0, 1.0); }
  double upperTail(double x) const override { return std::clamp((maximum_ - x) / (maximum_ - minimum_), 0.0, 1.0); }
  double quantile(double p) const override { return minimum_ + p * (maximum_ - minimum_); }
  double logDensity(double x) const override {
    return x < minimum_ || x > maximum_ ? -kInfinity : -std::log(maximum_ - minimum_);
  }

 private:
  double minimum_;
  double maximum_;
};

class Triangular final : public Distribution {
 public:
  Triangular(double minimum, double mode, double maximum) : minimum_(minimum), mode_(mode), maximum_(maximum) {}
  std::string_view name() const override { return "triangular"; }
  std::string text() const override {
    return fmt::format("{}, mode {}", limitsText(minimum_, maximum_), formatReal(mode_));
  }
  double cumulative(double x) const override { return x <= mode_ ? rising(x) : 1.0 - falling(x); }
  double upperTail(double x) const override { return x <= mode_ ? 1.0 - rising(x) : falling(x); }
  double quantile(double p) const override {
    const double width = maximum_ - minimum_;
    if (p * width <= mode_ - minimum_) return minimum_ + std::sqrt(p * width * (mode_ - minimum_));
    return maximum_ - std::sqrt((1.0 - p) * width * (maximum_ - mode_));
  }
  double logDensity(double x) const override {
    if (x < minimum_ || x > maximum_) return -kInfinity;
    const double width = maximum_ - minimum_;
    if (x == mode_) return std::log(2.0 / width);
    return std::log(x < mode_ ? 2.0 * (x - minimum_) / (width * (mode_ - minimum_))
                              : 2.0 * (maximum_ - x) / (width * (maximum_ - mode_)));
  }

 private:
  double rising(double x) const {
    const double step = std::max(x - minimum_, 0.0);
    return step == 0.0 ? 0.0 : step * step / ((maximum_ - minimum_) * (mode_ - minimum_));
  }
  double falling(double x) const {
    const double step = std::max(maximum_ - x, 0.0);
    return step == 0.0 ? 0.0 : step * step / ((maximum_ - minimum_) * (maximum_ - mode_));
  }

  double minimum_;
  double mode_;
  double maximum_;
};

class Beta final : public Distribution {
 public:
  Beta(double alpha, double beta, double minimum, double maximum)
      : unit_(alpha, beta), minimum_(minimum), width_(maximum - minimum) {
    int fault = 0;
    logNorm_ = logGamma(alpha, fault) + logGamma(beta, fault) - logGamma(alpha + beta, fault) + std::log(width_);
    lowest_ = std::max(kSmallestProbability, 0.5 * (std::nextafter(minimum, kInfinity) - minimum) / width_);
    highest_ = std::min(kLargestProbability, 1.0 - 0.5 * (maximum - std::nextafter(maximum, -kInfinity)) / width_);
  }
  std::string_view name() const override { return "beta"; }
  std::string text() const override {
    return fmt::format("alpha {}, beta {}, {}", formatReal(unit_.alpha()), formatReal(unit_.beta()),
                       limitsText(minimum_, minimum_ + width_));
  }
  double cumulative(double x) const override { return boost::math::cdf(unit_, share(x)); }
  double upperTail(double x) const override { return boost::math::cdf(boost::math::complement(unit_, share(x))); }
  double quantile(double p) const override { return minimum_ + width_ * boost::math::quantile(unit_, p); }
  double logDensity(double x) const override {
    if (x < minimum_ || x > minimum_ + width_) return -kInfinity;
    // A limit, where the density may be infinite, stands for all values that are rounded to it.
    const double t = std::clamp((x - minimum_) / width_, lowest_, highest_);
    const auto power = [](double shape, double logarithm) { return shape == 1.0 ? 0.0 : (shape - 1.0) * logarithm; };
    return power(unit_.alpha(), std::log(t)) + power(unit_.beta(), std::log1p(-t)) - logNorm_;
  }

 private:
  /// The last iterate of a search that does not converge is as near as doubles come.
  using Policy =
      boost::math::policies::policy<boost::math::policies::evaluation_error<boost::math::policies::ignore_error>>;

  double share(double x) const { return std::clamp((x - minimum_) / width_, 0.0, 1.0); }

  boost::math::beta_distribution<double, Policy> unit_;
  double minimum_;
  double width_;
  double logNorm_ = 0.0;
  double lowest_ = 0.0;   ///< share of the range that is rounded to its lower limit
  double highest_ = 1.0;  ///< from here on values are rounded to the upper limit
};

class Discrete final : public Distribution {
 public:
  Discrete(std::span<const double> values, std::span<const double> weights) {
    std::vector<std::size_t> order(values.size());
    for (std::size_t i = 0; i < order.size(); ++i) order[i] = i;
    std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) { return values[a] < values[b]; });
    double sum = 0.0;
    for (const double weight : weights) sum += weight;
    double reached = 0.0;
    for (const std::size_t i : order) {
      if (weights[i] == 0.0) continue;
      reached += weights[i] / sum;
      if (values_.empty() || values_.back() != values[i]) {
        values_.push_back(values[i]);
        cumulative_.push_back(0.0);
        probabilities_.push_back(0.0);
      }
      cumulative_.back() = reached;
      probabilities_.back() += weights[i] / sum;
    }
    cumulative_.back() = 1.0;
  }
  std::string_view name() const override { return "discrete"; }
  std::string text() const override {
    return fmt::format("{}, {}", countText(values_.size(), "value"), limitsText(values_.front(), values_.back()));
  }
  double cumulative(double x) const override {
    const auto above = std::upper_bound(values_.begin(), values_.end(), x) - values_.begin();
    return above == 0 ? 0.0 : cumulative_[above - 1];
  }
  double quantile(double p) const override {
    return values_[std::min<std::size_t>(
        std::lower_bound(cumulative_.begin(), cumulative_.end(), p) - cumulative_.begin(), values_.size() - 1)];
  }
  double logDensity(double x) const override {
    const auto found = std::lower_bound(values_.begin(), values_.end(), x);
    if (found == values_.end() || *found != x) return -kInfinity;
    return std::log(probabilities_[found - values_.begin()]);
  }
  bool isContinuous() const override { return false; }
  std::span<const double> singleValues() const override { return values_; }

 private:
  std::vector<double> values_;  ///< ascending
  std::vector<double> cumulative_;
  std::vector<double> probabilities_;
};

/// Of a sample: linear between the edges, which have equal steps of the probability.
class Sampled final : public Distribution {
 public:
  Sampled(std::vector<double> edges, std::size_t count) : edges_(std::move(edges)), count_(count) {}
  std::string_view name() const override { return "values"; }
  std::string text() const override {
    return fmt::format("{}, {}", countText(count_, "value"), limitsText(edges_.front(), edges_.back()));
  }
  double cumulative(double x) const override {
    if (x <= edges_.front()) return 0.0;
    if (x >= edges_.back()) return 1.0;
    const std::size_t k = stepOf(x);
    return (static_cast<double>(k) + (x - edges_[k]) / (edges_[k + 1] - edges_[k])) / steps();
  }
  double quantile(double p) const override {
    const double place = p * steps();
    const std::size_t k = std::min(static_cast<std::size_t>(place), edges_.size() - 2);
    return edges_[k] + (place - static_cast<double>(k)) * (edges_[k + 1] - edges_[k]);
  }
  double logDensity(double x) const override {
    if (x < edges_.front() || x > edges_.back()) return -kInfinity;
    const std::size_t k = stepOf(x);
    return -std::log(steps() * (edges_[k + 1] - edges_[k]));
  }

 private:
  double steps() const { return static_cast<double>(edges_.size() - 1); }
  std::size_t stepOf(double x) const {
    const auto above = static_cast<std::size_t>(std::upper_bound(edges_.begin(), edges_.end(), x) - edges_.begin());
    return std::clamp<std::size_t>(above, 1, edges_.size() - 1) - 1;
  }

  std::vector<double> edges_;  ///< ascending, no two equal
  std::size_t count_;
};

/// The exponential of a quantity whose distribution is known.
class Exponential final : public Distribution {
 public:
  Exponential(std::string_view name, std::string text, DistributionPointer logarithm)
      : name_(name), text_(std::move(text)), logarithm_(std::move(logarithm)) {}
  std::string_view name() const override { return name_; }
  std::string text() const override { return text_; }
  double cumulative(double x) const override { return x > 0.0 ? logarithm_->cumulative(std::log(x)) : 0.0; }
  double upperTail(double x) const override { return x > 0.0 ? logarithm_->upperTail(std::log(x)) : 1.0; }
  double quantile(double p) const override { return std::exp(logarithm_->quantile(p)); }
  double logDensity(double x) const override {
    return x > 0.0 ? logarithm_->logDensity(std::log(x)) - std::log(x) : -kInfinity;
  }
  double atScore(double z) const override { return std::exp(logarithm_->atScore(z)); }
  double scoreOf(double x) const override {
    return x > 0.0 ? logarithm_->scoreOf(std::log(x)) : Distribution::scoreOf(x);
  }

 private:
  std::string_view name_;
  std::string text_;
  DistributionPointer logarithm_;
};

class Logarithm final : public Distribution {
 public:
  explicit Logarithm(DistributionPointer quantity) : quantity_(std::move(quantity)) {}
  std::string_view name() const override { return quantity_->name(); }
  std::string text() const override { return quantity_->text(); }
  bool isGivenOnModelScale() const override { return true; }
  double cumulative(double y) const override { return quantity_->cumulative(std::exp(y)); }
  double upperTail(double y) const override { return quantity_->upperTail(std::exp(y)); }
  double quantile(double p) const override { return logarithm(quantity_->quantile(p)); }
  double logDensity(double y) const override {
    // Single values keep their probability.
    if (!quantity_->isContinuous()) return probabilityAt(y);
    return quantity_->logDensity(std::exp(y)) + y;
  }
  bool isContinuous() const override { return quantity_->isContinuous(); }
  std::span<const double> singleValues() const override { return quantity_->singleValues(); }
  double atScore(double z) const override { return logarithm(quantity_->atScore(z)); }
  double scoreOf(double y) const override { return quantity_->scoreOf(std::exp(y)); }

 private:
  /// Of a value that is rounded to 0, too.
  static double logarithm(double x) { return std::log(std::max(x, kSmallestProbability)); }
  /// exp(ln x) is not always x.
  double probabilityAt(double y) const {
    const double x = std::exp(y);
    const double rounding = 4.0 * std::numeric_limits<double>::epsilon() * x * std::max(1.0, std::abs(y));
    const double p = quantity_->cumulative(x + rounding) - quantity_->cumulative(x - rounding);
    return p > 0.0 ? std::log(p) : -kInfinity;
  }

  DistributionPointer quantity_;
};

class OnGrid final : public Distribution {
 public:
  OnGrid(double lowest, DistributionPointer quantity) : lowest_(lowest), quantity_(std::move(quantity)) {}
  std::string_view name() const override { return quantity_->name(); }
  std::string text() const override { return quantity_->text(); }
  bool isGivenOnModelScale() const override { return true; }
  double cumulative(double y) const override {
    const double value = valueOf(y);
    const double share = std::clamp(y - edgeOf(value), 0.0, 1.0);
    return quantity_->cumulative(value - 0.5) + share * probabilityOf(value);
  }
  double upperTail(double y) const override {
    const double value = valueOf(y);
    const double share = std::clamp(y - edgeOf(value), 0.0, 1.0);
    return quantity_->upperTail(value + 0.5) + (1.0 - share) * probabilityOf(value);
  }
  double quantile(double p) const override {
    const double distance = quantity_->quantile(p) - lowest_;
    // A single value between two integers counts to the lower one, as in probabilityOf().
    double value = lowest_ + (quantity_->isContinuous() ? std::floor(distance + 0.5) : std::ceil(distance - 0.5));
    double probability = probabilityOf(value);
    const double below = quantity_->cumulative(value - 0.5);
    const double share = probability > 0.0 ? (p - below) / probability : 0.5;
    // Nearer to the next value the model would get that one, see TransformParameterValue().
    constexpr double kInside = 2.0e-8;
    return edgeOf(value) + std::clamp(share, kInside, 1.0 - kInside);
  }
  double logDensity(double y) const override {
    const double value = valueOf(y);
    const double probability = y < edgeOf(value) ? 0.0 : probabilityOf(value);
    return probability > 0.0 ? std::log(probability) : -kInfinity;
  }

 private:
  /// The value of the interval in which y is; between the two kinds of intervals, where there is none, the lowest.
  double valueOf(double y) const {
    const double step = std::floor(y - lowest_);
    return lowest_ + (step < 0.0 ? std::min(step + 1.0, 0.0) : step);
  }
  double edgeOf(double value) const { return value < lowest_ ? value - 1.0 : value; }
  double probabilityOf(double value) const {
    const double below = quantity_->cumulative(value - 0.5);
    const double difference = below > 0.5 ? quantity_->upperTail(value - 0.5) - quantity_->upperTail(value + 0.5)
                                          : quantity_->cumulative(value + 0.5) - below;
    return std::max(difference, 0.0);
  }

  double lowest_;
  DistributionPointer quantity_;
};

}  // namespace

double normalProbability(double z) {
  return 0.5 * std::erfc(-z / std::numbers::sqrt2);
}

double Distribution::atScore(double z) const {
  return quantile(std::clamp(normalProbability(z), kSmallestProbability, kLargestProbability));
}

double Distribution::scoreOf(double x) const {
  const double p = cumulative(x);
  return p <= 0.5 ? scoreAt(p) : -scoreAt(upperTail(x));
}

DistributionPointer normalDistribution(double mean, double standardDeviation) {
  return std::make_shared<Normal>(mean, standardDeviation);
}

DistributionPointer truncatedNormal(double mean, double standardDeviation, double minimum, double maximum) {
  auto made = std::make_shared<TruncatedNormal>(mean, standardDeviation, minimum, maximum);
  if (!(made->share() > kSmallestProbability)) return nullptr;
  return made;
}

DistributionPointer lognormal(double logMean, double logStandardDeviation) {
  std::string text = fmt::format("mean {}, standard deviation {} of the natural logarithm", formatReal(logMean),
                                 formatReal(logStandardDeviation));
  return std::make_shared<Exponential>("lognormal", std::move(text), normalDistribution(logMean, logStandardDeviation));
}

DistributionPointer uniformDistribution(double minimum, double maximum) {
  return std::make_shared<Uniform>(minimum, maximum);
}

DistributionPointer logUniform(double minimum, double maximum) {
  return std::make_shared<Exponential>("log-uniform", limitsText(minimum, maximum),
                                       uniformDistribution(std::log(minimum), std::log(maximum)));
}

DistributionPointer triangular(double minimum, double mode, double maximum) {
  return std::make_shared<Triangular>(minimum, mode, maximum);
}

DistributionPointer betaDistribution(double alpha, double beta, double minimum, double maximum) {
  return std::make_shared<Beta>(alpha, beta, minimum, maximum);
}

DistributionPointer discreteDistribution(std::span<const double> values, std::span<const double> weights) {
  assert(!values.empty() && values.size() == weights.size());
  return std::make_shared<Discrete>(values, weights);
}

DistributionPointer sampledDistribution(std::vector<double> values) {
  assert(values.size() >= 2);
  std::sort(values.begin(), values.end());
  const double wanted = std::ceil(2.0 * std::pow(static_cast<double>(values.size()), 0.4));
  const auto steps = std::min(static_cast<std::size_t>(wanted), values.size() - 1);
  std::vector<double> edges(steps + 1);
  for (std::size_t k = 0; k <= steps; ++k) {
    edges[k] = sortedQuantile(values, static_cast<double>(k) / static_cast<double>(steps));
    if (k > 0 && !(edges[k] > edges[k - 1])) return nullptr;
  }
  return std::make_shared<Sampled>(std::move(edges), values.size());
}

DistributionPointer ofLogarithm(DistributionPointer distribution) {
  return std::make_shared<Logarithm>(std::move(distribution));
}

DistributionPointer onGridOf(double lowest, DistributionPointer distribution) {
  return std::make_shared<OnGrid>(lowest, std::move(distribution));
}

}  // namespace mirevo
