#include "evaluation/run_comparison.h"

#include <algorithm>
#include <array>
#include <functional>
#include <iterator>
#include <string_view>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {
namespace {

using Kind = RunDifference::Kind;

/// In the order of the kinds.
constexpr std::array<DifferenceTexts, 4> kTexts{{
    {Kind::fewerPairs, "Fewer pairs", "is judged by fewer observations than the first successful run",
     "are judged by fewer observations than the first successful run", false},
    {Kind::fewerThanAnother, "Fewer pairs than another", "is judged by fewer observations than another run",
     "are judged by fewer observations than another run", false},
    {Kind::gap, "Gap", "has a longer gap in its simulated steps than the first successful run",
     "have a longer gap in their simulated steps than the first successful run", true},
    {Kind::otherCount, "Count of numbers", "has another count of numbers than the first successful run",
     "have another count of numbers than the first successful run", true},
}};

const MeasurePairs* pairsOf(std::size_t measure, std::span<const MeasurePairs> pairs) {
  const auto found =
      std::find_if(pairs.begin(), pairs.end(), [measure](const MeasurePairs& each) { return each.measure == measure; });
  return found == pairs.end() ? nullptr : &*found;
}

std::string rangeText(std::string_view what, const ValueSummary& range) {
  return fmt::format("{} {:.6g} to {:.6g}, mean {:.6g}", what, range.least, range.largest, range.mean);
}

std::string hoursText(std::int64_t seconds) {
  return fmt::format("{:.6g} hour{}", static_cast<double>(seconds) / 3600.0, seconds == 3600 ? "" : "s");
}

std::int64_t gapSeconds(const FileForm& file) {
  return file.gapEnd - file.gapStart;
}

/// One and a half times as long: more than steps of varying length differ, less than a missing step makes of two.
bool hasLongerGap(const FileForm& file, const FileForm& first) {
  return gapSeconds(first) > 0 && 2 * gapSeconds(file) > 3 * gapSeconds(first);
}

std::string describe(const FileForm& file, const MeasureSource& source) {
  std::string text = fmt::format("{}: ", source.fileName);
  if (!source.isSeries) {
    text += countText(file.numberCount, "number");
  } else {
    text += countText(file.stepCount, "time step") + " in the evaluation period";
    if (gapSeconds(file) > 0) text += fmt::format(", at most {} apart", hoursText(gapSeconds(file)));
  }
  if (!file.endsLine) text += "; its last line has no end";
  return text;
}

}  // namespace

std::span<const DifferenceTexts> differenceTexts() {
  return kTexts;
}

std::vector<MeasureSource> measureSources(std::span<const OutputMeasure> measures, const std::string& measureFile,
                                          const std::string& baseFolder) {
  std::vector<MeasureSource> sources;
  for (const OutputMeasure& measure : measures) {
    const bool isSeries = measure.interfaceType == InterfaceType::timeSeries;
    const std::string& ofNumber = measure.measureFile.empty() ? measureFile : measure.measureFile;
    std::string file(trimTrailing(isSeries ? measure.simulation.fileName : ofNumber));
    if (file.starts_with(baseFolder + "/")) file.erase(0, baseFolder.size() + 1);
    MeasureSource& source = sources.emplace_back();
    source = {std::string(trimTrailing(measure.name)), std::move(file), isSeries};
    if (!isSeries) continue;
    source.simulated = source.fileName;
    source.observed = fileNameOf(trimTrailing(measure.observation.fileName));
  }
  return sources;
}

std::string comparisonText(const MeasureSource& source, const MeasurePairs& pairs) {
  const FileForm& file = pairs.file;
  const auto date = [](std::int64_t second) { return formatDate(dateOfSecond(second)); };
  std::string span;
  if (file.lastStep > file.firstStep) span = fmt::format(", {} to {}", date(file.firstStep), date(file.lastStep));
  return fmt::format("{}: {}{} with {}: {}, {} without a simulated value, {} to {}; {}; {}", source.name,
                     source.simulated, span, source.observed, countText(pairs.count, "pair"),
                     countText(pairs.missingCount, "observation"), date(pairs.first), date(pairs.last),
                     rangeText("observed", pairs.observed), rangeText("simulated", pairs.simulated));
}

std::size_t pairedCount(std::span<const MeasureSource> sources) {
  const auto series = std::count_if(sources.begin(), sources.end(), std::mem_fn(&MeasureSource::isSeries));
  return static_cast<std::size_t>(series) + (std::ssize(sources) > series ? 1 : 0);
}

std::vector<RunDifference> findDifferences(int number, std::span<const MeasurePairs> pairs, int firstNumber,
                                           std::span<const MeasurePairs> first,
                                           std::span<const MeasureSource> sources) {
  std::vector<RunDifference> differences;
  const auto add = [&](Kind kind, std::size_t measure, std::string text) {
    differences.push_back({number, measure, kind, std::move(text), false});
  };
  std::vector<std::string_view> seen;
  for (const MeasurePairs& found : pairs) {
    const MeasurePairs* const same = pairsOf(found.measure, first);
    if (same == nullptr || found.measure >= sources.size()) continue;
    const MeasureSource& source = sources[found.measure];
    if (found.count < same->count) {
      add(Kind::fewerPairs, found.measure,
          fmt::format("output measure \"{}\" has {}, {} in the first successful run, No. {}", source.name,
                      countText(found.count, "pair"), same->count, firstNumber));
    }
    if (std::find(seen.begin(), seen.end(), source.fileName) != seen.end()) continue;
    seen.push_back(source.fileName);
    if (hasLongerGap(found.file, same->file)) {
      add(Kind::gap, found.measure,
          fmt::format("{} has no time step between {} and {}, {}; in the first successful run, No. {}, steps are at "
                      "most {} apart",
                      source.fileName, formatDate(dateOfSecond(found.file.gapStart)),
                      formatDate(dateOfSecond(found.file.gapEnd)), hoursText(gapSeconds(found.file)), firstNumber,
                      hoursText(gapSeconds(same->file))));
    }
    if (found.file.numberCount != same->file.numberCount) {
      add(Kind::otherCount, found.measure,
          fmt::format("{} has {}, {} in the first successful run, No. {}", source.fileName,
                      countText(found.file.numberCount, "number"), same->file.numberCount, firstNumber));
    }
  }
  return differences;
}

std::vector<RunDifference> findLackOfBest(int best, const std::map<int, std::vector<MeasurePairs>>& pairs,
                                          std::span<const MeasureSource> sources) {
  std::vector<RunDifference> differences;
  if (pairs.empty()) return differences;
  const std::vector<MeasurePairs>& first = pairs.begin()->second;
  const auto kept = pairs.find(best);
  for (const MeasurePairs& own : kept == pairs.end() ? first : kept->second) {
    const MeasurePairs* const ofFirst = pairsOf(own.measure, first);
    if (ofFirst == nullptr || own.count < ofFirst->count || own.measure >= sources.size()) continue;
    std::size_t most = own.count;
    int number = best;
    for (const auto& [otherNumber, others] : pairs) {
      const MeasurePairs* const other = pairsOf(own.measure, others);
      if (other == nullptr || other->count <= most) continue;
      most = other->count;
      number = otherNumber;
    }
    if (number == best) continue;
    differences.push_back({best, own.measure, Kind::fewerThanAnother,
                           fmt::format("output measure \"{}\" has {}, {} in evaluation No. {}",
                                       sources[own.measure].name, countText(own.count, "pair"), most, number),
                           false});
  }
  return differences;
}

std::vector<std::string> sentencesOnBest(int best, std::span<const RunDifference> differences) {
  std::vector<std::string> sentences;
  for (const DifferenceTexts& texts : kTexts) {
    std::string found;
    for (const RunDifference& difference : differences) {
      if (difference.number != best || difference.kind != texts.kind) continue;
      found.append(found.empty() ? "" : "; ").append(difference.text);
    }
    if (found.empty()) continue;
    sentences.push_back(fmt::format("The best evaluation, No. {}, {}: {}", best, texts.ofOne, found));
  }
  return sentences;
}

const MeasurePairs* RunComparison::firstOf(std::size_t measure) const {
  return pairsOf(measure, first_);
}

bool RunComparison::judge(int number, EvaluationResult& result) const {
  if (!result.ok()) return true;
  for (const MeasurePairs& pairs : result.pairs) {
    if (pairs.file.endsLine) continue;
    if (firstNumber_ == 0) return number <= nextNumber_;  // which is then the first successful run itself
    const MeasurePairs* const first = firstOf(pairs.measure);
    if (first == nullptr || !first->file.endsLine) continue;
    result.fail({EvaluationFailure::Kind::resultsCutOff,
                 fmt::format("the last line of {} has no end, as it has in the first successful run, No. {}: it is cut "
                             "off",
                             sources_.at(pairs.measure).fileName, firstNumber_),
                 std::move(result.lastOutput)});
    return true;
  }
  result.lastOutput.clear();
  return true;
}

ComparisonFindings RunComparison::take(EvaluationResult& result, bool keepsPairs) {
  ComparisonFindings found;
  if (sources_.empty()) return found;
  if (!result.ok()) result.pairs.clear();
  std::erase_if(result.pairs, [this](const MeasurePairs& pairs) { return pairs.measure >= sources_.size(); });
  anyHasSucceeded_ = anyHasSucceeded_ || result.ok();
  if (firstNumber_ != 0) {
    if (!compare(result.number, result.pairs, found) && !keepsPairs) result.pairs.clear();
    return found;
  }
  waiting_[result.number] = result.pairs;
  // Evaluations without pairs have failed, or are of an earlier version of the program, which did not keep them.
  for (auto next = waiting_.find(nextNumber_); next != waiting_.end(); next = waiting_.find(++nextNumber_)) {
    if (!next->second.empty()) {
      firstNumber_ = next->first;
      first_ = std::move(next->second);
      waiting_.erase(next);
      break;
    }
    waiting_.erase(next);
  }
  if (firstNumber_ == 0) return found;
  found.firstNumber = firstNumber_;
  found.firstLines = linesOfFirst();
  for (const auto& [number, pairs] : waiting_) compare(number, pairs, found);
  waiting_.clear();
  return found;
}

RunStandard RunComparison::standard() const {
  RunStandard standard;
  standard.anyHasSucceeded = anyHasSucceeded_;
  if (firstNumber_ == 0) return standard;
  standard.firstNumber = firstNumber_;
  if (rules_.requiresShare) standard.firstCounts.assign(sources_.size(), 0);
  for (const MeasurePairs& pairs : first_) {
    if (rules_.requiresShare) standard.firstCounts.at(pairs.measure) = pairs.count;
    if (!pairs.file.endsLine) standard.withoutLineEnds.push_back(pairs.measure);
  }
  return standard;
}

std::vector<std::string> RunComparison::linesOfFirst() const {
  std::vector<std::string> lines{fmt::format(
      "Pairs of simulated and observed values in evaluation No. {}, the first successful run:", firstNumber_)};
  std::vector<std::string> files;
  for (const MeasurePairs& pairs : first_) {
    const MeasureSource& source = sources_.at(pairs.measure);
    const std::string file = "   " + describe(pairs.file, source);
    if (std::find(files.begin(), files.end(), file) == files.end()) files.push_back(file);
    if (!source.isSeries) continue;
    lines.push_back("   " + comparisonText(source, pairs));
  }
  if (lines.size() == 1) lines.clear();
  lines.push_back(fmt::format("Files that evaluation No. {}, the first successful run, wrote:", firstNumber_));
  lines.insert(lines.end(), files.begin(), files.end());
  return lines;
}

bool RunComparison::compare(int number, std::span<const MeasurePairs> pairs, ComparisonFindings& found) {
  std::vector<RunDifference> differences = findDifferences(number, pairs, firstNumber_, first_, sources_);
  const bool hasOthers = std::any_of(pairs.begin(), pairs.end(), [this](const MeasurePairs& each) {
    const MeasurePairs* const first = firstOf(each.measure);
    return first != nullptr && !each.hasObservationsOf(*first);
  });
  for (const MeasurePairs& other : pairs) {
    const MeasurePairs* const first = firstOf(other.measure);
    if (isFirstDoubted_ || first == nullptr || first->file.endsLine || !other.file.endsLine) continue;
    isFirstDoubted_ = true;
    found.doubtOfFirst = fmt::format(
        "The last line of {} has an end in later runs, and none in the first successful run, No. {}, which may be cut "
        "off",
        sources_.at(other.measure).fileName, firstNumber_);
  }
  if (differences.empty() && hasOthers) found.others.push_back(number);
  const bool differs = hasOthers || !differences.empty();
  for (RunDifference& difference : differences) found.differences.push_back(std::move(difference));
  return differs;
}

}  // namespace mirevo
