#include <algorithm>
#include <cmath>
#include <filesystem>
#include <limits>
#include <set>
#include <span>
#include <utility>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "run/access/file_validation.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/off_grid.h"
#include "run/tasks/optimisation_task.h"

namespace mirevo {
namespace {

constexpr std::string_view kSurrogateKeyword = "Use_Surrogate_Model";
constexpr std::string_view kInvalidEarlierFile = "Error: Earlier result file invalid";

const SettingSection<OptimisationTask>& optimisationSection() {
  static const SettingSection<OptimisationTask> section{
      {"OPTIMISATION_ALGORITHM",
       "when `Option` is 2",
       "Parameter optimisation.",
       {choice<OptimisationTask>(
            [](OptimisationTask& task, const SetupValue& value) { task.method = searchMethods().make(value); },
            {.name = kAlgorithmTypeKeyword,
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
             .defaultValue = "'consecutive'",
             .codes = repetitionOrderNames(),
             .meaning = "One repetition after the other, or all at the same time, which fills slots by searches that "
                        "propose one set at a time. Each finds the same either way."})}}};
  return section;
}

/// The name of a section inside OPTIMISATION_ALGORITHM.
std::string_view nameInside(const SectionRow& row) {
  return row.path.substr(row.path.rfind('/') + 1);
}

/// The other keywords of the section stand in many setups without the surrogate model.
void warnOfUnusedChecks(const SetupSection& target, const SetupSection& section) {
  const SectionRow& surrogate = surrogateSection().row;
  const auto interval = target.peek(surrogate.path, kCheckIntervalKeyword);
  if (!interval || *interval == SetupValue(std::int32_t{0})) return;
  const auto control = section.openIfPresent(nameInside(surrogate));
  if (control) control->warn(kCheckIntervalKeyword, fmt::format("has no effect without {} = 1", kSurrogateKeyword));
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

std::vector<const SectionRow*> OptimisationTask::sections() const {
  std::vector<const SectionRow*> rows{&optimisationSection().row};
  for (const auto& search : searchMethods().all()) rows.push_back(search->section().row);
  rows.insert(rows.end(), {&initialSampleSection().row, &stoppingSection().row, &surrogateSection().row});
  return rows;
}

std::vector<std::string> OptimisationTask::neededSections(const SetupSection& target) const {
  std::vector<std::string> paths{std::string(optimisationSection().row.path)};
  const auto algorithm = target.peek(paths.front(), kAlgorithmTypeKeyword);
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
  if (!isSearch()) {
    section.warn(kSurrogateKeyword, "neither 0 nor 1, no search will be run");
  }
  readMethod(reading, section);
  warnOfOrder(repetitions, section);

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
  requireRepetitions(repetitions, *method, initialSample, section);
  reading.requireScales(method->evaluatesSample(initialSample));

  const SetupSection stops = section.open(nameInside(stoppingSection().row));
  readStopping(stops, reading.variableCount);
  if (surrogateUse == SurrogateUse::yes) {
    readSurrogate(reading, section, stops);
  } else {
    warnOfUnusedChecks(reading.target, section);
  }
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
  if (!sampleText_) return;  // refused before
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
    requireObjectives(section, kAlgorithmTypeKeyword, control, reading.objectives, method->facts().name.name, *pareto);
    keepsFrontSeries_ = pareto->series != FrontSeries::none && hasSeriesOfFront(reading.measures);
  }
  const SearchSpace space = BuildSearchSpace(reading.parameters);
  control.require(method->refusalFor(space));
  for (const SearchDoubt& doubt : method->doubtsIn(space)) control.warn(doubt.keyword, doubt.text);
}

void OptimisationTask::requireResiduals(const TaskReading& reading, const SetupSection& section) const {
  refuseIntegers(reading, method->facts().name.name);
  if (const auto problem = WeightedResiduals::problemOf(reading.measures, reading.objectives)) {
    section.refuse(fmt::format("Error: No residuals for {} algorithm", method->facts().name.name),
                   kAlgorithmTypeKeyword, *problem);
  }
}

void OptimisationTask::warnOfOneLoop(const SetupSection& section) const {
  // Then a value is compared with itself.
  if (!method->testsPopulationRange() || method->facts().findsFront || stopping.loopsConvergence != 1 ||
      !(stopping.minChange > 0.0))
    return;
  section.warn(kLoopsKeyword, "with 1 the search ends after its first loop, use at least 2");
}

/// Of a search whose end is another one, values that a search by one objective would heed.
void OptimisationTask::warnOfUnusedChange(const SetupSection& section) const {
  if (!method->facts().findsFront || !(stopping.minChange > 0.0)) return;
  const double loops = stopping.maxEvaluations / std::max(1.0, method->evaluationsPerLoop());
  if (stopping.loopsConvergence > loops) return;  // a way of saying never
  for (const std::string_view keyword : {kLoopsKeyword, kChangeKeyword}) {
    if (!section.isWritten(keyword)) continue;
    section.warn(keyword, fmt::format("has no effect: {} ends with its budget, or by the keywords "
                                      "Hypervolume_Evaluations and Hypervolume_Change",
                                      method->facts().name.name));
  }
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
  warnOfUnusedChange(section);
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

}  // namespace mirevo
