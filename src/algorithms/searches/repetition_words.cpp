#include "algorithms/searches/repetition_words.h"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <string_view>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/rounded_text.h"
#include "common/short_list.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {

Spread spreadOf(std::vector<double> values) {
  std::ranges::sort(values);
  return {values.front(), sortedQuantile(values, 0.5), values.back()};
}

std::string repetitionHeading(std::size_t count, std::int32_t planned) {
  return static_cast<std::int64_t>(count) == planned
             ? fmt::format("The {} repetitions of the search:", planned)
             : fmt::format("The {} of {} repetitions of the search that had begun:", count, planned);
}

std::string whyItStopped(const Repetition& repetition) {
  std::string_view why = repetition.termination;
  takeText(why, "Optimisation terminated: ");
  return why.empty() ? "has not ended" : std::string(why);
}

double rangeShare(const std::vector<const Repetition*>& repetitions, const SearchSpace& space, std::size_t k) {
  const bool isInteger = space.transformation[k] == TransformationType::integer;
  const double range = space.upper[k] - space.lower[k] - (isInteger ? 1.0 : 0.0);
  if (!(range > 0.0)) return 0.0;
  std::vector<double> values;
  values.reserve(repetitions.size());
  for (const Repetition* repetition : repetitions) {
    const double value = repetition->best[k];
    values.push_back(isInteger ? toModelScale(space, k, value) : value);
  }
  const Spread spread = spreadOf(std::move(values));
  return (spread.greatest - spread.least) / range;
}

std::vector<std::vector<double>> parameterSpreads(const std::vector<const Repetition*>& repetitions,
                                                  const SearchSpace& space) {
  std::vector<std::vector<double>> rows;
  for (std::size_t k = 0; k < space.size(); ++k) {
    std::vector<double> values;
    values.reserve(repetitions.size());
    for (const Repetition* repetition : repetitions) values.push_back(toModelScale(space, k, repetition->best[k]));
    const Spread spread = spreadOf(std::move(values));
    rows.push_back({spread.least, spread.median, spread.greatest, 100.0 * rangeShare(repetitions, space, k)});
  }
  return rows;
}

namespace {

constexpr std::size_t kMostNamed = 20;  // parameters in a sentence
constexpr double kMostTimes = 100.0;    // of a value above which percents of it are not read

std::vector<std::string> tableLines(std::span<const Repetition> repetitions, std::int32_t planned) {
  std::vector<std::string> lines{repetitionHeading(repetitions.size(), planned)};
  const bool hasSums = std::ranges::any_of(repetitions, &Repetition::isJudgedBySums);
  const auto sumText = [hasSums](const std::string& text) {
    return hasSums ? fmt::format(" {:>14}", text) : std::string();
  };
  lines.push_back(fmt::format("   {:>3} {:>11} {:>11}{} {:>14} {:>14}  {}", "No.", "seed", "evaluations",
                              sumText("sum of squares"), hasSums ? "aggregate" : "best value", "found by No.",
                              "why it stopped"));
  int number = 0;
  for (const Repetition& repetition : repetitions) {
    const bool hasBest = repetition.bestEvaluation > 0;
    const std::string sum = repetition.isJudgedBySums() ? fmt::format("{:.6g}", repetition.sumOfSquares) : "";
    lines.push_back(fmt::format("   {:>3} {:>11} {:>11}{} {:>14} {:>14}  {}", ++number, repetition.seed,
                                repetition.evaluations, sumText(sum),
                                hasBest ? fmt::format("{:.6g}", repetition.aggregate) : "none",
                                hasBest ? fmt::format("{}", repetition.bestEvaluation) : "", whyItStopped(repetition)));
  }
  return lines;
}

/// Whether it found a set that is better than those that it began with.
bool hasImproved(const Repetition& repetition) {
  return !(repetition.value() >= repetition.startValue());
}

class SpreadText final {
 public:
  /// `ended`: those that have ended with a best set, two or more.
  SpreadText(std::vector<const Repetition*> ended, const SearchSpace& space) : ended_(std::move(ended)), space_(space) {
    std::vector<double> values;
    std::vector<double> starts;
    for (const Repetition* repetition : ended_) {
      values.push_back(repetition->value());
      starts.push_back(repetition->startValue());
    }
    values_ = spreadOf(std::move(values));
    nearly_ = nearlyEqual(values_.least, starts);
    const double most = values_.least + nearly_.tolerance;
    std::ranges::copy_if(ended_, std::back_inserter(near_),
                         [most](const Repetition* repetition) { return repetition->value() <= most; });
    improved_ = static_cast<std::size_t>(
        std::ranges::count_if(ended_, [](const Repetition* repetition) { return hasImproved(*repetition); }));
  }

  std::vector<std::string> lines() const {
    const std::string values = fmt::format("{}: least {:.6g}, median {:.6g}, greatest {:.6g}",
                                           ended_.front()->isJudgedBySums() ? "Sums of squares" : "Best values",
                                           values_.least, values_.median, values_.greatest);
    if (improved_ == 0) return {values, noneImprovedText()};
    std::vector<std::string> lines{
        fmt::format("{}; {} of {} repetitions ended within {}", values, near_.size(), ended_.size(), nearly_.text())};
    for (std::string& line : parameterTable()) lines.push_back(std::move(line));
    if (improved_ < ended_.size()) {
      lines.push_back(fmt::format("{} of {} repetitions found nothing better than what they began with",
                                  ended_.size() - improved_, ended_.size()));
    }
    if (!isSameEachTime()) lines.push_back(otherMinimaText());
    if (near_.size() < 2) return lines;
    if (nearly_.atStart > 0) {
      lines.push_back(atStartText());
      return lines;
    }
    const std::string wide = wideParameters();
    if (!wide.empty()) {
      lines.push_back(fmt::format(
          "At nearly equal values these parameters take up more than {:g} % of their ranges, so that the calibration "
          "identifies them poorly: {}",
          100.0 * kWideShare, wide));
    } else if (isSameEachTime()) {
      lines.push_back(fmt::format(
          "Whatever the seed, the search ended at nearly the same value, with every parameter within {:g} % of its "
          "range",
          100.0 * kWideShare));
    }
    return lines;
  }

 private:
  bool isSameEachTime() const { return near_.size() == ended_.size(); }

  bool isOneStart() const {
    return std::ranges::all_of(
        ended_, [this](const Repetition* repetition) { return repetition->start == ended_.front()->start; });
  }

  std::string_view otherStartsText() const {
    return isOneStart() ? ", or other starts (Include_Initial_Parameters = 0)" : "";
  }

  std::string noneImprovedText() const {
    return fmt::format(
        "None of the {} repetitions found anything better than {}, which says nothing of a minimum: the start may be "
        "one, or the search does not get away from it. A larger budget can tell{}",
        ended_.size(), isOneStart() ? "the set that all of them began with" : "the sets that they began with",
        otherStartsText());
  }

  std::string atStartText() const {
    return fmt::format(
        "{} of {} repetitions began with a value within {} already, so that best values near each other say nothing of "
        "a minimum: the start may be one, or the search does not get away from it. A larger budget can tell{}",
        nearly_.atStart, ended_.size(), nearly_.text(), otherStartsText());
  }

  std::vector<std::string> parameterTable() const {
    std::vector<std::string> headings{"least", "median", "greatest", "% of range"};
    std::vector<std::vector<double>> rows = parameterSpreads(ended_, space_);
    if (near_.size() > 1 && !isSameEachTime()) {
      headings.push_back(fmt::format("% ({} least)", near_.size()));
      for (std::size_t k = 0; k < rows.size(); ++k) rows[k].push_back(100.0 * rangeShare(near_, space_, k));
    }
    return formatTable("Parameters of the best sets", headings, space_.names, rows);
  }

  std::string otherMinimaText() const {
    std::string text =
        fmt::format("The search has not found the same minimum each time: {} of {} repetitions ended within {} value",
                    near_.size(), ended_.size(), nearly_.text());
    const double above = values_.greatest - values_.least;
    if (nearly_.isOfLeast && above < kMostTimes * values_.least) {
      text += fmt::format(", and the worst {} % above it", roundedText(100.0 * above / values_.least, 3));
    } else {
      text += fmt::format(", and the worst {} above it", roundedText(above, 3));
    }
    text += near_.size() == 1 ? ". As no other came near it, there may well be better values: "
                              : ". For a single search to find it more often: ";
    return text + "a larger budget or population, a less strict test of convergence, or another search";
  }

  /// "a (34 %), b (20 %)", the widest first
  std::string wideParameters() const {
    std::vector<std::pair<double, std::size_t>> wide;
    for (std::size_t k = 0; k < space_.size(); ++k) {
      if (const double share = rangeShare(near_, space_, k); share > kWideShare) wide.emplace_back(share, k);
    }
    std::ranges::stable_sort(wide, [](const auto& a, const auto& b) { return a.first > b.first; });
    std::string text;
    for (std::size_t i = 0; i < std::min(wide.size(), kMostNamed); ++i) {
      text += fmt::format("{}{} ({:.3g} %)", i == 0 ? "" : ", ", space_.names[wide[i].second], 100.0 * wide[i].first);
    }
    if (wide.size() > kMostNamed) text += fmt::format(" and {} more", wide.size() - kMostNamed);
    return text;
  }

  std::vector<const Repetition*> ended_;
  std::vector<const Repetition*> near_;  ///< those whose values count as equal to the least
  const SearchSpace& space_;
  Spread values_;
  NearlyEqual nearly_;
  std::size_t improved_ = 0;  ///< of those that have ended
};

}  // namespace

std::string sameSearchesText(std::span<const Repetition> repetitions) {
  const std::vector<int> same = sameSearches(repetitions);
  std::string groups;
  for (std::size_t first = 0; first < same.size(); ++first) {
    std::vector<std::size_t> numbers{first + 1};
    for (std::size_t i = first + 1; i < same.size(); ++i) {
      if (same[i] == static_cast<int>(first) + 1) numbers.push_back(i + 1);
    }
    if (numbers.size() == 1) continue;
    const std::size_t last = numbers.back();
    numbers.pop_back();
    groups += fmt::format("{} {} and {}", groups.empty() ? "Repetitions" : ", and", fmt::join(numbers, ", "), last);
  }
  if (groups.empty()) return {};
  return fmt::format(
      "{} started from the same sets and are the same search, which counts once in what is said of all. For other "
      "starts: a larger sample (Sample_Size), more of its sets (Starts), or Include_Initial_Parameters = 0 where it is "
      "the initial one",
      groups);
}

std::string withoutBestText(std::span<const Repetition> repetitions) {
  const auto isWithout = [](const Repetition& one) { return !one.termination.empty() && one.bestEvaluation == 0; };
  ShortList numbers(kMostNamed);
  for (std::size_t i = 0; i < repetitions.size(); ++i) {
    if (isWithout(repetitions[i])) numbers.add(std::to_string(i + 1));
  }
  if (numbers.isEmpty()) return {};
  return fmt::format(
      "{} of {} repetitions ended without a successful run and {} left out of what is said of all: No. {}",
      numbers.count(), repetitions.size(), numbers.count() == 1 ? "is" : "are", numbers.text());
}

std::vector<std::string> repetitionLines(std::span<const Repetition> repetitions, const SearchSpace& space,
                                         std::span<const std::string> objectives, std::int32_t planned) {
  if (std::ranges::any_of(repetitions, [](const Repetition& one) { return one.front.has_value(); })) {
    return repeatedFrontLines(repetitions, space, objectives, planned);
  }
  std::vector<std::string> lines = tableLines(repetitions, planned);
  const std::string sameText = sameSearchesText(repetitions);
  if (!sameText.empty()) lines.push_back("Warning: " + sameText);
  const std::string withoutText = withoutBestText(repetitions);
  if (!withoutText.empty()) lines.push_back("Warning: " + withoutText);
  const std::vector<int> same = sameSearches(repetitions);
  std::vector<const Repetition*> ended;
  for (std::size_t i = 0; i < repetitions.size(); ++i) {
    const Repetition& repetition = repetitions[i];
    if (!repetition.termination.empty() && repetition.bestEvaluation > 0 && same[i] == 0) ended.push_back(&repetition);
  }
  if (ended.size() < 2) {
    if (!sameText.empty() && !ended.empty()) lines.emplace_back("With a single search there is nothing to compare");
    return lines;
  }
  const std::vector<std::string> spread = SpreadText(std::move(ended), space).lines();
  lines.insert(lines.end(), spread.begin(), spread.end());
  return lines;
}

}  // namespace mirevo
