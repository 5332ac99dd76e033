#include "analyses.h"

#include <ctime>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "algorithms/analyses/covariance.h"
#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/glm_step.h"
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

void measureGlm() {
  constexpr std::size_t kParameters = 200;
  constexpr std::size_t kObservations = 10000;
  UniformGenerator random(1);
  const std::vector<double> residuals = deviates(kObservations, random);
  std::vector<std::vector<double>> jacobian;
  for (std::size_t j = 0; j < kParameters; ++j) jacobian.push_back(deviates(kObservations, random));
  SearchBounds bounds{std::vector<double>(kParameters, -0.02), std::vector<double>(kParameters, 0.02),
                      std::vector<double>(kParameters, 0.0)};
  const double start = processorSeconds();
  GlmLinearModel model(std::move(jacobian), residuals, bounds.initial, bounds, 1e-7);
  const double reduced = processorSeconds();
  double moved = 0.0;
  for (const double lambda : {0.0, 0.01, 0.1, 0.001}) moved += model.setFor(lambda).front();
  fmt::print(
      "GLM with {} parameters and {} observations: {:.2f} s of processor time for the triangle, {:.2f} s for "
      "four steps\n",
      kParameters, kObservations, reduced - start, processorSeconds() - reduced);
  fmt::print("   the first parameter moves by {} in all\n", moved);
}

}  // namespace mirevo::bench
