#include "measures/fit_figures.h"

#include <cmath>
#include <limits>

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// NaN instead of infinity.
double ratio(double numerator, double denominator) {
  const double value = numerator / denominator;
  return std::isfinite(value) ? value : kNaN;
}

template <class Use>
void forEachPair(std::span<const float> simulated, std::span<const float> observed, const Use& use) {
  for (std::size_t i = 0; i < simulated.size() && i < observed.size(); ++i) {
    if (std::isfinite(simulated[i]) && std::isfinite(observed[i])) use(double{simulated[i]}, double{observed[i]});
  }
}

}  // namespace

FitFigures fitFigures(std::span<const float> simulated, std::span<const float> observed) {
  FitFigures figures;
  double sumSimulated = 0.0;
  double sumObserved = 0.0;
  forEachPair(simulated, observed, [&](double s, double o) {
    ++figures.count;
    sumSimulated += s;
    sumObserved += o;
  });
  const auto n = static_cast<double>(figures.count);
  const double meanSimulated = sumSimulated / n;
  const double meanObserved = sumObserved / n;
  double errors = 0.0;
  double squaresSimulated = 0.0;
  double squaresObserved = 0.0;
  double products = 0.0;
  forEachPair(simulated, observed, [&](double s, double o) {
    errors += (s - o) * (s - o);
    squaresSimulated += (s - meanSimulated) * (s - meanSimulated);
    squaresObserved += (o - meanObserved) * (o - meanObserved);
    products += (s - meanSimulated) * (o - meanObserved);
  });
  figures.nse = 1.0 - ratio(errors, squaresObserved);
  figures.correlation = ratio(products, std::sqrt(squaresSimulated) * std::sqrt(squaresObserved));
  figures.variability = ratio(std::sqrt(squaresSimulated), std::sqrt(squaresObserved));
  figures.meanRatio = ratio(meanSimulated, meanObserved);
  figures.kge = 1.0 - std::hypot(figures.correlation - 1.0, figures.variability - 1.0, figures.meanRatio - 1.0);
  figures.percentBias = 100.0 * ratio(sumSimulated - sumObserved, sumObserved);
  figures.rmse = std::sqrt(ratio(errors, n));
  figures.rSquared = figures.correlation * figures.correlation;
  return figures;
}

}  // namespace mirevo
