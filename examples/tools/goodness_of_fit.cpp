#include "tools/goodness_of_fit.h"

#include <cmath>
#include <numeric>

namespace mirevo::examples {
namespace {

double mean(std::span<const double> values) {
  return std::accumulate(values.begin(), values.end(), 0.0) / static_cast<double>(values.size());
}

}  // namespace

GoodnessOfFit goodnessOfFit(std::span<const double> simulated, std::span<const double> observed) {
  const double meanSimulated = mean(simulated);
  const double meanObserved = mean(observed);
  double errors = 0.0;
  double squaresSimulated = 0.0;
  double squaresObserved = 0.0;
  double products = 0.0;
  for (std::size_t i = 0; i < observed.size(); ++i) {
    const double s = simulated[i] - meanSimulated;
    const double o = observed[i] - meanObserved;
    errors += (simulated[i] - observed[i]) * (simulated[i] - observed[i]);
    squaresSimulated += s * s;
    squaresObserved += o * o;
    products += s * o;
  }
  const double correlation = products / std::sqrt(squaresSimulated * squaresObserved);
  const double variability = std::sqrt(squaresSimulated / squaresObserved);
  const double volume = meanSimulated / meanObserved;
  return {.nse = 1.0 - errors / squaresObserved,
          .kge = 1.0 - std::hypot(correlation - 1.0, variability - 1.0, volume - 1.0),
          .rmse = std::sqrt(errors / static_cast<double>(observed.size())),
          .volumeBias = volume - 1.0};
}

}  // namespace mirevo::examples
