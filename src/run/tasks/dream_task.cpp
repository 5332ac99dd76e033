#include "run/tasks/dream_task.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "algorithms/analyses/sampled_distributions.h"
#include "algorithms/bayes/posterior.h"
#include "algorithms/bayes/posterior_words.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "evaluation/failed_run_policy.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/posterior_bands.h"
#include "run/tasks/sample_bands.h"
#include "run/tasks/simulated_room.h"

namespace mirevo {
namespace {

constexpr std::size_t kPriorDraws = 40'000;
constexpr std::size_t kLeastPriorDraws = 1'000;
constexpr std::size_t kMostPriorValues = 4'000'000;  // 32 MB
constexpr const char* kPriorRefusal = "Error: Prior of DREAM invalid";
constexpr CodeName kFormName{std::nullopt, "DREAM"};

/// Where the setup gives the prior of variable parameter j, or could.
SetupSection sectionOfPrior(const SetupSection& section, std::size_t j) {
  const std::string name = fmt::format("PARAMETER_{}", j + 1);
  return section.has(name) ? section.openItem("PARAMETER_", j + 1) : section;
}

/// Of a prior with so high a peak at an end that numbers, which are no finer there, cannot tell its values apart.
std::vector<std::string> boundWarnings(const Distribution& prior, const SearchSpace& space, std::size_t j) {
  constexpr double kTooMuch = 1e-3;
  constexpr double kLeast = std::numeric_limits<double>::min();
  const double lower = std::max(space.lower[j], prior.quantile(kLeast));
  const double upper = std::min(space.upper[j], prior.quantile(1.0 - std::numeric_limits<double>::epsilon() / 2.0));
  const double all = prior.cumulative(space.upper[j]) - prior.cumulative(space.lower[j]);
  std::vector<std::string> texts;
  const auto add = [&](double probability, std::string_view end, double value) {
    if (!(probability > kTooMuch * all)) return;
    texts.push_back(
        fmt::format("{:.2g} % of the prior's probability of {} lies within the rounding of numbers at its {} end, {:g} "
                    "(search scale): a chain that comes there stays. Expected a prior with a density that is finite "
                    "there, such as that of a beta distribution with {} of 1 or more, or bounds that leave the end "
                    "out",
                    100.0 * probability / all, space.names[j], end, value, end == "lower" ? "an Alpha" : "a Beta"));
  };
  const double above = std::nextafter(lower, std::numeric_limits<double>::infinity());
  const double below = std::nextafter(upper, -std::numeric_limits<double>::infinity());
  add(prior.cumulative(above) - prior.cumulative(space.lower[j]), "lower", lower);
  add(prior.upperTail(below) - prior.upperTail(space.upper[j]), "upper", upper);
  return texts;
}

}  // namespace

const TaskFacts& DreamTask::facts() const {
  static constexpr TaskFacts kFacts{{3, "uncertainty"},
                                    "uncertainty analysis",
                                    run_files::kPlain,
                                    {kUncertaintySection, kUncertaintyTypeKeyword, kFormName}};
  return kFacts;
}

std::vector<const SectionRow*> DreamTask::sections() const {
  return {&dreamSection().row, &errorModelSection().row};
}

std::vector<std::string> DreamTask::neededSections(const SetupSection& /*target*/) const {
  return {std::string(uncertaintySection().row.path), std::string(dreamSection().row.path)};
}

void DreamTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open(kUncertaintySection);
  UncertaintySection filled{settings, randomSeed};
  section.read(uncertaintySection(), filled);
  section.require(validateBandEnd(settings, reading.period));
  if (settings.redrawsInfeasible) {
    section.warn(kRedrawKeyword,
                 "has no effect with Uncertainty_Type = 'DREAM': chains begin in sets that can be run, and reject "
                 "proposals that cannot, without a model run");
  }
  prior_ = readDistributions(reading, section);
  refusePriorWithoutDensity(reading, section);
  refuseImpossiblePriors(reading, section);
  dream.sampler.mostRuns = settings.sampleSize;
  readDreamSection(section, reading.measures, reading.objectives, dream);
  checkSize(reading, section);
}

/// A distribution of single values.
void DreamTask::refusePriorWithoutDensity(const TaskReading& reading, const SetupSection& section) const {
  const auto discrete = prior_.firstWithoutDensity();
  if (!discrete) return;
  std::string name;
  std::size_t variable = 0;
  for (const ModelParameter& parameter : reading.parameters) {
    if (parameter.parameterType == ParameterType::variable && variable++ == *discrete) name = parameter.name;
  }
  sectionOfPrior(section, *discrete)
      .refuse(kPriorRefusal, kDistributionKeyword,
              fmt::format("the distribution of {} has single values: expected one with a density, as chains move in "
                          "small steps",
                          name));
}

/// A parameter that has one value only, or whose prior has none between its bounds.
void DreamTask::refuseImpossiblePriors(const TaskReading& reading, const SetupSection& section) const {
  if (reading.variableCount == 0) return;
  const SearchSpace space = BuildSearchSpace(reading.parameters);
  std::size_t variable = 0;
  for (std::size_t k = 0; k < reading.parameters.size(); ++k) {
    if (reading.parameters[k].parameterType != ParameterType::variable) continue;
    const std::size_t j = variable++;
    const SetupSection& parameter = reading.parameterSections[k];
    if (!(space.upper[j] > space.lower[j])) {
      parameter.refuse("Error: Lower bound equal to upper bound for parameter " + space.names[j], "Upper_Bound",
                       fmt::format("expected more than {} for a parameter with a density; Parameter_Type = 1 fixes a "
                                   "parameter",
                                   formatReal(reading.parameters[k].lowerBound)));
    }
    constexpr double kLeastShare = 1e-4;  // a draw is tried 100,000 times
    const double share = prior_[j].cumulative(space.upper[j]) - prior_[j].cumulative(space.lower[j]);
    if (share < kLeastShare) {
      sectionOfPrior(section, j)
          .refuse(kPriorRefusal, kDistributionKeyword,
                  fmt::format("the prior of {} has a probability of {:.1g} between the bounds {:g} and {:g} (search "
                              "scale): expected {:g} or more. The bounds are at {}",
                              space.names[j], share, space.lower[j], space.upper[j], kLeastShare,
                              parameter.location("Upper_Bound")));
    }
  }
}

void DreamTask::checkSize(const TaskReading& reading, const SetupSection& section) const {
  constexpr std::int32_t kLeastGenerations = 10;
  if (settings.sampleSize < kLeastGenerations * dream.sampler.chainCount) {
    section.refuse(kSampleSizeRefusal, kSampleSizeKeyword,
                   fmt::format("expected {} evaluations for each of the {} chains or more, found {}", kLeastGenerations,
                               dream.sampler.chainCount, settings.sampleSize));
  }
  if (const auto tooMany = tooManySets(settings.sampleSize, reading.variableCount + kErrorTermCount)) {
    section.refuse(kSampleSizeRefusal, kSampleSizeKeyword,
                   fmt::format("{} ({} of the model and up to {} of its errors), found {}", *tooMany,
                               reading.variableCount, static_cast<std::size_t>(kErrorTermCount), settings.sampleSize));
  }
}

std::optional<KeptSteps> DreamTask::keptSteps() const {
  return bandSteps(settings);
}

std::string DreamTask::description() const {
  return "Uncertainty analysis: posterior distribution by Markov chains, DREAM(ZS)";
}

std::vector<std::string> DreamTask::summaryLines(const SearchSpace& space) const {
  const DreamSettings& own = dream.sampler;
  std::vector<std::string> lines = distributionLines(prior_, space, kUncertaintySection);
  lines.insert(lines.end(),
               {fmt::format("Likelihood: {}", kLikelihoodNames[static_cast<std::size_t>(*dream.errors.form)].name),
                fmt::format("{} chains, at most {} evaluations; the first {:g} of them are burn-in", own.chainCount,
                            own.mostRuns, own.burnInRuns()),
                fmt::format("They may end before with R-hat at most {:g} and effective sample sizes of at least {:g}",
                            own.rHatLimit, own.effectiveSize)});
  return lines;
}

std::vector<std::string> DreamTask::warnings(const SearchSpace& space) const {
  std::vector<std::string> texts = distributionWarnings(prior_, space);
  for (std::size_t j = 0; j < prior_.size(); ++j) {
    for (std::string& text : boundWarnings(prior_[j], space, j)) texts.push_back(std::move(text));
  }
  return texts;
}

/// The chains begin as they did, whatever Sample_Size, R_Hat_Limit and Effective_Size are now: burn-in keeps its
/// length, and evaluations that were made are used.
std::optional<RaisedBudget> DreamTask::raisedBudget(const SearchHistory& history) const {
  RaisedBudget raised;
  const int before = history.searches.empty() ? 0 : history.searches.back().lastEvaluation;
  const int made = std::max(history.evaluations, 1);
  if (made > before) raised.earlier = EarlierSearch{history.budget, made};
  if (settings.sampleSize > history.budget) {
    raised.note = fmt::format("{} was raised from {} to {}: the chains go on where they ended", kSampleSizeKeyword,
                              history.budget, settings.sampleSize);
  }
  if (!raised.earlier && raised.note.empty()) return std::nullopt;
  return raised;
}

void DreamTask::continueFrom(const std::vector<EarlierSearch>& searches) {
  earlierRuns_ = searches;
  if (searches.empty()) return;
  dream.sampler.burnInOf = searches.front().maxEvaluations;
  dream.sampler.leastRuns = searches.back().lastEvaluation;
}

/// One that can be run; otherwise empty, with the reason.
std::optional<ParameterSet> DreamTask::priorSet(const SearchSpace& space, const Feasibility& feasibility,
                                                std::string& reason) const {
  reason = "they lie outside the bounds";
  DreamProblem problem;
  problem.lower = space.lower;
  problem.upper = space.upper;
  problem.drawPrior = [this](std::span<const double> unit) { return prior_.setAt(unit); };
  problem.logPrior = [&](std::span<const double> set) {
    const auto violation = feasibility.violation(set);
    if (!violation) return prior_.logDensity(set);
    reason = *violation;
    return -std::numeric_limits<double>::infinity();
  };
  ChainRandom random(1);
  return drawAllowed(problem, random);
}

void DreamTask::requireSets(const SearchSpace& space, const Feasibility& feasibility) const {
  std::string reason;
  if (priorSet(space, feasibility, reason)) return;
  fatalError(feasibility.isTested() ? feasibility.noSetMessage()
                                    : "Error: No parameter set found in the prior that can be run",
             fmt::format("{}: none of {} sets drawn from the prior of DREAM can be run: {}", dream.place,
                         kMostPriorDraws, reason));
}

void DreamTask::requireObservations(const SearchSpace& space, std::span<const OutputMeasure> measures,
                                    std::span<const ObjectiveFunction> objectives,
                                    std::span<const ObservedSeries> observed) const {
  const DreamTarget target(dream, prior_, {space, measures, objectives, observed});
}

std::optional<ParameterSet> DreamTask::trialSet(const SearchSpace& space, const Feasibility& feasibility) const {
  std::string reason;
  return priorSet(space, feasibility, reason);
}

TaskOutcome DreamTask::outcomeOf(const TaskContext& context) const {
  TaskOutcome outcome{std::string(kEndOfTask)};
  const ShownDimensions dimensions = target_->shown(context.space);
  const std::vector<std::vector<double>> prior = target_->priorDraws(
      context.feasibility,
      std::clamp(kMostPriorValues / std::max<std::size_t>(dimensions.names.size(), 1), kLeastPriorDraws, kPriorDraws));
  const auto summary =
      summarisePosterior(*sampler_, dimensions, prior, static_cast<std::size_t>(std::max(settings.matrixLimit, 0)));
  const std::string correlationFile = fileNameOf(runFilePath(context.filePrefix, run_files::kSampleCorrelation));
  outcome.report = formatPosterior(
      dream.sampler, *sampler_, dimensions, summary ? &*summary : nullptr, target_->runsWithoutLikelihood(),
      {fileNameOf(runFilePath(context.filePrefix, run_files::kPosterior)), correlationFile});
  if (target_->hasCounted()) {
    const auto counts = target_->countLines();
    auto place = outcome.report.begin() + 1;
    for (const DreamTarget::CountLine& line : counts) {
      place = outcome.report.insert(place, (line.isWarning ? "Warning: " : "") + line.text) + 1;
    }
  }
  outcome.tables.push_back(chainsTable(*sampler_, dimensions));
  if (!summary) return outcome;
  outcome.tables.push_back(posteriorTable(*summary, dimensions));
  outcome.tables.push_back(marginalsTable(*sampler_, dimensions, prior));
  outcome.tables.push_back(convergenceTable(*sampler_, dimensions));
  outcome.tables.push_back(posteriorCorrelationTable(*summary, dimensions));
  const std::vector<std::string> bands =
      reportPosteriorBands(context, *target_, *sampler_, keptSteps().has_value(), randomSeed, outcome.files);
  outcome.report.emplace_back();
  outcome.report.insert(outcome.report.end(), bands.begin(), bands.end());
  return outcome;
}

/// Why there is nothing to say; empty otherwise.
std::string DreamTask::noLikelihood() const {
  return noLikelihoodText(*sampler_, target_->runsWithoutLikelihood());
}

/// A failed run is a likelihood of 0 and no fault, but so many of them end any run: what helps is told with the error.
void DreamTask::advance() {
  try {
    sampler_->advance();
  } catch (const FatalError& error) {
    if (error.message() != kTooManyFailures) throw;
    fatalError(error.message(),
               error.detail() +
                   "\nDREAM gives the sets of failed runs the likelihood 0 and goes on, but only within this limit. "
                   "Keep the chains away from where the model fails: narrower bounds, a prior, or an internal "
                   "constraint, whose violation needs no model run and is no failure here. Where failures are rare "
                   "behind burn-in, raise Sample_Size and go on with Restart = 1: the limit is a tenth of it");
  }
}

TaskOutcome DreamTask::run(const TaskContext& context) {
  target_ = std::make_unique<DreamTarget>(
      dream, prior_, LikelihoodBasis{context.space, context.measures, context.objectives, context.observedSeries});
  for (const std::string& line : target_->descriptionLines()) context.log.line(line);
  logBandTimes(context, settings);
  logRoomOfSimulatedValues(context, facts().resultFiles.simulatedValues, static_cast<std::size_t>(settings.sampleSize),
                           keptPrecision());
  sampler_ = std::make_unique<DreamSampler>(dream.sampler, target_->problem(context), randomSeed);
  bool wasBurningIn = true;
  std::size_t checks = 0;
  while (!sampler_->isFinished()) {
    advance();
    if (wasBurningIn && sampler_->burnIn()) {
      wasBurningIn = false;
      context.log.line(
          fmt::format("Burn-in ends after {} generations, {} evaluations", *sampler_->burnIn(), sampler_->runs()));
    }
    if (sampler_->checks().size() == checks) continue;
    checks = sampler_->checks().size();
    if (!noLikelihood().empty()) continue;
    const ConvergenceCheck& check = sampler_->checks().back();
    constexpr int kDigits = 4;
    context.log.line(fmt::format("Generation {}, {} evaluations: largest R-hat {}, least effective sample size {:.0f}",
                                 check.generations, check.runs, rHatText(check.largestRHat(), kDigits),
                                 check.leastEffectiveSize()));
  }
  TaskOutcome outcome = outcomeOf(context);
  const std::string nothing = noLikelihood();
  const bool isForUser = !nothing.empty() && context.warnUser;
  // The user is told with the log.
  std::vector<std::string> logged = outcome.report;
  if (isForUser) std::erase(logged, "Warning: " + nothing);
  logReport(context, logged);
  if (isForUser) context.warnUser(nothing);
  return outcome;
}

std::optional<TaskOutcome> DreamTask::unfinishedOutcome(const TaskContext& context,
                                                        const UnfinishedBatch& /*made*/) const {
  if (!sampler_ || sampler_->history().generations() == 0) return std::nullopt;
  return outcomeOf(context);
}

}  // namespace mirevo
