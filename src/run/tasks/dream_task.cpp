#include "run/tasks/dream_task.h"

#include <fmt/format.h>

#include "algorithms/bayes/posterior.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/posterior_bands.h"
#include "run/tasks/sample_bands.h"
#include "run/tasks/simulated_room.h"

namespace mirevo {
namespace {

constexpr std::size_t kPriorDraws = 10'000;
constexpr CodeName kFormName{std::nullopt, "DREAM"};

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
  prior_ = readDistributions(reading, section);
  if (const auto discrete = prior_.firstWithoutDensity()) {
    section.refuse("Error: Prior of DREAM invalid", "Uncertainty_Type",
                   fmt::format("the distribution of variable parameter {} has single values: expected one with a "
                               "density, as chains move in small steps",
                               *discrete + 1));
  }
  readDreamSection(section, reading.measures, reading.objectives, dream);
  dream.sampler.mostRuns = settings.sampleSize;
  constexpr std::int32_t kLeastGenerations = 10;
  if (settings.sampleSize < kLeastGenerations * dream.sampler.chainCount) {
    section.refuse(kSampleSizeRefusal, kSampleSizeKeyword,
                   fmt::format("expected {} model runs for each of the {} chains or more, found {}", kLeastGenerations,
                               dream.sampler.chainCount, settings.sampleSize));
  }
  const std::size_t dimensions = reading.variableCount + kErrorTermCount;
  if (const auto tooMany = tooManySets(settings.sampleSize, dimensions)) {
    section.refuse(kSampleSizeRefusal, kSampleSizeKeyword, fmt::format("{}, found {}", *tooMany, settings.sampleSize));
  }
}

std::optional<KeptSteps> DreamTask::keptSteps() const {
  return bandSteps(settings);
}

std::string DreamTask::description() const {
  return "Uncertainty analysis: posterior distribution by Markov chains, DREAM(ZS)";
}

std::vector<std::string> DreamTask::summaryLines(const SearchSpace& /*space*/) const {
  const DreamSettings& own = dream.sampler;
  return {fmt::format("Likelihood: {}", kLikelihoodNames[static_cast<std::size_t>(*dream.errors.form)].name),
          fmt::format("{} chains, at most {} model runs; the first {:g} of them are burn-in", own.chainCount,
                      own.mostRuns, own.burnInShare * own.mostRuns),
          fmt::format("They may end before with R-hat at most {:g} and effective sample sizes of at least {:g}",
                      own.rHatLimit, own.effectiveSize)};
}

TaskOutcome DreamTask::outcomeOf(const TaskContext& context) const {
  TaskOutcome outcome{std::string(kEndOfTask)};
  const ShownDimensions dimensions = target_->shown(context.space);
  const std::vector<std::vector<double>> prior = target_->priorDraws(kPriorDraws);
  const auto summary = summarisePosterior(*sampler_, dimensions, prior);
  const std::string correlationFile = fileNameOf(runFilePath(context.filePrefix, run_files::kSampleCorrelation));
  outcome.report = formatPosterior(dream.sampler, *sampler_, dimensions, summary ? &*summary : nullptr,
                                   target_->failures(), correlationFile);
  outcome.tables.push_back(chainsTable(*sampler_, dimensions));
  if (!summary) return outcome;
  outcome.tables.push_back(posteriorTable(*summary, dimensions));
  outcome.tables.push_back(marginalsTable(*sampler_, dimensions, prior));
  outcome.tables.push_back(convergenceTable(*sampler_, dimensions));
  outcome.tables.push_back(matrixTable(run_files::kSampleCorrelation, "Correlation of the posterior", dimensions.names,
                                       summary->correlations));
  const std::vector<std::string> bands =
      reportPosteriorBands(context, *target_, *sampler_, keptSteps().has_value(), randomSeed, outcome.files);
  outcome.report.emplace_back();
  outcome.report.insert(outcome.report.end(), bands.begin(), bands.end());
  return outcome;
}

TaskOutcome DreamTask::run(const TaskContext& context) {
  target_ = std::make_unique<DreamTarget>(dream, prior_, context);
  for (const std::string& line : target_->descriptionLines()) context.log.line(line);
  logBandTimes(context, settings);
  logRoomOfSimulatedValues(context, facts().resultFiles.simulatedValues, static_cast<std::size_t>(settings.sampleSize),
                           keptPrecision());
  sampler_ = std::make_unique<DreamSampler>(dream.sampler, target_->problem(context), randomSeed);
  bool wasBurningIn = true;
  std::size_t checks = 0;
  while (!sampler_->isFinished()) {
    sampler_->advance();
    if (wasBurningIn && sampler_->burnIn()) {
      wasBurningIn = false;
      context.log.line(
          fmt::format("Burn-in ends after {} generations, {} model runs", *sampler_->burnIn(), sampler_->runs()));
    }
    if (sampler_->checks().size() == checks) continue;
    checks = sampler_->checks().size();
    const ConvergenceCheck& check = sampler_->checks().back();
    context.log.line(
        fmt::format("Generation {}, {} model runs: largest R-hat {:.4g}, least effective sample size {:.0f}",
                    check.generations, check.runs, check.largestRHat(), check.leastEffectiveSize()));
  }
  TaskOutcome outcome = outcomeOf(context);
  logReport(context, outcome.report);
  return outcome;
}

std::optional<TaskOutcome> DreamTask::unfinishedOutcome(const TaskContext& context,
                                                        const UnfinishedBatch& /*made*/) const {
  if (!sampler_ || sampler_->history().generations() == 0) return std::nullopt;
  return outcomeOf(context);
}

}  // namespace mirevo
