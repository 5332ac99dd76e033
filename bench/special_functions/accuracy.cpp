// Prints the largest error of each special function over ranges of its argument, against 50-digit arithmetic: as a
// multiple of the distance between neighbouring doubles at the true value (ulp), and absolute.
#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>

#include <boost/math/special_functions/digamma.hpp>
#include <boost/math/special_functions/erf.hpp>
#include <boost/math/special_functions/gamma.hpp>
#include <boost/multiprecision/cpp_bin_float.hpp>
#include <fmt/format.h>

#include "algorithms/numbers/special_functions.h"
#include "algorithms/numbers/uniform_generator.h"

namespace {

using Wide = boost::multiprecision::cpp_bin_float_50;

struct Worst {
  double ulps = 0.0;
  double absolute = 0.0;
  double at = 0.0;

  void take(double argument, double value, const Wide& truth) {
    const double rounded = std::abs(truth.convert_to<double>());
    const double ulp = std::nextafter(rounded, std::numeric_limits<double>::infinity()) - rounded;
    const double error = abs(Wide(value) - truth).convert_to<double>();
    absolute = std::max(absolute, error);
    if (error / ulp > ulps) {
      ulps = error / ulp;
      at = argument;
    }
  }
};

/// Draws arguments uniformly on the logarithmic (linear = false) or the linear scale.
void measure(const char* name, double from, double to, bool linear, int count,
             const std::function<double(double)>& ours, const std::function<Wide(double)>& truth) {
  mirevo::UniformGenerator random(1);
  Worst worst;
  for (int k = 0; k < count; ++k) {
    const double u = random.next();
    const double x = linear ? from + u * (to - from) : from * std::pow(to / from, u);
    worst.take(x, ours(x), truth(x));
  }
  fmt::print("| {} | {:g} to {:g} | {:.1f} | {:.1e} | {:.6g} |\n", name, from, to, worst.ulps, worst.absolute,
             worst.at);
}

}  // namespace

int main() {
  int fault = 0;
  const auto quantile = [&](double p) { return mirevo::normalQuantile(p, fault); };
  const auto quantileTruth = [](double p) { return Wide(-sqrt(Wide(2)) * boost::math::erfc_inv(Wide(2) * Wide(p))); };
  const auto gamma = [&](double x) { return mirevo::logGamma(x, fault); };
  const auto gammaTruth = [](double x) { return Wide(boost::math::lgamma(Wide(x))); };
  const auto psi = [&](double x) { return mirevo::digamma(x, fault); };
  const auto psiTruth = [](double x) { return Wide(boost::math::digamma(Wide(x))); };

  fmt::print(
      "| function | argument | largest error, ulp | largest error, absolute | worst ulp at |\n|---|---|---|---|---|\n");
  measure("normal quantile", 1e-300, 1e-11, false, 300, quantile, quantileTruth);
  measure("normal quantile", 1e-11, 0.075, false, 2000, quantile, quantileTruth);
  measure("normal quantile", 0.075, 0.925, true, 2000, quantile, quantileTruth);
  measure("normal quantile", 0.925, 1.0 - 1e-10, true, 2000, quantile, quantileTruth);
  measure("log-gamma", 1e-300, 1e-7, false, 2000, gamma, gammaTruth);
  measure("log-gamma", 1e-7, 0.9, false, 2000, gamma, gammaTruth);
  measure("log-gamma", 0.9, 2.1, true, 2000, gamma, gammaTruth);
  measure("log-gamma", 2.1, 13.0, true, 2000, gamma, gammaTruth);
  measure("log-gamma", 13.0, 1e9, false, 2000, gamma, gammaTruth);
  measure("log-gamma", 1e9, 2e36, false, 2000, gamma, gammaTruth);
  measure("digamma", 1e-300, 1e-9, false, 2000, psi, psiTruth);
  measure("digamma", 1e-9, 1.0, false, 2000, psi, psiTruth);
  measure("digamma", 1.0, 13.0, true, 2000, psi, psiTruth);
  measure("digamma", 13.0, 1e15, false, 2000, psi, psiTruth);
  for (const double shape : {0.01, 0.5, 1.0, 3.0, 30.0, 300.0, 9999.0, 10001.0, 1e5}) {
    const double logGammaOfShape = mirevo::logGamma(shape, fault);
    const double spread = 6.0 * std::sqrt(shape);
    measure(
        fmt::format("incomplete gamma, shape {:g}", shape).c_str(), std::max(1e-3, shape - spread), shape + spread,
        true, 200, [&](double x) { return mirevo::incompleteGamma(x, shape, logGammaOfShape, fault); },
        [&](double x) { return Wide(boost::math::gamma_p(Wide(shape), Wide(x))); });
  }
}
