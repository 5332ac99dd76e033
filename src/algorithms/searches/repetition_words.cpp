// What the log says of the repetitions of a search.
#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/searches/repetitions.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostNamed = 20;  // parameters in a sentence

/// Of values in any order.
struct Spread {
  double least = 0.0;
  double median = 0.0;
  double greatest = 0.0;
};

Spread spreadOf(std::vector<double> values) {
  std::ranges::sort(values);
  return {values.front(), sortedQuantile(values, 0.5), values.back()};
}

/// The share of its range that parameter k takes up in these best sets, on the search scale.
double rangeShare(std::span<const Repetition* const> repetitions, const SearchSpace& space, std::size_t k) {
  const double range = space.upper[k] - space.lower[k];
  if (!(range > 0.0)) return 0.0;
  std::vector<double> values;
  for (const Repetition* repetition : repetitions) values.push_back(repetition->best[k]);
  const Spread spread = spreadOf(std::move(values));
  return (spread.greatest - spread.least) / range;
}

std::string whyText(const Repetition& repetition) {
  std::string_view why = repetition.termination;
  takeText(why, "Optimisation terminated: ");
  return why.empty() ? "has not ended" : std::string(why);
}

std::vector<std::string> tableLines(std::span<const Repetition> repetitions, std::int32_t planned) {
  std::vector<std::string> lines{
      std::ssize(repetitions) == planned
          ? fmt::format("The {} repetitions of the search:", planned)
          : fmt::format("The {} of {} repetitions of the search that had begun:", repetitions.size(), planned)};
  lines.push_back(fmt::format("   {:>3} {:>11} {:>11} {:>14} {:>14}  {}", "No.", "seed", "evaluations", "best value",
                              "found by No.", "why it stopped"));
  int number = 0;
  for (const Repetition& repetition : repetitions) {
    const bool hasBest = repetition.bestEvaluation > 0;
    lines.push_back(fmt::format("   {:>3} {:>11} {:>11} {:>14} {:>14}  {}", ++number, repetition.seed,
                                repetition.evaluations, hasBest ? fmt::format("{:.6g}", repetition.aggregate) : "none",
                                hasBest ? fmt::format("{}", repetition.bestEvaluation) : "", whyText(repetition)));
  }
  return lines;
}

class SpreadText final {
 public:
  /// `ended`: those that have ended with a best set, two or more.
  SpreadText(std::vector<const Repetition*> ended, const SearchSpace& space) : ended_(std::move(ended)), space_(space) {
    std::vector<double> values;
    for (const Repetition* repetition : ended_) values.push_back(repetition->aggregate);
    values_ = spreadOf(std::move(values));
    const double most = values_.least + kNearlyEqualShare * std::abs(values_.least);
    std::ranges::copy_if(ended_, std::back_inserter(near_),
                         [most](const Repetition* repetition) { return repetition->aggregate <= most; });
  }

  std::vector<std::string> lines() const {
    std::vector<std::string> lines{fmt::format(
        "Best values: least {:.6g}, median {:.6g}, greatest {:.6g}; {} of {} repetitions ended within {:g} % of the "
        "least",
        values_.least, values_.median, values_.greatest, near_.size(), ended_.size(), 100.0 * kNearlyEqualShare)};
    for (std::string& line : parameterTable()) lines.push_back(std::move(line));
    if (!isSameEachTime()) lines.push_back(otherMinimaText());
    const std::string wide = wideParameters();
    if (near_.size() < 2) return lines;
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

  std::vector<std::string> parameterTable() const {
    std::vector<std::string> headings{"least", "median", "greatest", "% of range"};
    const bool showsNear = near_.size() > 1 && !isSameEachTime();
    if (showsNear) headings.push_back(fmt::format("% ({} least)", near_.size()));
    std::vector<std::vector<double>> rows;
    for (std::size_t k = 0; k < space_.size(); ++k) {
      std::vector<double> values;
      for (const Repetition* repetition : ended_) values.push_back(toModelScale(space_, k, repetition->best[k]));
      const Spread spread = spreadOf(std::move(values));
      rows.push_back({spread.least, spread.median, spread.greatest, 100.0 * rangeShare(ended_, space_, k)});
      if (showsNear) rows.back().push_back(100.0 * rangeShare(near_, space_, k));
    }
    return formatTable("Parameters of the best sets", headings, space_.names, rows);
  }

  std::string otherMinimaText() const {
    std::string text = fmt::format(
        "The search has not found the same minimum each time: {} of {} repetitions ended within {:g} % of the least "
        "value",
        near_.size(), ended_.size(), 100.0 * kNearlyEqualShare);
    if (values_.least > 0.0) {
      text += fmt::format(", and the worst {:.3g} % above it", 100.0 * (values_.greatest / values_.least - 1.0));
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
  std::vector<const Repetition*> near_;  ///< those that ended within kNearlyEqualShare of the least value
  const SearchSpace& space_;
  Spread values_;
};

}  // namespace

std::vector<std::string> repetitionLines(std::span<const Repetition> repetitions, const SearchSpace& space,
                                         std::int32_t planned) {
  std::vector<std::string> lines = tableLines(repetitions, planned);
  std::vector<const Repetition*> ended;
  for (const Repetition& repetition : repetitions) {
    if (!repetition.termination.empty() && repetition.bestEvaluation > 0) ended.push_back(&repetition);
  }
  if (ended.size() < 2) return lines;
  const std::vector<std::string> spread = SpreadText(std::move(ended), space).lines();
  lines.insert(lines.end(), spread.begin(), spread.end());
  return lines;
}

}  // namespace mirevo
