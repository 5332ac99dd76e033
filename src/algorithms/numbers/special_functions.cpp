#include "algorithms/numbers/special_functions.h"

#include <array>
#include <cmath>

namespace mirevo {

namespace {

constexpr double kEuler = 0.5772156649015329;          // Euler's constant
constexpr double kPiSquaredBy12 = 0.8224670334241132;  // pi^2 / 12
constexpr double kLogRootTwoPi = 0.9189385332046728;   // ln sqrt(2 pi)
constexpr double kOneByRootTwo = 0.7071067811865476;   // 1 / sqrt(2)
constexpr double kAsymptoticFrom = 13.0;               // smallest argument of the asymptotic series
constexpr int kMaximumIterations = 100000;
constexpr double kConverged = 1.0e-12;
constexpr double kSmallestExponent = -180.0;  // e^-180 counts as 0

double reportFault(int& fault, const MessageSink& messages, std::string_view message) {
  fault = 1;
  if (messages) messages(message);
  return 0.0;
}

/// c[0] + c[1] x + ... by Horner's rule.
template <std::size_t n>
double polynomial(const std::array<double, n>& coefficients, double x) {
  double sum = coefficients[n - 1];
  for (std::size_t k = n - 1; k-- > 0;) sum = sum * x + coefficients[k];
  return sum;
}

/// The published coefficients of PPND16: numerator and denominator near the middle, further out and in the tails.
constexpr std::array kCentralNumerator{3.3871328727963666080e0, 1.3314166789178437745e2, 1.9715909503065514427e3,
                                       1.3731693765509461125e4, 4.5921953931549871457e4, 6.7265770927008700853e4,
                                       3.3430575583588128105e4, 2.5090809287301226727e3};
constexpr std::array kCentralDenominator{1.0,
                                         4.2313330701600911252e1,
                                         6.8718700749205790830e2,
                                         5.3941960214247511077e3,
                                         2.1213794301586595867e4,
                                         3.9307895800092710610e4,
                                         2.8729085735721942674e4,
                                         5.2264952788528545610e3};
constexpr std::array kMiddleNumerator{1.42343711074968357734e0,  4.63033784615654529590e0, 5.76949722146069140550e0,
                                      3.64784832476320460504e0,  1.27045825245236838258e0, 2.41780725177450611770e-1,
                                      2.27238449892691845833e-2, 7.74545014278341407640e-4};
constexpr std::array kMiddleDenominator{1.0,
                                        2.05319162663775882187e0,
                                        1.67638483018380384940e0,
                                        6.89767334985100004550e-1,
                                        1.48103976427480074590e-1,
                                        1.51986665636164571966e-2,
                                        5.47593808499534494600e-4,
                                        1.05075007164441684324e-9};
constexpr std::array kTailNumerator{6.65790464350110377720e0,  5.46378491116411436990e0,  1.78482653991729133580e0,
                                    2.96560571828504891230e-1, 2.65321895265761230930e-2, 1.24266094738807843860e-3,
                                    2.71155556874348757815e-5, 2.01033439929228813265e-7};
constexpr std::array kTailDenominator{1.0,
                                      5.99832206555887937690e-1,
                                      1.36929880922735805310e-1,
                                      1.48753612908506148525e-2,
                                      7.86869131145613259100e-4,
                                      1.84631831751005468180e-5,
                                      1.42151175831644588870e-7,
                                      2.04426310338993978564e-15};

/// For shapes above 10000: a normal deviate z with Phi(z) close to P(shape, x).
double incompleteGammaOfLargeShape(double x, double shape) {
  const double c = 1.0 / std::sqrt(shape);
  const double y = (x - shape) * c;
  double w = y * y;
  double s = w / 2.0;
  for (int k = 1; k <= 12; ++k) {
    w = -w * y * c;
    s += w / (k + 2);
    if (std::abs(w) < kConverged) break;
  }
  // Overflows only for x far above the shape. Short of that s is never negative: it equals an integral over [0, 1] of
  // u (1 + (tu)^13) / (1 + tu) y^2, with t = x / shape - 1 > -1, or of its shorter forms near t = 0.
  if (!std::isfinite(s)) return 1.0;
  const double w2 = 2.0 * s;
  const double d = x >= shape ? std::sqrt(w2) : -std::sqrt(w2);
  const double z =
      d + c * (1.0 / 3.0 + c * (-d / 36.0 + c * ((13.0 - w2) / 1620.0 + c * (42.0 * w2 + 119.0) * d / 38880.0)));
  return 0.5 + 0.5 * std::erf(z * kOneByRootTwo);
}

/// The series for x <= 1 or x < shape.
double incompleteGammaSeries(double x, double shape, double logGammaOfShape, bool& converged) {
  double a = shape;
  double term = 1.0;
  double sum = 1.0;
  converged = false;
  for (int k = 0; k < kMaximumIterations && !converged; ++k) {
    a += 1.0;
    term = term * x / a;
    sum += term;
    converged = term <= kConverged;
  }
  const double exponent = shape * std::log(x) - x - logGammaOfShape + std::log(sum / shape);
  return exponent >= kSmallestExponent ? std::exp(exponent) : 0.0;
}

/// The continued fraction for the upper integral, x > 1 and x >= shape.
double incompleteGammaFraction(double x, double shape, double logGammaOfShape, bool& converged) {
  converged = true;
  // The fraction lies below 1, so that this bound determines the result in the far tail, where its terms would
  // overflow.
  const double bound = shape * std::log(x) - x - logGammaOfShape;
  if (bound < kSmallestExponent) return 1.0;

  double a = 1.0 - shape;
  double b = a + x + 1.0;
  double n = 0.0;
  double p1 = 1.0;
  double q1 = x;
  double p2 = x + 1.0;
  double q2 = x * b;
  double g = p2 / q2;
  converged = false;
  for (int k = 0; k < kMaximumIterations; ++k) {
    a += 1.0;
    b += 2.0;
    n += 1.0;
    const double p3 = b * p2 - a * n * p1;
    const double q3 = b * q2 - a * n * q1;
    if (q3 != 0.0) {
      const double r = p3 / q3;
      const double change = std::abs(g - r);
      converged = change <= kConverged && change <= kConverged * r;
      if (converged) break;
      g = r;
    }
    p1 = p2;
    q1 = q2;
    p2 = p3;
    q2 = q3;
    constexpr double kScale = 1.0e30;
    if (std::abs(p3) >= kScale) {
      p1 /= kScale;
      q1 /= kScale;
      p2 /= kScale;
      q2 /= kScale;
    }
  }
  const double exponent = bound + std::log(g);
  return exponent >= kSmallestExponent ? 1.0 - std::exp(exponent) : 1.0;
}

}  // namespace

double normalQuantile(double p, int& fault, const MessageSink& messages) {
  fault = 0;
  const double q = p - 0.5;
  if (std::abs(q) <= 0.425) {
    const double r = 0.180625 - q * q;
    return q * polynomial(kCentralNumerator, r) / polynomial(kCentralDenominator, r);
  }
  double r = q < 0.0 ? p : 1.0 - p;
  if (!(r > 0.0)) {
    return reportFault(fault, messages,
                       " *** ERROR *** QUANTILE FUNCTION OF STANDARD NORMAL DISTRIBUTION : "
                       "ARGUMENT OF FUNCTION INVALID");
  }
  r = std::sqrt(-std::log(r));
  const double z = r <= 5.0 ? polynomial(kMiddleNumerator, r - 1.6) / polynomial(kMiddleDenominator, r - 1.6)
                            : polynomial(kTailNumerator, r - 5.0) / polynomial(kTailDenominator, r - 5.0);
  return q < 0.0 ? -z : z;
}

double logGamma(double x, int& fault, const MessageSink& messages) {
  fault = 0;
  if (!(x > 0.0) || x > 2.0e36) {
    return reportFault(fault, messages, " *** ERROR *** LOGARITHM OF GAMMA FUNCTION : ARGUMENT OUT OF RANGE");
  }
  constexpr double kNear = 1.0e-7;
  if (std::abs(x - 2.0) <= kNear) {
    const double e = x - 2.0;
    return std::log(x - 1.0) + e * (e * kPiSquaredBy12 - kEuler);
  }
  if (std::abs(x - 1.0) <= kNear) {
    const double e = x - 1.0;
    return e * (e * kPiSquaredBy12 - kEuler);
  }
  if (x <= kNear) return -kEuler * x - std::log(x);

  double product = 1.0;
  while (x < kAsymptoticFrom) {
    product *= x;
    x += 1.0;
  }
  double series = 0.0;
  if (x < 1.0e9) {
    constexpr std::array kSeries{1.0 / 12.0,   -1.0 / 360.0,      1.0 / 1260.0, -1.0 / 1680.0,
                                 1.0 / 1188.0, -691.0 / 360360.0, 1.0 / 156.0};
    series = polynomial(kSeries, 1.0 / (x * x)) / x;
  }
  return (x - 0.5) * std::log(x) - x + kLogRootTwoPi + series - std::log(product);
}

double digamma(double x, int& fault, const MessageSink& messages) {
  fault = 0;
  if (!(x > 0.0)) {
    return reportFault(fault, messages, " *** ERROR *** EULER PSI FUNCTION : ARGUMENT OUT OF RANGE");
  }
  if (x <= 1.0e-9) return -kEuler - 1.0 / x;
  double sum = 0.0;
  while (x < kAsymptoticFrom) {
    sum -= 1.0 / x;
    x += 1.0;
  }
  constexpr std::array kSeries{1.0 / 12.0,  -1.0 / 120.0,     1.0 / 252.0, -1.0 / 240.0,
                               1.0 / 132.0, -691.0 / 32760.0, 1.0 / 12.0};
  const double w = 1.0 / (x * x);
  return sum + std::log(x) - 0.5 / x - w * polynomial(kSeries, w);
}

double incompleteGamma(double x, double shape, double logGammaOfShape, int& fault, const MessageSink& messages) {
  fault = 0;
  if (!(shape > 0.0) || std::isinf(shape)) {
    return reportFault(fault, messages, " *** ERROR *** INCOMPLETE GAMMA INTEGRAL : SHAPE PARAMETER OUT OF RANGE");
  }
  if (!(x >= 0.0)) {
    return reportFault(fault, messages, " *** ERROR *** INCOMPLETE GAMMA INTEGRAL : ARGUMENT OF FUNCTION OUT OF RANGE");
  }
  if (x == 0.0) return 0.0;
  if (std::isinf(x)) return 1.0;
  if (shape > 10000.0) return incompleteGammaOfLargeShape(x, shape);

  bool converged = false;
  const double result = x <= 1.0 || x < shape ? incompleteGammaSeries(x, shape, logGammaOfShape, converged)
                                              : incompleteGammaFraction(x, shape, logGammaOfShape, converged);
  if (!converged) {
    reportFault(fault, messages,
                " *** WARNING *** INCOMPLETE GAMMA INTEGRAL : ITERATION HAS NOT CONVERGED. RESULT MAY BE UNRELIABLE");
  }
  return result;
}

}  // namespace mirevo
