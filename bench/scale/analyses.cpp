#include "analyses.h"

#include <ctime>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "algorithms/analyses/covariance.h"
#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/surrogate/quadratic_surrogate.h"

namespace mirevo::bench {
namespace {

std::vector<double> deviates(std::size_t count, UniformGenerator& random) {
  std::vector<double> values(count);
  for (double& value : values) value = random.next() - 0.5;
  return values;
}

/// Of this process: other work on the machine does not count.
double processorSeconds() {
  timespec time{};
  ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) + 1e-9 * static_cast<double>(time.tv_nsec);
}

}  // namespace

void measureQuadraticSurrogate() {
  constexpr std::size_t kDimensions = 30;
  constexpr int kFits = 20;
  UniformGenerator random(1);
  const std::size_t count = 3 * quadraticCoefficientCount(kDimensions) / 2;
  std::vector<std::vector<double>> points;
  for (std::size_t i = 0; i < count; ++i) points.push_back(deviates(kDimensions, random));
  const std::vector<double> values = deviates(count, random);
  QuadraticSurrogate surrogate;
  const double start = processorSeconds();
  for (int i = 0; i < kFits; ++i) surrogate.fit(points, values);
  fmt::print("quadratic surrogate in {} dimensions, fitted to {} sets: {:.1f} ms of processor time\n", kDimensions,
             count, 1e3 * (processorSeconds() - start) / kFits);
  fmt::print("   predicts {}\n", surrogate.predict(points.front()));
}

void measureCovariance() {
  constexpr std::size_t kParameters = 2000;
  constexpr std::size_t kObservations = 5000;
  UniformGenerator random(1);
  LinearisedModel model;
  model.residuals = deviates(kObservations, random);
  for (std::size_t j = 0; j < kParameters; ++j) model.jacobian.push_back(deviates(kObservations, random));
  model.jacobian[10] = model.jacobian[5];  // one that depends on others
  const double start = processorSeconds();
  const ParameterCovariance found = parameterCovariance(model);
  fmt::print("covariance of {} parameters from {} observations: {:.1f} s of processor time\n", kParameters,
             kObservations, processorSeconds() - start);
  fmt::print("   {} kept, the last one's standard deviation {}\n", found.kept.size(), found.standardDeviations.back());
}

}  // namespace mirevo::bench
