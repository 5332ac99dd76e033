#pragma once

#include <algorithm>
#include <functional>
#include <limits>
#include <span>
#include <string>
#include <vector>

#include "algorithms/numbers/special_functions.h"
#include "algorithms/searches/cma_es.h"
#include "algorithms/searches/dds.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "algorithms/test_functions.h"
#include "evaluation/evaluator.h"

/// Searches on functions, from one seed after the other.
namespace mirevo::bench {

using testing::TestFunction;

inline constexpr int kUnlimited = 25000;
inline constexpr auto kQuadratic = SurrogateModelType::quadraticPolynomial;
inline constexpr auto kGaussian = SurrogateModelType::gaussianProcess;

enum class Method { sce, pse, opse, dds, cma };

struct Setting {
  Method method = Method::sce;
  int complexes = 2;  ///< the population has this many times 2n + 1 points, for PSE, too
  int budget = kUnlimited;
  int samplingRate = 100;  ///< per cent; below 100 with the surrogate model
  SurrogateModelType modelType = SurrogateModelType::quadraticPolynomial;
  bool stopsAtTarget = false;
  int extraPoints = 0;                ///< points per complex beyond n + 1; 0 means n, that is 2n + 1 points
  bool usesPublishedFactors = false;  ///< of SCE
  double inFlight = 0.5;              ///< of OPSE, sets for each point of the population
  double expansionShare = 0.0;        ///< of PSE and OPSE
  int checkInterval = 0;              ///< of the surrogate model
  double minPopulationRange = StoppingCriteria().minPopulationRange;
  bool goesOnWhenConverged = false;  ///< until the budget is used up, whatever the stopping tests say
  DdsSettings dds = {};
  CmaEsSettings cma = {};
  double noise = 0.0;                 ///< standard deviation of a random factor of every value around 1
  int slots = 1;                      ///< model runs at a time, all of the same length
  int rounds = 1 << 30;               ///< model runs one after the other for which there is time
  std::vector<int> checkpoints = {};  ///< evaluations after which the best value is noted
};

struct Outcome {
  bool isSuccess = false;
  int evaluations = 0;                 ///< until the first value within the tolerance of the optimum
  double best = 0.0;                   ///< without noise, and found within the time
  std::vector<double> bestAfter = {};  ///< for each of the checkpoints
  int evaluationsMade = 0;
};

/// Evaluates a function; counts the evaluations and records when a value is first within the tolerance of the optimum.
class TargetEvaluator final : public Evaluator {
 public:
  TargetEvaluator(const TestFunction& function, const Setting& setting, int seed, double tolerance = 1.0e-3)
      : function_(function), setting_(setting), noise_(500000 + seed), tolerance_(tolerance) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
    std::vector<EvaluationResult> results(sets.size());
    const auto size = static_cast<int>(sets.size());
    rounds_ += (size + setting_.slots - 1) / setting_.slots;
    for (std::size_t i = 0; i < sets.size(); ++i) {
      const double value = function_.value(sets[i]);
      results[i].number = ++evaluations;
      results[i].aggregate = value;
      if (setting_.noise > 0.0) {
        int fault = 0;
        results[i].aggregate *= 1.0 + setting_.noise * normalQuantile(noise_.next(), fault);
      }
      if (rounds_ <= setting_.rounds) bestInTime = std::min(bestInTime, value);
      if (std::ranges::find(setting_.checkpoints, evaluations) != setting_.checkpoints.end()) {
        bestAfter.push_back(bestInTime);
      }
      if (evaluationsToTarget == 0 && value - function_.optimalValue <= tolerance_) evaluationsToTarget = evaluations;
    }
    return results;
  }

  bool hasHitTarget() const { return evaluationsToTarget > 0; }

  int evaluations = 0;
  int evaluationsToTarget = 0;  ///< 0 until the target is reached
  double bestInTime = std::numeric_limits<double>::infinity();
  std::vector<double> bestAfter;  ///< for each of the checkpoints that were reached

 private:
  TestFunction function_;
  Setting setting_;
  UniformGenerator noise_;
  int rounds_ = 0;
  double tolerance_;
};

/// One trial; the function has its optimum where it is.
Outcome runTrial(const TestFunction& function, const Setting& setting, int seed);
/// Trials with the seeds 1, 2, 3, ..., of functions that may depend on the seed.
std::vector<Outcome> runTrials(const std::function<TestFunction(int)>& functionOf, const Setting& setting, int trials);
std::vector<Outcome> runTrials(const TestFunction& function, const Setting& setting, bool isShifted, int trials);

/// "successes/mean evaluations of the successful trials".
std::string successText(const std::vector<Outcome>& outcomes);
double medianOf(std::vector<double> values);
double medianOf(const std::vector<Outcome>& outcomes);
std::string meanAndMedianText(const std::vector<Outcome>& outcomes);

}  // namespace mirevo::bench
