#include "evaluation/initial_run.h"

#include <algorithm>
#include <array>
#include <string_view>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"

namespace mirevo {
namespace {

using Kind = RunDifference::Kind;

/// In the order of the kinds.
constexpr std::array<DifferenceTexts, 3> kTexts{{
    {Kind::fewerPairs, "Fewer pairs", "is judged by fewer observations than the initial run",
     "are judged by fewer observations than the initial run", false},
    {Kind::gap, "Gap", "has a longer gap in its simulated steps than the initial run",
     "have a longer gap in their simulated steps than the initial run", true},
    {Kind::otherCount, "Count of numbers", "has another count of numbers than the initial run",
     "have another count of numbers than the initial run", true},
}};

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
bool hasLongerGap(const FileForm& file, const FileForm& initial) {
  return gapSeconds(initial) > 0 && 2 * gapSeconds(file) > 3 * gapSeconds(initial);
}

std::string describe(const FileForm& file, const MeasureSource& source) {
  std::string text = fmt::format("{}: ", source.fileName);
  if (!source.isSeries) {
    text += fmt::format("{} number{}", file.numberCount, file.numberCount == 1 ? "" : "s");
  } else {
    text += fmt::format("{} time step{} in the evaluation period", file.stepCount, file.stepCount == 1 ? "" : "s");
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
    std::string file(trimTrailing(isSeries ? measure.simulation.fileName : measureFile));
    if (file.starts_with(baseFolder + "/")) file.erase(0, baseFolder.size() + 1);
    sources.push_back({std::string(trimTrailing(measure.name)), std::move(file), isSeries});
  }
  return sources;
}

std::vector<RunDifference> findDifferences(int number, std::span<const MeasurePairs> pairs, int initialNumber,
                                           std::span<const MeasurePairs> initial,
                                           std::span<const MeasureSource> sources) {
  std::vector<RunDifference> differences;
  const auto add = [&](Kind kind, std::size_t measure, std::string text) {
    differences.push_back({number, measure, kind, std::move(text)});
  };
  std::vector<std::string_view> seen;
  for (const MeasurePairs& found : pairs) {
    const auto same = std::find_if(initial.begin(), initial.end(),
                                   [&found](const MeasurePairs& other) { return other.measure == found.measure; });
    if (same == initial.end() || found.measure >= sources.size()) continue;
    const MeasureSource& source = sources[found.measure];
    if (found.count < same->count) {
      add(Kind::fewerPairs, found.measure,
          fmt::format("output measure \"{}\" has {} pairs, {} in the initial run, No. {}", source.name, found.count,
                      same->count, initialNumber));
    }
    if (std::find(seen.begin(), seen.end(), source.fileName) != seen.end()) continue;
    seen.push_back(source.fileName);
    if (hasLongerGap(found.file, same->file)) {
      add(Kind::gap, found.measure,
          fmt::format(
              "{} has no time step between {} and {}, {}; in the initial run, No. {}, steps are at most {} apart",
              source.fileName, formatDate(dateOfSecond(found.file.gapStart)),
              formatDate(dateOfSecond(found.file.gapEnd)), hoursText(gapSeconds(found.file)), initialNumber,
              hoursText(gapSeconds(same->file))));
    }
    if (found.file.numberCount != same->file.numberCount) {
      add(Kind::otherCount, found.measure,
          fmt::format("{} has {} numbers, {} in the initial run, No. {}", source.fileName, found.file.numberCount,
                      same->file.numberCount, initialNumber));
    }
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

InitialRun::InitialRun(std::vector<MeasureSource> sources, bool isRequired)
    : sources_(std::move(sources)),
      isRequired_(isRequired &&
                  std::any_of(sources_.begin(), sources_.end(), [](const auto& source) { return source.isSeries; })) {}

const MeasurePairs* InitialRun::initialOf(std::size_t measure) const {
  const auto found = std::find_if(initial_.begin(), initial_.end(),
                                  [measure](const MeasurePairs& pairs) { return pairs.measure == measure; });
  return found == initial_.end() ? nullptr : &*found;
}

bool InitialRun::judge(int number, EvaluationResult& result) const {
  if (!result.ok()) return true;
  for (const MeasurePairs& pairs : result.pairs) {
    if (pairs.file.endsLine) continue;
    if (initialNumber_ == 0) return number <= nextNumber_;  // which is then the initial run itself
    const MeasurePairs* const initial = initialOf(pairs.measure);
    if (initial == nullptr || !initial->file.endsLine) continue;
    result.fail({EvaluationFailure::Kind::resultsCutOff,
                 fmt::format("the last line of {} has no end, as it has in the initial run, No. {}: it is cut off",
                             sources_.at(pairs.measure).fileName, initialNumber_),
                 std::move(result.lastOutput)});
    return true;
  }
  result.lastOutput.clear();
  return true;
}

RunComparison InitialRun::take(EvaluationResult& result) {
  RunComparison found;
  if (sources_.empty()) return found;
  if (!result.ok()) result.pairs.clear();
  std::erase_if(result.pairs, [this](const MeasurePairs& pairs) { return pairs.measure >= sources_.size(); });
  if (initialNumber_ != 0) {
    compare(result.number, result.pairs, found);
    if (found.differences.empty()) result.pairs.clear();
    return found;
  }
  waiting_[result.number] = result.pairs;
  // Evaluations without pairs have failed, or are of an earlier version of the program, which did not keep them.
  for (auto next = waiting_.find(nextNumber_); next != waiting_.end(); next = waiting_.find(++nextNumber_)) {
    if (!next->second.empty()) {
      initialNumber_ = next->first;
      initial_ = std::move(next->second);
      waiting_.erase(next);
      break;
    }
    waiting_.erase(next);
  }
  if (initialNumber_ == 0) return found;
  found.initialNumber = initialNumber_;
  found.initialLines = linesOfInitial();
  for (const auto& [number, pairs] : waiting_) compare(number, pairs, found);
  waiting_.clear();
  return found;
}

InitialStandard InitialRun::standard() const {
  InitialStandard standard;
  if (initialNumber_ == 0) return standard;
  standard.initialNumber = initialNumber_;
  if (isRequired_) standard.initialCounts.assign(sources_.size(), 0);
  for (const MeasurePairs& pairs : initial_) {
    if (isRequired_) standard.initialCounts.at(pairs.measure) = pairs.count;
    if (!pairs.file.endsLine) standard.withoutLineEnds.push_back(pairs.measure);
  }
  return standard;
}

std::vector<std::string> InitialRun::linesOfInitial() const {
  std::vector<std::string> lines{
      fmt::format("Pairs of simulated and observed values in evaluation No. {}, the initial run:", initialNumber_)};
  std::vector<std::string> files;
  for (const MeasurePairs& pairs : initial_) {
    const MeasureSource& source = sources_.at(pairs.measure);
    const std::string file = "   " + describe(pairs.file, source);
    if (std::find(files.begin(), files.end(), file) == files.end()) files.push_back(file);
    if (!source.isSeries) continue;
    lines.push_back(fmt::format("   {}: {} pairs, {} observations without a simulated value, {} to {}", source.name,
                                pairs.count, pairs.missingCount, formatDate(dateOfSecond(pairs.first)),
                                formatDate(dateOfSecond(pairs.last))));
    lines.push_back(
        fmt::format("      {}; {}", rangeText("observed", pairs.observed), rangeText("simulated", pairs.simulated)));
  }
  if (lines.size() == 1) lines.clear();
  lines.push_back(fmt::format("Files that evaluation No. {}, the initial run, wrote:", initialNumber_));
  lines.insert(lines.end(), files.begin(), files.end());
  return lines;
}

void InitialRun::compare(int number, std::span<const MeasurePairs> pairs, RunComparison& found) {
  for (RunDifference& difference : findDifferences(number, pairs, initialNumber_, initial_, sources_)) {
    found.differences.push_back(std::move(difference));
  }
  for (const MeasurePairs& other : pairs) {
    const MeasurePairs* const initial = initialOf(other.measure);
    if (isInitialDoubted_ || initial == nullptr || initial->file.endsLine || !other.file.endsLine) continue;
    isInitialDoubted_ = true;
    found.doubtOfInitial = fmt::format(
        "The last line of {} has an end in later runs, and none in the initial run, No. {}, which may be cut off",
        sources_.at(other.measure).fileName, initialNumber_);
  }
}

}  // namespace mirevo
