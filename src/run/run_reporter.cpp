#include "run/run_reporter.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/progress_messages.h"
#include "common/run_files.h"
#include "common/short_list.h"
#include "common/text.h"
#include "platform/terminal/front_end.h"

namespace mirevo {
namespace {

/// Of each kind in the result file; as warnings in the log, behind which the others are plain lines.
constexpr std::size_t kMostDifferencesShown = 20;
/// Model runs of which the log says that they left processes, or left a file out.
constexpr int kMostLeftShown = 20;

const DifferenceTexts& textsOf(RunDifference::Kind kind) {
  const std::span<const DifferenceTexts> all = differenceTexts();
  return *std::find_if(all.begin(), all.end(), [kind](const DifferenceTexts& texts) { return texts.kind == kind; });
}

}  // namespace

RunReporter::RunReporter(RunState& state, ResultFile& results, FailedRunFile& failedRuns, const SearchSpace& space,
                         SimulatedValuesFile* simulatedValues, PairsFile* pairs, UnkeptFiles* unkeptFiles,
                         std::vector<MeasureSource> sources)
    : state_(state),
      results_(results),
      failedRuns_(failedRuns),
      space_(space),
      simulatedValues_(simulatedValues),
      pairs_(pairs),
      unkeptFiles_(unkeptFiles),
      sources_(std::move(sources)),
      initial_(ToModelScale(space, space.initial)) {}

void RunReporter::message(std::string_view text) {
  state_.log.line(text);
  state_.progress.writeMessage(text);
}

void RunReporter::warning(std::string_view text) {
  state_.log.warning(text);
}

void RunReporter::urgentWarning(std::string_view text) {
  state_.log.warning(text);
  state_.lastTold = text;
  showMessage(text, {}, MessageType::warning);
}

/// The first one is warned of, some more are plain lines, and the others are counted alone.
void RunReporter::processesLeft(std::string_view text) {
  ++runsWithProcessesLeft_;
  if (runsWithProcessesLeft_ == 1) {
    state_.log.warning(text);
  } else if (runsWithProcessesLeft_ <= kMostLeftShown) {
    state_.log.line("   " + std::string(text));
  }
}

void RunReporter::runLost(std::string_view text) {
  ++lostRunCount_;
  state_.log.warning(text);
}

std::optional<std::string> RunReporter::processesLeftWarning() const {
  if (runsWithProcessesLeft_ <= 1) return std::nullopt;
  return fmt::format(
      "{} model runs left processes running; the log names {}", runsWithProcessesLeft_,
      runsWithProcessesLeft_ <= kMostLeftShown ? "them" : fmt::format("those of the first {}", kMostLeftShown));
}

/// Of each file, as those model runs are often all of them.
void RunReporter::fileAbsent(const std::string& name, std::string_view text) {
  const int count = ++absences_[name];
  if (count == 1) {
    state_.log.warning(text);
  } else if (count <= kMostLeftShown) {
    state_.log.line("   " + std::string(text));
  }
}

std::string RunReporter::absentWarning() const {
  constexpr std::size_t kMostNamed = 5;
  ShortList list(kMostNamed);
  for (const auto& [name, runs] : absences_) {
    if (runs > 1) list.add(fmt::format("{} ({} model runs)", name.substr(1), runs));
  }
  if (list.isEmpty()) return {};
  return "Output files to be kept that model runs have not left: " + list.text();
}

void RunReporter::recordEvaluation(std::span<const double> set, const EvaluationResult& result) {
  record(ToModelScale(space_, set), result, std::nullopt);
}

void RunReporter::recordRepeat(std::span<const double> set, const EvaluationResult& result, int original) {
  record(ToModelScale(space_, set), result, original);
  ++repeatCount_;
  if (isReplayedWithoutPairs(original)) noteReplayWithoutPairs(result.number);
}

bool RunReporter::recall(int number, std::span<const double> set, EvaluationResult& result) {
  auto row = results_.rowOf(number);
  const auto isSame = [](double a, double b) {
    return std::bit_cast<std::uint64_t>(a) == std::bit_cast<std::uint64_t>(b);
  };
  if (!row || !row->ok || !std::ranges::equal(row->parameters, ToModelScale(space_, set), isSame)) return false;
  result.measureValues = std::move(row->measures);
  result.objectiveValues = std::move(row->objectives);
  result.validationValues = std::move(row->validation);
  if (const auto judged = judged_.find(number); judged != judged_.end()) {
    result.validationPairs = judged->second.pairs;
  }
  if (pairs_ != nullptr && pairs_->has(number)) result.pairs = pairs_->pairs().at(number);
  if (simulatedValues_ != nullptr) {
    result.simulatedValues = simulatedValues_->valuesOf(number);
    result.exactMeasures = simulatedValues_->exactMeasuresOf(number);
  }
  return true;
}

void RunReporter::record(const std::vector<double>& values, const EvaluationResult& result,
                         std::optional<int> repeats) {
  if (settings_ != nullptr) {
    if (const std::string text = settings_->keep(); !text.empty()) warning(text);
  }
  // The row is written last: if it is on disk, all that belongs to it is, too, whenever the program ends.
  if (!result.ok()) failedRuns_.add(values, result);
  if (result.ok() && simulatedValues_ != nullptr) simulatedValues_->add(values, result);
  if (!result.pairs.empty() && pairs_ != nullptr) pairs_->add(result.number, result.pairs);
  ResultRow row = resultRow(values, result);
  row.repeats = repeats;
  results_.addRow(std::move(row));
}

void RunReporter::recordUnkeptFiles(int number, std::span<const UnkeptFile> files) {
  if (unkeptFiles_ != nullptr) unkeptFiles_->add(number, files);
}

void RunReporter::evaluationFinished(std::span<const double> set, const EvaluationResult& result) {
  if (!result.ok()) state_.log.line("   " + result.failure->reason);  // follows the message that it failed
  const std::vector<double> values = ToModelScale(space_, set);
  count(values, result, dateAndTimeWithZone());
  if (const std::string text = valuesText(result); !text.empty()) state_.log.line("   " + text);
  lastWithPairs_ = {result.number, values};
  if (searchHasEnded_ && result.ok()) {
    finalRun_ = result.number;
    compareFinalRun(result);
  } else if (searchHasEnded_) {
    warnOfFailedFinalRun(result.failure->reason);
  }
  recordSeries(values, result);
  if (improved_ && best() && best()->number == result.number) improved_(result);
  state_.progress.progressStep();
  if (const std::string problem = state_.progress.takeProblem(); !problem.empty()) state_.log.warning(problem);
  requireLogWritten();
}

void RunReporter::evaluationReplayed(std::span<const double> set, const EvaluationResult& result) {
  ++replayedCount_;
  if (results_.isRepeat(result.number)) ++repeatCount_;
  state_.progress.progressReplayed(result.number, result.ok());
  // It is computed again from the objective functions; what the earlier run's file says need not be true.
  if (result.ok() && !std::isnan(result.aggregate)) results_.replaceAggregate(result.number, result.aggregate);
  // They were lost, and its model run was repeated for them.
  const bool lacksPairs = pairs_ != nullptr && !result.pairs.empty() && !pairs_->has(result.number);
  if (lacksPairs) pairs_->add(result.number, result.pairs);
  const std::vector<double> values = ToModelScale(space_, set);
  if (searchHasEnded_ && result.ok()) compareFinalRun(result);
  if (result.pairs.empty()) {
    noteReplayWithoutPairs(result.number);
  } else {
    lastWithPairs_ = {result.number, values};
    if (searchHasEnded_ && result.ok()) finalRun_ = result.number;
  }
  count(values, result, {});
  if (!result.shownSeries.empty()) {
    recordSeries(values, result);
  } else if (result.ok() && recorder_ != nullptr) {
    EvaluationResult passed = result;
    if (readsSimulatedValues()) passed.simulatedValues = simulatedValues_->valuesOf(result.number);
    recorder_->evaluationPassed(passed, values, best());
  }
}

int RunReporter::numberOfFinalSet() const {
  if (finalRunOf_ != 0) return finalRunOf_;
  return best() ? best()->number : 0;
}

void RunReporter::warnOfFailedFinalRun(const std::string& reason) {
  const int number = numberOfFinalSet();
  if (number == 0) return;
  urgentWarning(fmt::format(
      "The final model run has failed, and evaluation No. {} of the same set has not: {}. Its process folder "
      "lacks the results of the set. With Restart = 1 it is made again",
      number, reason));
}

void RunReporter::compareFinalRun(const EvaluationResult& result) {
  const int number = numberOfFinalSet();
  if (number == 0) return;
  std::string reason;
  const auto row = results_.rowOf(number, reason);
  if (!reason.empty()) {
    warning(fmt::format("The final model run is not compared with evaluation No. {} of the same set: {}: {}", number,
                        results_.path(), reason));
  }
  if (!row || row->measures == result.measureValues) return;
  const std::string start =
      fmt::format("The final model run has other results than evaluation No. {} of the same set", number);
  if (repeatCount_ > 0) {
    urgentWarning(
        fmt::format("{}, and {} have the results of earlier ones: a model that draws random numbers needs "
                    "Reuse_Results = 0 in MIREVO_SIMULATION_OPTION",
                    start, countText(static_cast<std::size_t>(repeatCount_), "evaluation")));
    return;
  }
  urgentWarning(
      fmt::format("{}{}: the model depends on more than its parameters, such as random numbers, the time or "
                  "files that it changes. Its process folder has the results of the final run",
                  start, firstDifference(row->measures, result.measureValues)));
}

/// " (flow: 2.5 instead of 2.25)".
std::string RunReporter::firstDifference(std::span<const double> expected, std::span<const double> found) const {
  const auto [was, is] = std::ranges::mismatch(expected, found);
  const auto place = static_cast<std::size_t>(was - expected.begin());
  if (was == expected.end() || is == found.end() || place >= sources_.size()) return {};
  return fmt::format(" ({}: {} instead of {})", sources_[place].name, formatReal(*is), formatReal(*was));
}

void RunReporter::runCompared(const ComparisonFindings& found) {
  if (found.firstNumber != 0) firstSuccess_ = found.firstNumber;
  for (const std::string& line : found.firstLines) state_.log.line(line);
  for (const RunDifference& difference : found.differences) {
    const std::string text = fmt::format("{}: {}", progress::nameOfEvaluation(difference.number), difference.text);
    if (textsOf(difference.kind).isWarnedOf && differencesWarnedOf_ < kMostDifferencesShown) {
      ++differencesWarnedOf_;
      state_.log.warning(text);
    } else if (!difference.isTold) {
      state_.log.line("   " + text);
    }
    differences_.insert_or_assign({difference.kind, difference.number, difference.measure}, difference);
  }
  others_.insert(found.others.begin(), found.others.end());
  if (!found.doubtOfFirst.empty()) state_.log.warning(found.doubtOfFirst);
}

std::map<int, std::string> RunReporter::differencesOfKind(RunDifference::Kind kind) const {
  std::map<int, std::string> found;
  for (const auto& [key, difference] : differences_) {
    if (difference.kind != kind) continue;
    std::string& text = found[difference.number];
    text.append(text.empty() ? "" : "; ").append(difference.text);
  }
  return found;
}

std::vector<std::string> RunReporter::differenceLines() const {
  std::vector<std::string> lines;
  for (const DifferenceTexts& texts : differenceTexts()) {
    const std::map<int, std::string> found = differencesOfKind(texts.kind);
    std::size_t shown = 0;
    for (const auto& [number, text] : found) {
      if (shown == kMostDifferencesShown) break;
      ++shown;
      lines.push_back(fmt::format("{}: evaluation {}: {}", texts.title, number, text));
    }
    const std::size_t more = found.size() - shown;
    if (more == 0) continue;
    lines.push_back(fmt::format("{}: {}{}", texts.title, countText(more, "more evaluation"),
                                pairs_ == nullptr ? "" : ", see " + fileNameOf(pairs_->path())));
  }
  return lines;
}

std::vector<std::string> RunReporter::differenceWarnings() const {
  std::vector<std::string> sentences;
  for (const DifferenceTexts& texts : differenceTexts()) {
    const std::size_t count = differencesOfKind(texts.kind).size();
    if (count == 0) continue;
    const bool isOne = count == 1;
    const char* const named = count > kMostDifferencesShown ? "the first of them" : isOne ? "it" : "them";
    sentences.push_back(fmt::format("{} {}: the end of {} names {}", countText(count, "evaluation"),
                                    isOne ? texts.ofOne : texts.ofSeveral, fileNameOf(results_.path()), named));
  }
  return sentences;
}

std::string RunReporter::unkeptWarning() const {
  if (unkeptFiles_ == nullptr || unkeptFiles_->files().empty()) return {};
  const UnkeptByNumber& files = unkeptFiles_->files();
  return fmt::format(
      "Output files of {} could not be kept, see {}; the first: No. {}. With Restart = 1 the setup makes their model "
      "runs again",
      countText(files.size(), "evaluation"), fileNameOf(unkeptFiles_->path()), files.begin()->first);
}

void RunReporter::noteReplayWithoutPairs(int number) {
  const auto place = static_cast<std::size_t>(number);
  if (replayedWithoutPairs_.size() <= place) replayedWithoutPairs_.resize(place + 1);
  replayedWithoutPairs_[place] = true;
}

bool RunReporter::isReplayedWithoutPairs(int number) const {
  const auto place = static_cast<std::size_t>(number);
  return place < replayedWithoutPairs_.size() && replayedWithoutPairs_[place];
}

std::vector<std::string> RunReporter::differencesOfBest() const {
  if (!best()) return {};
  const int number = best()->number;
  // The rows of its pairs may have been lost, so that those of the final model run, of the same set, tell.
  const bool isKnownOfFinalRun = isReplayedWithoutPairs(number) && lastWithPairs_.number != number &&
                                 lastWithPairs_.parameterValues == best()->parameterValues;
  const int judged = isKnownOfFinalRun ? lastWithPairs_.number : number;
  std::vector<RunDifference> ofBest;
  if (pairs_ != nullptr) ofBest = findLackOfBest(judged, pairs_->pairs(), sources_);
  for (const auto& [key, difference] : differences_) {
    if (difference.number == judged) ofBest.push_back(difference);
  }
  for (RunDifference& difference : ofBest) {
    if (isKnownOfFinalRun) difference.text += fmt::format(" (found in evaluation No. {}, of the same set)", judged);
    difference.number = number;
  }
  return sentencesOnBest(number, ofBest);
}

std::vector<std::string> RunReporter::comparisonLines() const {
  if (pairs_ == nullptr || firstSuccess_ == 0) return {};
  const std::set<int> kept = numbersWithPairs();  // more are there until the end, which ones depends on the machine
  int number = firstSuccess_;
  std::string whose = fmt::format("the first successful run, No. {},", number);
  const bool isOfOther = finalRunOf_ != 0 && best() && finalRunOf_ != best()->number;
  if (finalRun_ && isOfOther) {
    number = *finalRun_;
    whose = fmt::format("the suggested compromise, No. {},", finalRunOf_);
  } else if (best() && (kept.contains(best()->number) || finalRun_)) {
    number = kept.contains(best()->number) ? best()->number : *finalRun_;
    whose = fmt::format("the best evaluation, No. {},", best()->number);
  }
  const auto found = pairs_->pairs().find(number);
  if (found == pairs_->pairs().end()) return {};
  std::vector<std::string> lines{fmt::format("What {} is judged by:", whose)};
  for (const MeasurePairs& pairs : found->second) {
    if (pairs.measure >= sources_.size() || !sources_[pairs.measure].isSeries) continue;
    lines.push_back("   " + comparisonText(sources_[pairs.measure], pairs));
  }
  if (lines.size() == 1) lines.clear();
  return lines;
}

std::set<int> RunReporter::numbersWithPairs() const {
  if (firstSuccess_ == 0) return {};
  std::set<int> numbers = others_;
  if (finalRun_) numbers.insert(*finalRun_);
  numbers.insert(firstSuccess_);
  for (const auto& [key, difference] : differences_) numbers.insert(difference.number);
  return numbers;
}

void RunReporter::count(const std::vector<double>& parameterValues, const EvaluationResult& result,
                        std::string_view foundAt) {
  ++evaluationCount_;
  state_.objectiveValues = result.objectiveValues;
  if (!result.ok()) {
    ++failedCount_;
    failures_.add(result.number, *result.failure);
    return;
  }
  initial_.consider(result.number, parameterValues);
  if (keepsJudged_) {
    judged_[result.number] = {result.number,        result.aggregate,        parameterValues,
                              result.measureValues, result.validationValues, result.validationPairs};
  }
  if (std::isnan(result.aggregate)) {
    unsettled_.push_back({result.number, parameterValues, result.objectiveValues});
  } else if (!result.objectiveValues.empty()) {
    considerAsBest(result.number, result.aggregate, parameterValues, foundAt);
  }
}

void RunReporter::recordSeries(const std::vector<double>& values, const EvaluationResult& result) {
  if (recorder_ != nullptr) recorder_->evaluationFinished(result, values, best());
  if (scenarioSeries_ != nullptr) scenarioSeries_->add(result.number, result.shownSeries);
}

std::string RunReporter::valuesText(const EvaluationResult& result) const {
  constexpr std::size_t kMostMeasures = 8;  // so that the line stays short
  if (!result.ok()) return {};
  std::string text;
  const auto add = [&text](std::string_view what, double value) {
    text += fmt::format("{}{} {:.6g}", text.empty() ? "" : ", ", what, value);
  };
  const std::size_t measures = std::min(sources_.size(), result.measureValues.size());
  for (std::size_t i = 0; i < std::min(measures, kMostMeasures); ++i) add(sources_[i].name, result.measureValues[i]);
  if (measures > kMostMeasures) text += fmt::format(" and {}", countText(measures - kMostMeasures, "more measure"));
  if (result.objectiveValues.empty() || std::isnan(result.aggregate)) return text;
  add("aggregate", result.aggregate);
  if (best()) {
    add("best so far", best()->aggregate);
    text += fmt::format(" (No. {})", best()->number);
  }
  return text;
}

void RunReporter::requireLogWritten() const {
  if (state_.log.writeError().empty()) return;
  fatalError("Error: Unable to write to " + state_.log.path(), state_.log.writeError());
}

std::vector<JudgedEvaluation> RunReporter::judged() const {
  std::vector<JudgedEvaluation> evaluations;
  for (const auto& [number, evaluation] : judged_) evaluations.push_back(evaluation);
  return evaluations;
}

void RunReporter::takeBestOf(const SearchSummary& search) {
  searchHasEnded_ = true;
  finalRunOf_ = search.finalRunOf;
  if (search.best.empty() || !search.bestResult.ok()) return;
  best_.takeOfSearch({search.bestResult.number, search.bestResult.aggregate, ToModelScale(space_, search.best)});
}

void RunReporter::considerAsBest(int number, double aggregate, const std::vector<double>& parameterValues,
                                 std::string_view foundAt) {
  if (aggregate >= kFailedRunValue && !std::exchange(hasWarnedOfAggregate_, true)) {
    warning(fmt::format("{} succeeded with the aggregate {}: failed ones have {} and count as {}",
                        progress::nameOfEvaluation(number), formatReal(aggregate), formatReal(kFailedRunValue),
                        aggregate > kFailedRunValue ? "better" : "good as it"));
  }
  if (best_.consider(number, aggregate, parameterValues)) state_.progress.progressBest(number, aggregate, foundAt);
}

void RunReporter::settle(const ObjectiveAggregator& aggregator) {
  if (!aggregator.isSettled()) return;
  for (const Unsettled& evaluation : unsettled_) {
    const double aggregate = aggregator.aggregate(evaluation.objectiveValues);
    results_.replaceAggregate(evaluation.number, aggregate);
    if (keepsJudged_) judged_[evaluation.number].aggregate = aggregate;
    if (recorder_ != nullptr) recorder_->aggregateSettled(evaluation.number, aggregate);
    considerAsBest(evaluation.number, aggregate, evaluation.parameterValues, dateAndTimeWithZone());
  }
  unsettled_.clear();
}

}  // namespace mirevo
