#include "run/tasks/optimisation_task.h"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <limits>
#include <set>
#include <span>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/lapack_functions.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "measures/statistics.h"
#include "run/access/file_validation.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/off_grid.h"
#include "run/tasks/simulated_room.h"
#include "run/tasks/watched_evaluator.h"

namespace mirevo {
namespace {

constexpr std::string_view kAlgorithmKeyword = "Algorithm_Type";
constexpr std::string_view kWhatGivenSets = "given sets of the initial sample";
constexpr std::string_view kSurrogateKeyword = "Use_Surrogate_Model";
constexpr std::string_view kInvalidEarlierFile = "Error: Earlier result file invalid";

/// Gives every set the value of a failed run.
class NoModel final : public Evaluator {
 public:
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                      DispatchMode /*mode*/) override {
    return std::vector<EvaluationResult>(sets.size());
  }
};

const SettingSection<OptimisationTask>& optimisationSection() {
  static const SettingSection<OptimisationTask> section{
      {"OPTIMISATION_ALGORITHM",
       "when `Option` is 2",
       "Parameter optimisation.",
       {choice<OptimisationTask>(
            [](OptimisationTask& task, const SetupValue& value) { task.method = searchMethods().make(value); },
            {.name = kAlgorithmKeyword,
             .range = between(0, 2),
             .codes = searchMethods().names(),
             .refusal = "Error: Invalid optimisation algorithm type selection",
             .meaning = searchMethods().meanings() + "."}),
        setting<&OptimisationTask::surrogateUse>(
            {.name = kSurrogateKeyword,
             .defaultValue = "0",
             .codes = kNoYesNames,
             .meaning = fmt::format("0 no, 1 yes; for {}. Any other number runs no search.",
                                    searchesWith(&SearchFacts::usesSurrogate, "and"))}),
        setting<OptimisationTask>(
            [](auto& t) -> auto& { return t.repetitions.count; },
            {.name = kRepetitionsKeyword,
             .defaultValue = "1",
             .range = between(1, kMostRepetitions),
             .refusal = "Error: No. of repetitions of the search invalid",
             .unit = "searches",
             .meaning = "How many times the search is made, with Random_Seed and the seeds that follow it. "
                        "Max_No_Evaluations holds for each. The log compares what they have found."}),
        choice<OptimisationTask>(
            [](OptimisationTask& task, const SetupValue& value) { takeRepetitionOrder(task.repetitions, value); },
            {.name = kRepetitionOrderKeyword,
             .defaultValue = kNoDefault,
             .codes = repetitionOrderNames(),
             .meaning = "One repetition after the other, or all at the same time, which fills slots by searches that "
                        "propose one set at a time. Each finds the same either way. Without it, consecutive."})}}};
  return section;
}

/// The range of an integer parameter is never empty.
void refuseEmptyRanges(const TaskReading& reading) {
  for (std::size_t i = 0; i < reading.parameters.size(); ++i) {
    const ModelParameter& parameter = reading.parameters[i];
    if (parameter.parameterType != ParameterType::variable || parameter.lowerBound < parameter.upperBound ||
        parameter.transformationType == TransformationType::integer) {
      continue;
    }
    reading.parameterSections[i].refuse(
        "Error: Lower bound equal to upper bound for parameter " + parameter.name, "Upper_Bound",
        fmt::format("expected more than {} for a search by {}; Parameter_Type = 1 fixes a parameter",
                    parameter.lowerBound, searchesWith(&SearchFacts::needsRanges, "or")));
  }
}

/// Derivatives need parameters that can change by a little.
void refuseIntegers(const TaskReading& reading, std::string_view search) {
  for (std::size_t i = 0; i < reading.parameters.size(); ++i) {
    const ModelParameter& parameter = reading.parameters[i];
    if (parameter.parameterType != ParameterType::variable ||
        parameter.transformationType != TransformationType::integer) {
      continue;
    }
    reading.parameterSections[i].refuse(
        "Error: Integer parameter " + parameter.name + " in a search by derivatives", "Transformation_Type",
        fmt::format("expected 0 or 1 for {}, found an integer parameter, by which there are no derivatives; "
                    "Parameter_Type = 1 fixes it, other searches vary it",
                    search));
  }
}

/// The name of a section inside OPTIMISATION_ALGORITHM.
std::string_view nameInside(const SectionRow& row) {
  return row.path.substr(row.path.rfind('/') + 1);
}

void logValues(RunLog& log, std::string_view heading, std::span<const std::string> names,
               std::span<const double> values) {
  log.line(heading);
  for (std::size_t i = 0; i < names.size() && i < values.size(); ++i) {
    log.line(fmt::format("   {} = {}", names[i], formatReal(values[i])));
  }
}

/// Where the only feasible steps of some parameters are those that leave them as they are.
void warnOfHeldParameters(const TaskContext& context, const SearchSummary& summary) {
  if (summary.heldParameters.empty()) return;
  std::string names;
  for (const std::size_t j : summary.heldParameters) {
    names += fmt::format("{}{}", names.empty() ? "" : ", ", context.space.names[j]);
  }
  context.log.warning(fmt::format(
      "Constraints or equations have kept parameters at one value or close to it, as every larger change of them was "
      "replaced: {}. A parameter that must equal an expression of others is one with Parameter_Type = 2",
      names));
}

/// Where most of a search is one set again and again: constraints with two equal sides, or bounds that they meet.
/// A population of equal points proposes nothing else, so that only those of its sample count.
bool warnOfNoWidth(const TaskContext& context, const SearchSummary& summary, std::int64_t populationSize) {
  const std::int64_t returned = 2 * std::int64_t{summary.returnedCount};
  const std::int64_t proposed =
      populationSize > 0 ? std::min<std::int64_t>(populationSize, summary.evaluationCount) : summary.evaluationCount;
  if (returned == 0 || returned < proposed || returned < summary.replacedCount) return false;
  context.log.warning(fmt::format(
      "{} of {} points that cannot be run could only be replaced by a set already evaluated: do "
      "constraints and equations leave any width? A parameter that must equal an expression of others is one with "
      "Parameter_Type = 2",
      summary.returnedCount, summary.replacedCount));
  return true;
}

/// The values of statistics that enter an objective function otherwise than as they are.
void logCriteria(const TaskContext& context, const EvaluationResult& result) {
  bool hasAny = false;
  for (std::size_t i = 0; i < context.measures.size() && i < result.measureValues.size(); ++i) {
    const OutputMeasure& measure = context.measures[i];
    if (!isCriterion(measure)) continue;
    if (!std::exchange(hasAny, true)) context.log.line("Output measures:");
    context.log.line(fmt::format("   {} = {} ({}, best {})", measure.name, formatReal(result.measureValues[i]),
                                 describeStatistic(measure), bestValue(measure)));
  }
}

void logBestSet(const TaskContext& context, const ParameterSet& best, const EvaluationResult& result) {
  std::vector<std::string> objectives;
  for (const ObjectiveFunction& objective : context.objectives) objectives.push_back(objective.name);
  const std::vector<double> values = ToModelScale(context.space, best);
  logValues(context.log, "Best parameter set:", context.space.names, values);
  const std::vector<std::string> others =
      context.otherParameters ? context.otherParameters(values) : std::vector<std::string>();
  if (!others.empty()) context.log.line("With it:");
  for (const std::string& text : others) context.log.line("   " + text);
  logCriteria(context, result);
  logValues(context.log, "Objective functions:", objectives, result.objectiveValues);
  context.log.line(fmt::format("Aggregate: {}", formatReal(result.aggregate)));
}

/// "Algorithm_Type = 'PSE', 'PDDS', 'OPSE' or 'CMA-ES', or ..."
std::string waysToRunSeveral() {
  std::string text = fmt::format("{} = {}", kAlgorithmKeyword, searchesWith(&SearchFacts::runsInParallel, "or", "'"));
  for (const auto& search : searchMethods().all()) {
    const SearchFacts& facts = search->facts();
    if (facts.runsAtOnceUnderMpi.empty()) continue;
    text += fmt::format(", or a job of several processes (MPI), in which {} runs {} at once", facts.name.name,
                        facts.runsAtOnceUnderMpi);
  }
  return text;
}

void warnOffGrid(const ModelParameter& parameter, std::span<const double> values, const SetupSection& section,
                 std::string_view keyword) {
  const auto isOff = [&parameter](double value) { return !isOnGrid(parameter, value); };
  const auto first = std::find_if(values.begin(), values.end(), isOff);
  if (first == values.end()) return;
  const auto count = std::count_if(first, values.end(), isOff);
  section.warn(keyword, fmt::format("{} of the {} values of the integer parameter {} {} between its steps: {} {}",
                                    count, values.size(), quotedForMessage(parameter.name), count == 1 ? "is" : "are",
                                    formatReal(*first), offGridText(parameter, *first)));
}

}  // namespace

const TaskFacts& OptimisationTask::facts() const {
  static constexpr TaskFacts kFacts{{2, "optimisation"}, "parameter optimisation", run_files::kOptimisation};
  return kFacts;
}

std::vector<const SectionRow*> OptimisationTask::sections() const {
  std::vector<const SectionRow*> rows{&optimisationSection().row};
  for (const auto& search : searchMethods().all()) rows.push_back(search->section().row);
  rows.insert(rows.end(), {&initialSampleSection().row, &stoppingSection().row, &surrogateSection().row});
  return rows;
}

std::vector<std::string> OptimisationTask::neededSections(const SetupSection& target) const {
  std::vector<std::string> paths{std::string(optimisationSection().row.path)};
  const auto algorithm = target.peek(paths.front(), kAlgorithmKeyword);
  const auto chosen = algorithm ? searchMethods().make(*algorithm) : nullptr;
  if (chosen) paths.emplace_back(chosen->section().row->path);
  paths.emplace_back(initialSampleSection().row.path);
  paths.emplace_back(stoppingSection().row.path);
  const bool hasSurrogate = target.peek(paths.front(), kSurrogateKeyword) == SetupValue(std::int32_t{1});
  if (hasSurrogate) paths.emplace_back(surrogateSection().row.path);
  return paths;
}

void OptimisationTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open("OPTIMISATION_ALGORITHM");
  section.read(optimisationSection(), *this);
  if (surrogateUse != SurrogateUse::no && surrogateUse != SurrogateUse::yes) {
    section.warn(kSurrogateKeyword, "neither 0 nor 1, no search will be run");
  }
  readMethod(reading, section);
  requireRepetitions(repetitions, method->facts(), section);

  const SetupSection sample = section.open(nameInside(initialSampleSection().row));
  InitialSampleSection filled{initialSample, randomSeed};
  sample.read(initialSampleSection(), filled);
  warnOfUnusedSample(sample);
  if (initialSample.generation == SampleGeneration::fromFile) {
    if (!initialSample.earlierFile.empty()) {
      sample.refuse(
          kInvalidEarlierFile, kEarlierFileKeyword,
          "expected this or Initial_Sample_Generation = 4, found both. Leave out the latter, and sets of this file "
          "begin the sample, in which the others are drawn; or leave out this keyword, and all sets are those of "
          "Initial_Sample_File_Name");
    }
    validateFileOpens(initialSample.fileName, kInitialSampleFileKeyword, sample);
    if (method->facts().drawsInitialSample) takeGivenValues(reading, sample);
  } else if (!initialSample.fileName.empty()) {
    sample.warn(kInitialSampleFileKeyword, fmt::format("not read, as Initial_Sample_Generation is {} and not 4",
                                                       static_cast<int>(initialSample.generation)));
  }
  readEarlierResults(reading, sample);
  reading.requireScales(method->evaluatesSample(initialSample));

  const SetupSection stops = section.open(nameInside(stoppingSection().row));
  readStopping(stops, reading.variableCount);
  if (surrogateUse == SurrogateUse::yes) readSurrogate(reading, section, stops);
}

/// A setup that names no way of drawing means none in particular.
void OptimisationTask::warnOfUnusedSample(const SetupSection& section) const {
  constexpr std::string_view kKeyword = "Initial_Sample_Generation";
  const bool isWanted = initialSample.generation != SampleGeneration::uniformRandom && section.isWritten(kKeyword);
  if (method->facts().drawsInitialSample || !isWanted) return;
  if (!initialSample.earlierFile.empty()) {
    section.warn(kKeyword, fmt::format("{} has no effect: {} starts from given sets alone",
                                       static_cast<int>(initialSample.generation), method->facts().longName));
    return;
  }
  section.warn(kKeyword, fmt::format("{} has no effect: {} {}", static_cast<int>(initialSample.generation),
                                     method->facts().longName,
                                     method->evaluatesSample(initialSample) ? "draws its start points uniformly"
                                                                            : "starts from the initial values alone"));
}

/// The values of the sample file, which runs get exactly.
void OptimisationTask::takeGivenValues(const TaskReading& reading, const SetupSection& section) {
  std::string reason;
  sampleText_ = readTextFile(initialSample.fileName, reason);
  if (!sampleText_) return;  // likewise
  const SearchSpace space = BuildSearchSpace(reading.parameters);
  GivenSample sample;
  try {
    sample = readInitialSample(initialSample.fileName, *sampleText_, space);
  } catch (const FatalError&) {
    return;  // refused later: bounds with the other parameters, the file by requireSets()
  }
  keepAsGiven(reading, sample.modelScale, section, kInitialSampleFileKeyword);
  const std::size_t distinct = std::set<ParameterSet>(sample.sets.begin(), sample.sets.end()).size();
  if (distinct == sample.sets.size()) return;
  const bool hasOther = initialSample.includeInitialParameters && sample.sets.front() != space.initial;
  const char* const meaning = hasOther ? "with the initial set the sample has two different points"
                                       : "a search proposes nothing else among equal points";
  section.warn(kInitialSampleFileKeyword,
               distinct == 1 ? fmt::format("its {} sets are the same: {}", sample.sets.size(), meaning)
                             : fmt::format("{} of its {} sets {}", sample.sets.size() - distinct, sample.sets.size(),
                                           sample.sets.size() - distinct == 1 ? "is a repetition of another"
                                                                              : "are repetitions of others"));
}

void OptimisationTask::keepAsGiven(const TaskReading& reading, std::span<const ParameterSet> modelScale,
                                   const SetupSection& section, std::string_view keyword) {
  std::size_t variable = 0;
  for (const ModelParameter& parameter : reading.parameters) {
    std::vector<double>& values = givenValues_.emplace_back();
    if (parameter.parameterType != ParameterType::variable) continue;
    for (const ParameterSet& set : modelScale) values.push_back(set[variable]);
    ++variable;
    warnOffGrid(parameter, values, section, keyword);
  }
}

/// Sets of an earlier run, which begin the sample.
void OptimisationTask::readEarlierResults(const TaskReading& reading, const SetupSection& section) {
  const std::string& file = initialSample.earlierFile;
  if (file.empty()) {
    for (const std::string_view keyword : {kEarlierOrderKeyword, kEarlierSetsKeyword}) {
      if (section.isWritten(keyword))
        section.warn(keyword, fmt::format("has no effect without {}", kEarlierFileKeyword));
    }
    return;
  }
  validateFileOpens(file, kEarlierFileKeyword, section);
  std::error_code none;
  if (std::filesystem::equivalent(file, runFilePath(reading.filePrefix, facts().resultFiles.results), none)) {
    section.refuse(kInvalidEarlierFile, kEarlierFileKeyword,
                   "expected another file than the one that this run writes: copy it, with the one ending in "
                   "_Restart.dat, under another name");
  }
  const std::int64_t population = method->populationSize();
  const bool hasInitial = initialSample.includeInitialParameters;
  const std::int64_t room =
      population > 0 ? population - (hasInitial ? 1 : 0) : std::numeric_limits<std::int32_t>::max();
  std::int64_t most = initialSample.mostEarlierSets;
  if (most == 0) most = population > 0 ? room : 1;
  if (most > room) {
    section.warn(kEarlierSetsKeyword,
                 fmt::format("only {} of {} sets can be used by a population of {}", room, most, population));
  }
  std::string reason;
  const std::string text = readTextFile(file, reason).value_or(std::string());
  const std::string settings =
      readTextFile(runFilePath(std::string(file, 0, file.rfind(".dat")), run_files::restartFile("_Restart")), reason)
          .value_or(std::string());
  const SearchSpace space = BuildSearchSpace(reading.parameters);
  auto sets =
      readEarlierSets(file, text, settings, initialSample.earlierOrder, static_cast<std::size_t>(std::min(most, room)),
                      space, hasInitial ? std::optional(space.initial) : std::nullopt, reason);
  if (!sets) section.refuse(kInvalidEarlierFile, kEarlierFileKeyword, reason);
  if (sets->outsideCount > 0) {
    section.warn(kEarlierFileKeyword,
                 fmt::format("{} left out, as values lie outside the bounds; the first: {}",
                             countText(sets->outsideCount, "set") + (sets->outsideCount == 1 ? " is" : " are"),
                             sets->firstOutside));
  }
  earlierSets_ = *std::move(sets);
  initialSample.earlierSetCount = earlierSets_.sets.size();
  keepAsGiven(reading, earlierSets_.modelScale, section, kEarlierFileKeyword);
}

std::vector<double> OptimisationTask::givenValues(std::size_t parameter) const {
  return parameter < givenValues_.size() ? givenValues_[parameter] : std::vector<double>{};
}

void OptimisationTask::readMethod(const TaskReading& reading, const SetupSection& section) {
  if (method->facts().needsRanges) refuseEmptyRanges(reading);
  const BoundSection bound = method->section();
  const SetupSection control = section.open(nameInside(*bound.row));
  control.read(bound);
  method->setVariableCount(reading.variableCount);
  // A population or simplex that is too small spans too few directions and converges early, away from the optimum.
  for (const SearchAdvice& advice : method->advice(reading.variableCount)) {
    if (advice.found >= advice.advised) continue;
    control.warn(advice.keyword, fmt::format("found {}, at least {} are advised for the number of variable parameters",
                                             advice.found, advice.advised));
  }
  for (const SearchDoubt& doubt : method->doubts()) control.warn(doubt.keyword, doubt.text);
  if (method->facts().usesResiduals) requireResiduals(reading, section);
  if (const ParetoSettings* const pareto = method->paretoSettings()) {
    requireObjectives(section, kAlgorithmKeyword, control, reading.objectives, method->facts().name.name, *pareto);
    keepsFrontSeries_ = pareto->series != FrontSeries::none && hasSeriesOfFront(reading.measures);
  }
  control.require(method->refusalFor(BuildSearchSpace(reading.parameters)));
}

std::optional<KeptSteps> OptimisationTask::keptSteps() const {
  if (!keepsFrontSeries_ || method->paretoSettings()->series != FrontSeries::steps) return std::nullopt;
  return KeptSteps{};
}

void OptimisationTask::requireResiduals(const TaskReading& reading, const SetupSection& section) const {
  refuseIntegers(reading, method->facts().name.name);
  if (const auto problem = WeightedResiduals::problemOf(reading.measures, reading.objectives)) {
    section.refuse(fmt::format("Error: No residuals for {} algorithm", method->facts().name.name), kAlgorithmKeyword,
                   *problem);
  }
}

void OptimisationTask::warnOfOneLoop(const SetupSection& section) const {
  // Then a value is compared with itself.
  if (method->populationSize() == 0 || stopping.loopsConvergence != 1 || !(stopping.minChange > 0.0)) return;
  section.warn("No_Loops_Convergence", "with 1 the search ends after its first loop, use at least 2");
}

void OptimisationTask::readStopping(const SetupSection& section, std::size_t variableCount) {
  const BoundSection bound(stoppingSection(), stopping);
  section.take(bound);
  if (const std::string_view refusal = method->budgetRefusal(); !refusal.empty() && stopping.maxEvaluations < 1) {
    section.refuse(refusal, kBudgetKeyword, fmt::format("expected 1 or more, found {}", stopping.maxEvaluations));
  }
  section.check(bound);
  requireRepeatedBudget(repetitions, stopping, section);
  warnOfOneLoop(section);
  if (section.isWritten(kRangeKeyword) && (!method->testsPopulationRange() || method->facts().findsFront)) {
    section.warn(kRangeKeyword,
                 fmt::format("has no effect: {} does not test the range of a population", method->facts().longName));
  }
  const std::int64_t population = method->populationSize();
  if (const auto tooMany = tooManySets(std::min<std::int64_t>(population, stopping.maxEvaluations), variableCount)) {
    section.refuse("Error: Unable to allocate memory in MIREVO setup", kBudgetKeyword,
                   fmt::format("{}, found {} = {} and Max_No_Evaluations = {}", *tooMany,
                               method->facts().populationKeywords, population, stopping.maxEvaluations));
  }
  const std::int64_t sampleSize = method->sampleSize(initialSample, stopping.maxEvaluations);
  if (sampleSize > stopping.maxEvaluations) {
    section.warn(kBudgetKeyword, fmt::format("the initial sample of {} sets is cut to {}, and no search follows",
                                             sampleSize, stopping.maxEvaluations));
  } else if (sampleSize == stopping.maxEvaluations && population == 0) {
    // A population that just fits may be meant as a sample.
    section.warn(kBudgetKeyword, fmt::format("{} used up by the start of the search, and no search follows",
                                             sampleSize == 1 ? "the only evaluation is"
                                                             : fmt::format("the {} evaluations are", sampleSize)));
  }
}

void OptimisationTask::readSurrogate(const TaskReading& reading, const SetupSection& section,
                                     const SetupSection& stoppingSection) {
  const std::string_view name = nameInside(surrogateSection().row);
  if (!usesSurrogate() && !section.has(name)) {
    section.refuse(fmt::format("Error: Unable to open section {} in KDX file", name), kSurrogateKeyword,
                   fmt::format("{} uses no surrogate model: expected 0. With 1 the section is needed, though it has no "
                               "effect",
                               method->facts().longName));
  }
  const SetupSection control = section.open(name);
  SurrogateSection filled{surrogate, reading.variableCount};
  control.read(surrogateSection(), filled);
  if (!usesSurrogate()) {
    section.warn(kSurrogateKeyword,
                 fmt::format("{} uses no surrogate model: the search is the same as with 0, and the settings of the "
                             "model have no effect",
                             method->facts().longName));
    return;
  }
  const double available = evaluationsAfter(*method, surrogate.initialGenerations);
  control.require(validateSurrogateControl(surrogate, available));
  // Warns if the budget is used up before the surrogate model has enough evaluated sets.
  const auto sample = static_cast<double>(method->populationSize());
  const auto sets = static_cast<double>(leastSetCount(surrogate, reading.variableCount));
  const double initialLoops = surrogate.initialGenerations;
  const double before = std::max(sets, evaluationsAfter(*method, std::max(method->loopsBefore(sets), initialLoops)));
  const std::int32_t budget = stopping.maxEvaluations;
  if (budget <= sample || budget > before) return;  // without a loop the surrogate would not be used anyway
  stoppingSection.warn(
      kBudgetKeyword,
      fmt::format("found {}, the surrogate model chooses nothing before {} model evaluations: it waits for "
                  "No_Initial_Generations = {}, and a {} for {} sets",
                  budget, before, surrogate.initialGenerations, surrogateModelName(surrogate), sets));
}

std::string OptimisationTask::description() const {
  return fmt::format("Parameter optimisation: {}{}{}", method->facts().longName,
                     usesSurrogate() ? " with surrogate model" : "",
                     repetitions.count > 1 ? fmt::format(", {} repetitions", repetitions.count) : "");
}

std::vector<std::string> OptimisationTask::summaryLines(const SearchSpace& space) const {
  std::vector<std::string> lines;
  if (!initialSample.earlierFile.empty()) {
    lines.push_back(fmt::format("Initial sample: {} of {}, {} of {}, run anew",
                                countText(earlierSets_.sets.size(), "set"), initialSample.earlierFile,
                                initialSample.earlierOrder == EarlierOrder::best ? "the best" : "the first",
                                countText(earlierSets_.successCount, "successful evaluation")));
  }
  if (repetitions.count > 1) lines.push_back(repetitionsText(repetitions, stopping, randomSeed));
  if (!usesSurrogate()) return lines;
  lines.push_back(fmt::format(
      "Surrogate model: {} fitted to the {} nearest sets, chooses {} of {} proposals; loops without it: {}{}",
      surrogateModelName(surrogate), neighbourhoodSize(surrogate, space.size()), method->facts().modelChooses,
      proposalsPerRun(surrogate), surrogate.initialGenerations,
      surrogate.checkInterval > 0 ? fmt::format(", then one in {}", surrogate.checkInterval) : ""));
  return lines;
}

std::optional<OneSlotOnly> OptimisationTask::needsOneSlot() const {
  if (method->facts().runsInParallel || repetitions.areSideBySide()) return std::nullopt;
  const std::string order =
      repetitions.count > 1 ? fmt::format("{} = 'side by side', ", kRepetitionOrderKeyword) : std::string();
  return OneSlotOnly{"Error: Use Population Simplex Evolution algorithm for application with multiple processors",
                     kAlgorithmKeyword, order + waysToRunSeveral()};
}

int OptimisationTask::mostAtOnce() const {
  std::int64_t most = method->mostAtOnce();
  if (repetitions.areSideBySide()) {
    const SearchFacts& facts = method->facts();
    if (most == 0 && !facts.runsInParallel && facts.runsAtOnceUnderMpi.empty()) most = 1;
    most *= repetitions.count;
  }
  return most == 0 ? plannedEvaluations() : static_cast<int>(std::min<std::int64_t>(most, plannedEvaluations()));
}

/// The sets of the initial sample that are not drawn, but for the initial values; search scale.
std::vector<ParameterSet> OptimisationTask::givenSample(const SearchSpace& space) const {
  if (!method->facts().drawsInitialSample || initialSample.generation != SampleGeneration::fromFile) {
    return earlierSets_.sets;
  }
  return sampleText_ ? readInitialSample(initialSample.fileName, *sampleText_, space).sets
                     : loadInitialSample(initialSample.fileName, space).sets;
}

/// The first sets of the search, as far as they are not drawn.
std::vector<ParameterSet> OptimisationTask::givenSets(const SearchSpace& space) const {
  std::vector<ParameterSet> given;
  if (initialSample.includeInitialParameters) given.push_back(searchBounds(space).initial);
  for (ParameterSet& set : givenSample(space)) given.push_back(std::move(set));
  const std::int64_t population = method->populationSize();
  const auto most = static_cast<std::size_t>(
      std::min<std::int64_t>(population > 0 ? population : std::ssize(given), stopping.maxEvaluations));
  if (given.size() > most) given.resize(most);
  return given;
}

std::vector<std::string> OptimisationTask::setDoubts(const SearchSpace& space, const Feasibility& feasibility) const {
  if (!method || !feasibility.isTested()) return {};
  return infeasibleSets(feasibility, givenSets(space), kWhatGivenSets, stopping.maxEvaluations).texts();
}

SearchProblem OptimisationTask::problemOf(const SearchSpace& space, const Feasibility& feasibility,
                                          Evaluator& evaluator, UniformGenerator& random) const {
  SearchProblem problem{searchBounds(space), stopping, initialSample, {}, evaluator, random};
  problem.earlierSearches = earlierSearches_;
  problem.givenSample = givenSample(space);
  problem.feasibility = feasibility;
  return problem;
}

/// Begins the same search with a generator of its own and without a model.
void OptimisationTask::requireSets(const SearchSpace& space, const Feasibility& feasibility) const {
  if (method->facts().usesResiduals || usesSurrogate()) lapack();
  const bool drawsAnySet = !feasibility.isTested() && initialSample.generation != SampleGeneration::fromFile;
  const bool isSearch = surrogateUse == SurrogateUse::no || surrogateUse == SurrogateUse::yes;
  if (drawsAnySet || !isSearch || !earlierSearches_.empty()) return;            // a search that is continued had begun
  const std::int32_t samples = feasibility.isTested() ? repetitions.count : 1;  // otherwise all are alike
  for (std::int32_t i = 0; i < samples; ++i) {
    UniformGenerator random(repetitionSeed(randomSeed, i));
    NoModel evaluator;
    SearchProblem problem = problemOf(space, feasibility, evaluator, random);
    ParetoProblem pareto;
    problem.pareto = &pareto;
    method->make(std::move(problem))->initialise();
  }
}

SearchSummary OptimisationTask::search(const TaskContext& context, Evaluator& evaluator, std::int32_t seed,
                                       const PeriodicStep& step) {
  UniformGenerator random(seed);
  SearchProblem problem = problemOf(context.space, context.feasibility, evaluator, random);
  std::optional<ProposalSelector> selector;
  if (usesSurrogate()) problem.selector = &selector.emplace(surrogate, problem.bounds, problem.feasibility);
  if (fitting_) problem.residuals = &fitting_->problem();
  if (front_) problem.pareto = &front_->problem();
  return method->run(std::move(problem), step);
}

SearchSummary OptimisationTask::searchAll(const TaskContext& context) {
  if (context.feasibility.isTested()) {
    warnOfInfeasibleSets(context, givenSets(context.space), kWhatGivenSets, stopping.maxEvaluations);
  }
  if (repetitions.count > 1) {
    repeated_.emplace(repetitions, randomSeed);
    return repeated_->run(
        context,
        [&](Evaluator& evaluator, std::int32_t seed, const PeriodicStep& step) {
          return search(context, evaluator, seed, step);
        },
        [&](const SearchSummary& summary, const BestCourse& course) { logEnd(context, summary, course); });
  }
  WatchedEvaluator evaluator(context.evaluator);
  SearchSummary summary =
      search(context, evaluator, randomSeed, [&context](std::string_view line) { context.log.reportLine(line); });
  context.log.line("");
  logEnd(context, summary, evaluator.course());
  return summary;
}

/// Why a search has ended, and what is to be said of its course.
void OptimisationTask::logEnd(const TaskContext& context, const SearchSummary& summary,
                              const BestCourse& course) const {
  for (const std::string& note : summary.notes) context.log.line(note);
  context.log.line(summary.terminationMessage);
  for (const std::string& line : linesOfCourse(course, summary.terminationMessage)) context.log.line(line);
  if (summary.replacedCount > 0) {
    context.log.line(fmt::format(
        "Proposed points that cannot be run (a constraint is violated, or an equation has no finite value) and were "
        "replaced before their evaluation: {}",
        summary.replacedCount));
  }
  if (!warnOfNoWidth(context, summary, method->populationSize())) warnOfHeldParameters(context, summary);
}

TaskOutcome OptimisationTask::run(const TaskContext& context) {
  if (surrogateUse != SurrogateUse::no && surrogateUse != SurrogateUse::yes) return {std::string(kEndOfTask)};

  if (method->facts().usesResiduals) {
    lapack();  // missed before the model runs, if ever
    fitting_ = std::make_unique<ResidualFitting>(context);
    if (const auto text = fitting_->otherMeasuresText(context)) context.log.warning(*text);
  }
  if (const ParetoSettings* const pareto = method->paretoSettings()) {
    front_ = std::make_unique<FrontFinding>(*pareto);
    if (keepsFrontSeries_) {
      logRoomOfSimulatedValues(context, facts().resultFiles.simulatedValues,
                               static_cast<std::size_t>(stopping.maxEvaluations));
    }
  }
  SearchSummary summary = searchAll(context);
  TaskOutcome outcome{summary.terminationMessage};
  if (repeated_) {
    repeated_->addResults(context.space, outcome);
    for (const std::string& line : outcome.report) context.log.reportLine(line);
    context.log.line("");
  }
  if (summary.best.empty()) return outcome;
  const FrontMember* const suggested = front_ ? front_->suggested() : nullptr;
  if (suggested != nullptr) summary.finalRunOf = suggested->number;
  if (context.searchEnded) context.searchEnded(summary);
  logBestSet(context, summary.best, summary.bestResult);
  if (fitting_) {
    fitting_->addCovariance(context, outcome);
    logReport(context, outcome.report);
  }
  if (front_) {
    front_->addFront(context, summary.bestResult.number, outcome);
    logReport(context, outcome.report);
  }
  context.log.line("");
  context.log.line(suggested == nullptr ? "Final model run with the best parameter set:"
                                        : fmt::format("Final model run with the suggested compromise, evaluation {}:",
                                                      suggested->number));
  const std::vector<ParameterSet> last{suggested == nullptr ? summary.best : suggested->set};
  context.evaluator.evaluateParameterSets(last, DispatchMode::finalRun);
  return outcome;
}

std::vector<std::string> OptimisationTask::linesOfCourse(const BestCourse& course, std::string_view message) const {
  const bool isBudgetUsed = message == kBudgetUsedMessage;
  return front_ ? front_->courseLines(isBudgetUsed) : courseLines(course, isBudgetUsed);
}

std::optional<TaskOutcome> OptimisationTask::unfinishedOutcome(const TaskContext& context,
                                                               const UnfinishedBatch& made) const {
  if (repeated_) {
    TaskOutcome outcome{std::string(kEndOfTask)};
    RepeatedSearch all = *repeated_;
    all.takeUnfinished(context, made);
    all.addResults(context.space, outcome);
    return outcome;
  }
  if (front_ && front_->hasFront()) {
    TaskOutcome outcome{std::string(kEndOfTask)};
    front_->addFront(context, 0, outcome);
    return outcome;
  }
  if (!fitting_ || !fitting_->hasDerivatives()) return std::nullopt;
  TaskOutcome outcome{std::string(kEndOfTask)};
  fitting_->addCovariance(context, outcome);
  return outcome;
}

std::optional<int> OptimisationTask::evaluationsInBatches() const {
  if (repeated_) return repeated_->evaluationCount();
  if (front_) return front_->evaluationCount();
  if (!fitting_ || !fitting_->hasDerivatives()) return 0;
  return fitting_->problem().evaluationCount;
}

TaskReport OptimisationTask::report() const {
  TaskReport report;
  report.algorithm = method->facts().name.name;
  report.populationSize = static_cast<int>(method->populationSize());
  if (usesSurrogate()) report.surrogate = surrogateModelName(surrogate);
  return report;
}

std::optional<RaisedBudget> OptimisationTask::raisedBudget(const SearchHistory& history) const {
  if (auto raised = raisedRepetitions(repetitions, stopping, history)) return raised;
  if (stopping.maxEvaluations <= history.budget) return std::nullopt;
  return method->raiseBudget(history, stopping, initialSample);
}

}  // namespace mirevo
