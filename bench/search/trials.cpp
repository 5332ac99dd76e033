#include "trials.h"

#include <algorithm>
#include <memory>
#include <utility>

#include <fmt/format.h>

#include "algorithms/searches/opse.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"

namespace mirevo::bench {

Outcome runTrial(const TestFunction& function, const Setting& setting, int seed) {
  TargetEvaluator evaluator(function, setting, seed);
  UniformGenerator random(seed);
  const SearchBounds bounds = testing::boundsOf(function);
  const int n = static_cast<int>(function.size());
  const SurrogateSettings surrogate{
      .samplingRate = setting.samplingRate, .modelType = setting.modelType, .checkInterval = setting.checkInterval};
  ProposalSelector selector(surrogate, bounds);
  // The test of the change of the objective is switched off by a history that is never filled.
  const StoppingCriteria stopping{setting.budget, 1000000000, 0.0, setting.minPopulationRange};
  const SearchProblem problem{bounds,
                              stopping,
                              InitialSampleSettings{false, SampleGeneration::latinHypercube, ""},
                              {},
                              evaluator,
                              random,
                              setting.samplingRate < 100 ? &selector : nullptr};
  std::unique_ptr<SearchAlgorithm> search;
  if (setting.method == Method::sce) {
    const int points = n + 1 + (setting.extraPoints > 0 ? setting.extraPoints : n);
    search = std::make_unique<Sce>(SceSettings{setting.complexes, points, points, setting.usesPublishedFactors},
                                   SimplexSettings{n + 1}, problem);
  } else if (setting.method == Method::pse) {
    const PseSettings pse{.populationSize = setting.complexes * (2 * n + 1), .expansionShare = setting.expansionShare};
    search = std::make_unique<Pse>(pse, SimplexSettings{n + 1}, problem);
  } else if (setting.method == Method::opse) {
    const int points = setting.complexes * (2 * n + 1);
    const int inFlight = std::max(1, static_cast<int>(setting.inFlight * points));
    search = std::make_unique<Opse>(
        OpseSettings{{.populationSize = points, .expansionShare = setting.expansionShare}, inFlight},
        SimplexSettings{n + 1}, problem);
  } else if (setting.method == Method::cma) {
    search = std::make_unique<CmaEs>(setting.cma, problem);
  } else {
    search = std::make_unique<Dds>(setting.dds, setting.budget, false, bounds, evaluator, random);
  }
  if (search->initialise() != kSearchOk) return {};
  const auto isOver = [&] {
    if (setting.stopsAtTarget && evaluator.hasHitTarget()) return true;
    return setting.goesOnWhenConverged ? evaluator.evaluations >= setting.budget : search->isTerminated();
  };
  while (!isOver()) {
    if (search->advance() != kSearchOk) return {};
  }
  // With noise what counts is what the chosen set is really worth.
  const double best = setting.noise > 0.0 ? function.value(search->summary().best) : evaluator.bestInTime;
  evaluator.bestAfter.resize(setting.checkpoints.size(), best);  // a search may end before
  return {evaluator.hasHitTarget(), evaluator.evaluationsToTarget, best, std::move(evaluator.bestAfter),
          evaluator.evaluations};
}

std::vector<Outcome> runTrials(const std::function<TestFunction(int)>& functionOf, const Setting& setting, int trials) {
  std::vector<Outcome> outcomes;
  for (int seed = 1; seed <= trials; ++seed) outcomes.push_back(runTrial(functionOf(seed), setting, seed));
  return outcomes;
}

std::vector<Outcome> runTrials(const TestFunction& function, const Setting& setting, bool isShifted, int trials) {
  return runTrials([&](int seed) { return isShifted ? testing::shifted(function, seed) : function; }, setting, trials);
}

std::string successText(const std::vector<Outcome>& outcomes) {
  int successes = 0;
  double sum = 0.0;
  for (const Outcome& outcome : outcomes) {
    if (!outcome.isSuccess) continue;
    ++successes;
    sum += outcome.evaluations;
  }
  return successes == 0 ? "0/–" : fmt::format("{}/{:.0f}", successes, sum / successes);
}

double medianOf(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return 0.5 * (values[(values.size() - 1) / 2] + values[values.size() / 2]);
}

double medianOf(const std::vector<Outcome>& outcomes) {
  std::vector<double> values;
  for (const Outcome& outcome : outcomes) values.push_back(outcome.best);
  return medianOf(std::move(values));
}

std::string meanAndMedianText(const std::vector<Outcome>& outcomes) {
  double sum = 0.0;
  for (const Outcome& outcome : outcomes) sum += outcome.best;
  return fmt::format("{:.3g} / {:.3g}", sum / static_cast<double>(outcomes.size()), medianOf(outcomes));
}

}  // namespace mirevo::bench
