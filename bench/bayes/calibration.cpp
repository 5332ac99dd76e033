// Simulation-based calibration of DREAM (Talts et al. 2018, arXiv:1804.06788): parameters drawn from the prior, data
// drawn with them, and the rank of each true value among draws of its posterior. Were anything in sampler, priors or
// likelihoods wrong, the ranks would not be uniform. Ranks among autocorrelated draws are not uniform, either: chains
// are to have ten times as many effective draws as ranks are counted among. Repetitions whose chains have not converged
// within the budget count as the others do, and are told. Prints the table of docs/dream.md.
//
//   dream_calibration [repetitions] [most model runs of each] [likelihood]
#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "algorithms/bayes/dream_sampler.h"
#include "algorithms/bayes/likelihoods.h"
#include "algorithms/numbers/special_functions.h"

namespace mirevo {
namespace {

constexpr std::size_t kRanks = 100;        // 99 draws of each posterior
constexpr double kEffectiveSize = 1000.0;  // of each parameter
constexpr std::size_t kBins = 20;
constexpr std::size_t kTimes = 25;

struct Case {
  const char* name;
  LikelihoodForm form;
  std::vector<ErrorTerm> terms;  ///< those that are estimated, between the bounds below
};

struct Bounds {
  double lower;
  double upper;
  bool isLogarithmic;
};

Bounds boundsOf(LikelihoodForm form, ErrorTerm term) {
  switch (term) {
    case kDeviation:
      // Transformed values with larger errors would leave the range of the Box-Cox transformation.
      return {form == LikelihoodForm::boxCox ? 0.02 : 0.05, form == LikelihoodForm::boxCox ? 0.2 : 1.0, true};
    case kShare:
      return {0.0, 0.3, false};
    case kCorrelation:
      return {0.0, 0.95, false};
    case kLambda:
      return {0.0, 1.0, false};
    case kFreedom:
      return {2.0, 30.0, true};
    case kSkewness:
      return {0.3, 3.0, true};
    default:
      return {-0.8, 1.0, false};
  }
}

/// A level, a logarithmic rate and an integer number of steps: f(t) = a + 3 exp(-r t) + n t / 50.
double model(std::span<const double> x, double t) {
  return x[0] + 3.0 * std::exp(-std::exp(x[1]) * t) + std::floor(x[2]) * t / 50.0;
}

class Calibration {
 public:
  explicit Calibration(const Case& of) : case_(of), lower_{2.0, std::log(0.01), 1.0}, upper_{6.0, std::log(1.0), 6.0} {
    for (const ErrorTerm term : of.terms) {
      const Bounds bounds = boundsOf(of.form, term);
      lower_.push_back(bounds.isLogarithmic ? std::log(bounds.lower) : bounds.lower);
      upper_.push_back(bounds.isLogarithmic ? std::log(bounds.upper) : bounds.upper);
    }
    for (std::size_t t = 0; t < kTimes; ++t) days_.push_back(static_cast<double>(t));
  }

  /// The rank of each dimension's true value among draws of the posterior.
  std::vector<std::size_t> ranks(int seed, int runs) {
    ChainRandom random(seed, 1);
    std::vector<double> unit(lower_.size());
    for (double& value : unit) value = random.uniform();
    const std::vector<double> truth = pointAt(unit);
    const SeriesErrors none(case_.form, 0.0, days_, std::vector<double>(kTimes, 1.0));
    SeriesErrors::Path path(none, errorsAt(truth));
    std::vector<double> observed;
    for (std::size_t t = 0; t < kTimes; ++t) observed.push_back(path.next(t, model(truth, days_[t]), random));
    const SeriesErrors series(case_.form, 0.0, days_, observed);

    DreamProblem problem;
    problem.lower = lower_;
    problem.upper = upper_;
    problem.modelParameterCount = 3;
    problem.drawPrior = [this](std::span<const double> at) { return pointAt(at); };
    problem.logPrior = [](std::span<const double>) { return 0.0; };
    problem.evaluate = [&, number = 0](std::span<const DreamProposal> proposals) mutable {
      std::vector<ProposalResult> results;
      for (const DreamProposal& proposal : proposals) {
        std::vector<double> simulated;
        for (const double day : days_) simulated.push_back(model(proposal.point, day));
        const int run = proposal.knownRun != 0 ? proposal.knownRun : ++number;
        results.push_back({series.logLikelihood(simulated, errorsAt(proposal.point)), run});
      }
      return results;
    };
    DreamSettings settings;
    settings.mostRuns = runs;
    settings.effectiveSize = kEffectiveSize;
    DreamSampler sampler(settings, std::move(problem), seed);
    while (!sampler.isFinished()) sampler.advance();
    if (sampler.end() == DreamEnd::converged) ++converged_;
    leastSize_ = std::min(leastSize_, sampler.checkNow()->leastEffectiveSize());
    runs_ += sampler.runs();
    std::vector<std::size_t> found(lower_.size(), 0);
    std::vector<std::size_t> ties(lower_.size(), 0);
    const ChainHistory& history = sampler.history();
    const std::size_t first = *sampler.burnIn();
    const std::size_t states = (history.generations() - first) * history.chainCount();
    for (std::size_t k = 0; k + 1 < kRanks; ++k) {
      const std::size_t place = (2 * k + 1) * states / (2 * (kRanks - 1));
      const auto state = history.at(first + place / history.chainCount(), place % history.chainCount());
      for (std::size_t j = 0; j < found.size(); ++j) {
        const double own = j == 2 ? std::floor(state.point[j]) : state.point[j];  // of an integer parameter its value
        const double real = j == 2 ? std::floor(truth[j]) : truth[j];
        if (own < real) ++found[j];
        if (own == real) ++ties[j];
      }
    }
    // Among equals each rank is as likely as the others.
    for (std::size_t j = 0; j < found.size(); ++j) found[j] += random.below(ties[j] + 1);
    return found;
  }

  std::string nameOf(std::size_t dimension) const {
    static constexpr const char* kNames[] = {"level", "log rate", "integer"};
    return dimension < 3 ? kNames[dimension] : std::string(errorTermRows()[case_.terms[dimension - 3]].symbol);
  }
  double leastSize() const { return leastSize_; }
  int converged() const { return converged_; }
  double runs() const { return runs_; }

 private:
  std::vector<double> pointAt(std::span<const double> unit) const {
    std::vector<double> point;
    for (std::size_t j = 0; j < unit.size(); ++j) point.push_back(lower_[j] + unit[j] * (upper_[j] - lower_[j]));
    return point;
  }
  ErrorValues errorsAt(std::span<const double> point) const {
    ErrorValues values = neutralErrors();
    for (std::size_t k = 0; k < case_.terms.size(); ++k) {
      const double value = point[3 + k];
      values[case_.terms[k]] = boundsOf(case_.form, case_.terms[k]).isLogarithmic ? std::exp(value) : value;
    }
    return values;
  }

  Case case_;
  std::vector<double> lower_;
  std::vector<double> upper_;
  std::vector<double> days_;
  double leastSize_ = 1e300;
  int converged_ = 0;
  double runs_ = 0.0;
};

/// The probability of ranks at least as uneven, by chi-square with kBins - 1 degrees of freedom.
double evenness(const std::vector<std::size_t>& ranks) {
  std::vector<double> counts(kBins, 0.0);
  for (const std::size_t rank : ranks) counts[rank * kBins / kRanks] += 1.0;
  const double expected = static_cast<double>(ranks.size()) / kBins;
  double sum = 0.0;
  for (const double count : counts) sum += (count - expected) * (count - expected) / expected;
  int fault = 0;
  const double shape = 0.5 * (kBins - 1);
  return 1.0 - incompleteGamma(0.5 * sum, shape, logGamma(shape, fault), fault);
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  using namespace mirevo;
  const int repetitions = argc > 1 ? std::atoi(argv[1]) : 300;
  const int runs = argc > 2 ? std::atoi(argv[2]) : 200'000;
  const std::string only = argc > 3 ? argv[3] : "";
  const std::vector<Case> cases{
      {"normal", LikelihoodForm::normal, {kDeviation}},
      {"heteroscedastic", LikelihoodForm::heteroscedastic, {kDeviation, kShare}},
      {"AR(1)", LikelihoodForm::autoregressive, {kDeviation, kCorrelation}},
      {"Box-Cox", LikelihoodForm::boxCox, {kDeviation, kLambda}},
      {"Student", LikelihoodForm::student, {kDeviation, kFreedom}},
      {"generalised", LikelihoodForm::generalised, {kDeviation, kShare, kCorrelation, kSkewness, kKurtosis}},
  };
  std::printf("%d repetitions of at most %d model runs; p of a chi-square test of the ranks in %zu bins\n", repetitions,
              runs, kBins);
  std::printf("| likelihood | p | converged | least effective size | runs, mean |\n");
  double least = 1.0;
  std::size_t tests = 0;
  for (const Case& own : cases) {
    if (!only.empty() && only != own.name) continue;
    Calibration calibration(own);
    std::vector<std::vector<std::size_t>> ranks;
    for (int i = 1; i <= repetitions; ++i) {
      const std::vector<std::size_t> found = calibration.ranks(i, runs);
      ranks.resize(found.size());
      for (std::size_t j = 0; j < found.size(); ++j) ranks[j].push_back(found[j]);
    }
    std::printf("| %s |", own.name);
    for (std::size_t j = 0; j < ranks.size(); ++j) {
      const double p = evenness(ranks[j]);
      least = std::min(least, p);
      ++tests;
      std::printf(" %s %.3f%s", calibration.nameOf(j).c_str(), p, j + 1 < ranks.size() ? "," : "");
    }
    std::printf(" | %.1f %% | %.0f | %.0f |\n", 100.0 * calibration.converged() / repetitions, calibration.leastSize(),
                calibration.runs() / repetitions);
    std::fflush(stdout);
  }
  const auto count = static_cast<double>(tests);
  std::printf("least of %zu p: %.4f, by Bonferroni %.3f\n", tests, least, std::min(1.0, count * least));
}
