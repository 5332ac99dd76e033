#include "algorithms/bayes/likelihoods.h"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace mirevo {
namespace {

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kLogRootTwoPi = 0.91893853320467274178;

double deviationOf(std::span<const double> values) {
  double mean = 0.0;
  double squares = 0.0;
  double count = 0.0;
  for (const double value : values) {
    count += 1.0;
    const double change = value - mean;
    mean += change / count;
    squares += change * (value - mean);
  }
  return count < 2.0 ? 0.0 : std::sqrt(squares / (count - 1.0));
}

double lnGamma(double x) {
  int fault = 0;
  return logGamma(x, fault);
}

/// Gamma(shape, 1) by Marsaglia and Tsang (2000, doi:10.1145/358407.358414).
double drawGamma(double shape, ChainRandom& random) {
  if (shape < 1.0) {
    // Two statements: the order of draws within one expression is the compiler's choice.
    const double larger = drawGamma(shape + 1.0, random);
    return larger * std::pow(random.uniform(), 1.0 / shape);
  }
  const double d = shape - 1.0 / 3.0;
  const double c = 1.0 / std::sqrt(9.0 * d);
  for (;;) {
    const double x = random.normal();
    const double root = 1.0 + c * x;
    if (root <= 0.0) continue;
    const double v = root * root * root;
    if (std::log(random.uniform()) < 0.5 * x * x + d - d * v + d * std::log(v)) return d * v;
  }
}

/// The middle one, of an even number the upper of the two; `values` is not empty, and is put into another order.
double middleOf(std::vector<double>& values) {
  const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
  std::nth_element(values.begin(), middle, values.end());
  return *middle;
}

}  // namespace

const std::array<ErrorTermRow, kErrorTermCount>& errorTermRows() {
  static constexpr std::array<ErrorTermRow, kErrorTermCount> kRows{{
      {"Error_Deviation", "sigma0", 1.0, 0.0, 0.0, 0.0, kInfinity, true},
      {"Error_Share", "sigma1", 0.0, 0.0, 1.0, 0.0, kInfinity, false},
      {"Error_Correlation", "phi", 0.0, 0.0, 0.99, 0.0, 0.9999, false},
      {"Box_Cox_Lambda", "lambda", 1.0, 0.0, 1.0, -2.0, 2.0, false},
      {"Student_Freedom", "nu", 1e6, 2.0, 100.0, 0.5, 1e6, true},
      {"Error_Skewness", "xi", 1.0, 0.1, 10.0, 0.01, 100.0, true},
      {"Error_Kurtosis", "beta", 0.0, -0.95, 1.0, -0.99, 1.0, false},
      {"Error_Bias", "mu_h", 0.0, 0.0, 0.0, -kInfinity, kInfinity, false},
  }};
  return kRows;
}

bool hasTerm(LikelihoodForm form, ErrorTerm term) {
  switch (form) {
    case LikelihoodForm::objective:
      return false;
    case LikelihoodForm::normal:
      return term == kDeviation;
    case LikelihoodForm::heteroscedastic:
      return term == kDeviation || term == kShare;
    case LikelihoodForm::autoregressive:
      return term == kDeviation || term == kCorrelation;
    case LikelihoodForm::boxCox:
      return term == kDeviation || term == kLambda;
    case LikelihoodForm::student:
      return term == kDeviation || term == kFreedom;
    case LikelihoodForm::generalised:
      return term == kDeviation || term == kShare || term == kCorrelation || term == kSkewness || term == kKurtosis;
  }
  return false;
}

bool readsTerm(LikelihoodForm form, ErrorTerm term) {
  if (term == kFreedom) return form == LikelihoodForm::student;
  if (term == kSkewness || term == kKurtosis) return form == LikelihoodForm::generalised;
  return form != LikelihoodForm::objective;
}

ErrorValues neutralErrors() {
  ErrorValues values{};
  for (std::size_t k = 0; k < values.size(); ++k) values[k] = errorTermRows()[k].neutral;
  return values;
}

ErrorShape::ErrorShape(LikelihoodForm form, const ErrorValues& values) : logConstant_(-kLogRootTwoPi) {
  if (form == LikelihoodForm::student) {
    kind_ = Kind::student;
    freedom_ = values[kFreedom];
    logConstant_ =
        lnGamma(0.5 * (freedom_ + 1.0)) - lnGamma(0.5 * freedom_) - 0.5 * std::log(freedom_ * std::numbers::pi);
  } else if (form == LikelihoodForm::generalised) {
    kind_ = Kind::skewExponentialPower;
    skewness_ = values[kSkewness];
    kurtosis_ = values[kKurtosis];
    const double b = 1.0 + kurtosis_;
    const double lnOne = lnGamma(0.5 * b);
    const double lnThree = lnGamma(1.5 * b);
    const double xi = skewness_;
    const double m1 = std::exp(lnGamma(b) - 0.5 * (lnThree + lnOne));
    mean_ = m1 * (xi - 1.0 / xi);
    spread_ = std::sqrt((1.0 - m1 * m1) * (xi * xi + 1.0 / (xi * xi)) + 2.0 * m1 * m1 - 1.0);
    exponent_ = 2.0 / b;
    factor_ = std::exp((lnThree - lnOne) / b);
    const double lnOmega = 0.5 * lnThree - std::log(b) - 1.5 * lnOne;
    logConstant_ = std::log(2.0 * spread_ / (xi + 1.0 / xi)) + lnOmega;
  }
}

double ErrorShape::logDensity(double a) const {
  switch (kind_) {
    case Kind::normal:
      return logConstant_ - 0.5 * a * a;
    case Kind::student:
      return logConstant_ - 0.5 * (freedom_ + 1.0) * std::log1p(a * a / freedom_);
    case Kind::skewExponentialPower:
      break;
  }
  const double centred = mean_ + spread_ * a;
  const double skewed = centred < 0.0 ? -centred * skewness_ : centred / skewness_;
  return logConstant_ - factor_ * std::pow(skewed, exponent_);
}

double ErrorShape::draw(ChainRandom& random) const {
  if (kind_ == Kind::normal) return random.normal();
  if (kind_ == Kind::student) {
    const double z = random.normal();
    return z / std::sqrt(2.0 * drawGamma(0.5 * freedom_, random) / freedom_);
  }
  const double size = std::pow(drawGamma(1.0 / exponent_, random) / factor_, 1.0 / exponent_);
  const double squared = skewness_ * skewness_;
  const bool isAbove = random.uniform() < squared / (1.0 + squared);
  const double centred = isAbove ? size * skewness_ : -size / skewness_;
  return (centred - mean_) / spread_;
}

SeriesErrors::SeriesErrors(LikelihoodForm form, double shift, std::span<const double> days,
                           std::span<const double> observed, std::span<const double> weights)
    : form_(form),
      shift_(shift),
      days_(days.begin(), days.end()),
      observed_(observed.begin(), observed.end()),
      weights_(weights.begin(), weights.end()) {
  countWhere(observed_);
  std::vector<double> ofObservations;
  if (!weights_.empty() && !counted_.empty()) {
    for (const std::size_t t : counted_) ofObservations.push_back(weights_[t]);
    usualWeight_ = middleOf(ofObservations);
    for (std::size_t t = 0; t < weights_.size(); ++t) {
      if (std::isnan(observed_[t])) weights_[t] = usualWeight_;
    }
  }
  std::vector<double> distances;
  for (std::size_t k = 1; k < counted_.size(); ++k) distances.push_back(days_[counted_[k]] - days_[counted_[k - 1]]);
  if (distances.empty()) return;
  if (const double middle = middleOf(distances); middle > 0.0) usualDistance_ = middle;
}

void SeriesErrors::countWhere(std::span<const double> simulated) {
  counted_.clear();
  for (std::size_t t = 0; t < observed_.size(); ++t) {
    if (!std::isnan(observed_[t]) && std::isfinite(simulated[t])) counted_.push_back(t);
  }
}

std::size_t SeriesErrors::countIn(std::span<const double> simulated) const {
  std::size_t count = 0;
  for (std::size_t t = 0; t < observed_.size(); ++t) {
    if (!std::isnan(observed_[t]) && std::isfinite(simulated[t])) ++count;
  }
  return count;
}

SeriesErrors::Step SeriesErrors::stepOver(double days, double correlation) const {
  if (correlation == 0.0) return {};
  const double ratio = days / usualDistance_;
  // Times of a daily series are not exactly a day apart in floating point.
  if (std::abs(ratio - 1.0) < 1e-6) return {correlation, 1.0};
  const double own = std::pow(correlation, ratio);
  return {own, std::sqrt((1.0 - own * own) / (1.0 - correlation * correlation))};
}

double SeriesErrors::transformed(double value, double lambda) const {
  if (lambda == 1.0) return value;  // the errors are those of the plain values
  const double shifted = value + shift_;
  if (!(shifted >= 0.0)) return kNaN;
  // Of 0 the limit, -1 / lambda for lambda above 0 and else -infinity: no finite error leads from there to an
  // observation above 0, and none is drawn.
  const double logarithm = std::log(shifted);
  return std::abs(lambda) < 1e-8 ? logarithm : std::expm1(lambda * logarithm) / lambda;
}

double SeriesErrors::restored(double value, double lambda) const {
  if (lambda == 1.0) return value;
  if (std::abs(lambda) < 1e-8) return std::exp(value) - shift_;
  const double base = 1.0 + lambda * value;
  if (std::isnan(base)) return kNaN;
  // Beyond the end of the transformation: its limit.
  if (!(base > 0.0)) return lambda > 0.0 ? -shift_ : kInfinity;
  return std::pow(base, 1.0 / lambda) - shift_;
}

double SeriesErrors::biased(double simulated, const ErrorValues& values) {
  return values[kBias] == 0.0 ? simulated : simulated * std::exp(values[kBias] * simulated);
}

double SeriesErrors::logLikelihood(std::span<const double> simulated, const ErrorValues& values) const {
  const ErrorShape shape(form_, values);
  const double lambda = values[kLambda];
  const double correlation = values[kCorrelation];
  double sum = 0.0;
  double before = 0.0;
  for (std::size_t k = 0; k < counted_.size(); ++k) {
    const std::size_t t = counted_[k];
    const double level = biased(simulated[t], values);
    const double error = transformed(observed_[t], lambda) - transformed(level, lambda);
    if (!std::isfinite(error)) return -kInfinity;
    Step step{0.0, 1.0 / std::sqrt(1.0 - correlation * correlation)};  // of the first
    if (k > 0) step = stepOver(days_[t] - days_[counted_[k - 1]], correlation);
    double deviation = step.widening * (values[kDeviation] + values[kShare] * std::abs(level));
    if (!weights_.empty()) deviation /= weights_[t];
    if (!(deviation > 0.0)) return -kInfinity;
    sum += shape.logDensity((error - step.correlation * before) / deviation) - std::log(deviation);
    // The density of the observation itself, not of its transformed value.
    if (lambda != 1.0) sum += (lambda - 1.0) * std::log(observed_[t] + shift_);
    before = error;
  }
  return std::isnan(sum) ? -kInfinity : sum;
}

LikelihoodLack SeriesErrors::lackIn(std::span<const double> simulated, const ErrorValues& values) const {
  if (logLikelihood(simulated, values) > -kInfinity) return LikelihoodLack::none;
  const auto isMissing = [&](std::size_t t) { return !std::isfinite(simulated[t]); };
  const auto isUntransformed = [&](std::size_t t) {
    const double level = biased(simulated[t], values);
    return std::isfinite(level) && !std::isfinite(transformed(level, values[kLambda]));
  };
  if (std::ranges::any_of(counted_, isMissing)) return LikelihoodLack::missing;
  return std::ranges::any_of(counted_, isUntransformed) ? LikelihoodLack::untransformed : LikelihoodLack::notFinite;
}

SeriesErrors::Path::Path(const SeriesErrors& errors, const ErrorValues& values)
    : errors_(&errors), values_(values), shape_(errors.form_, values) {}

double SeriesErrors::Path::next(std::size_t time, double simulated, ChainRandom& random) {
  const double innovation = shape_.draw(random);
  if (!std::isfinite(simulated)) return kNaN;
  const double level = biased(simulated, values_);
  const double correlation = values_[kCorrelation];
  Step step{0.0, 1.0 / std::sqrt(1.0 - correlation * correlation)};
  if (!std::isnan(before_)) step = errors_->stepOver(errors_->days_[time] - errors_->days_[timeBefore_], correlation);
  double deviation = step.widening * (values_[kDeviation] + values_[kShare] * std::abs(level));
  if (!errors_->weights_.empty()) deviation /= errors_->weights_[time];
  const double error = (std::isnan(before_) ? 0.0 : step.correlation * before_) + deviation * innovation;
  before_ = error;
  timeBefore_ = time;
  return errors_->restored(errors_->transformed(level, values_[kLambda]) + error, values_[kLambda]);
}

bool SeriesErrors::Path::hasErrors(double simulated) const {
  const double lambda = values_[kLambda];
  if (!std::isfinite(simulated) || lambda == 1.0) return true;
  return std::isfinite(errors_->transformed(simulated, lambda));
}

std::optional<double> SeriesErrors::untransformable() const {
  for (const std::size_t t : counted_) {
    if (!(observed_[t] + shift_ > 0.0)) return observed_[t];
  }
  return std::nullopt;
}

double SeriesErrors::deviation(double lambda) const {
  std::vector<double> values;
  for (const std::size_t t : counted_) values.push_back(transformed(observed_[t], lambda));
  return deviationOf(values);
}

}  // namespace mirevo
