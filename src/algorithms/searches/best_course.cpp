#include "algorithms/searches/best_course.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/rounded_text.h"
#include "common/text.h"
#include "evaluation/evaluation_result.h"

namespace mirevo {
namespace {

constexpr int kFewestEvaluations = 20;  ///< below that halves and tenths say nothing
constexpr double kNoted = 1.0e-3;       ///< share of the best value below which a fall is called small

/// "from 0.52 to 0.48 (7.7 %)"; the share is that of a positive value.
std::string fallText(double from, double to) {
  std::string text = fmt::format("from {:.6g} to {:.6g}", from, to);
  if (to > 0.0) text += fmt::format(" ({} %)", roundedText(100.0 * (from - to) / from, 2));
  return text;
}

}  // namespace

void BestCourse::add(double value) {
  extendTo(evaluationCount_ + 1);
  improve(evaluationCount_, value);
}

void BestCourse::improve(int evaluation, double value) {
  if (!(value < kFailedRunValue) || (!steps_.empty() && !(value < steps_.back().value))) return;
  steps_.push_back({evaluation, value});
}

void BestCourse::clear() {
  evaluationCount_ = 0;
  steps_.clear();
}

double BestCourse::bestAfter(double evaluations) const {
  const auto later = std::upper_bound(steps_.begin(), steps_.end(), evaluations,
                                      [](double count, const Step& step) { return count < step.evaluation; });
  return later == steps_.begin() ? kFailedRunValue : std::prev(later)->value;
}

double BestCourse::expectedFall() const {
  if (steps_.empty()) return 0.0;
  const double end = steps_.back().value;
  const double half = bestAfter(0.5 * evaluationCount_);
  const double quarter = bestAfter(0.25 * evaluationCount_);
  if (quarter >= kFailedRunValue) return 0.0;
  const double later = half - end;
  const double earlier = quarter - half;
  return earlier > later ? later * later / earlier : later;
}

std::vector<std::string> courseLines(const BestCourse& course, bool isBudgetUsed, bool isRepetition,
                                     std::string_view value) {
  const int count = course.evaluationCount();
  if (course.steps().empty() || count < kFewestEvaluations) return {};
  const double best = course.steps().back().value;
  const double half = course.bestAfter(0.5 * count);
  const double tenth = course.bestAfter(0.9 * count);
  std::vector<std::string> lines;
  const std::string_view heading = isRepetition ? "Course over the evaluations of this repetition" : "Course";
  const std::string found = fmt::format("found by {}evaluation {} of {}", isRepetition ? "its " : "",
                                        course.steps().back().evaluation, count);
  const std::string_view others = isRepetition ? "the other repetitions" : "other values of Random_Seed";
  if (half >= kFailedRunValue) {
    lines.push_back(fmt::format("{}: the {}, {}, was {}; none of the first half succeeded", heading, value,
                                formatReal(best), found));
  } else if (half == best) {
    lines.push_back(fmt::format("{}: the {}, {}, was {}; the second half found no better one", heading, value,
                                formatReal(best), found));
  } else {
    lines.push_back(fmt::format(
        "{}: in the second half of the evaluations the {} fell {}, {}; it was {}", heading, value, fallText(half, best),
        tenth == best ? std::string("in the last tenth it did not") : "in the last tenth " + fallText(tenth, best),
        found));
  }
  if (!isBudgetUsed) {
    lines.push_back(
        fmt::format("A larger budget would not have changed this: the search had ended by itself. Whether there is a "
                    "better value elsewhere, {} can tell",
                    others));
    return lines;
  }
  const double fall = course.expectedFall();
  if (half >= kFailedRunValue) return lines;
  if (best == 0.0 || fall <= kNoted * std::abs(best)) {  // sums and squares do not fall below 0
    lines.push_back(fmt::format(
        "The {} has come to rest. A longer run may yet leave its valley, and {} can tell whether there is a "
        "better one elsewhere",
        value, others));
  } else {
    lines.push_back(fmt::format(
        "If it went on falling as it did, {} more evaluations would bring it to about {:.3g}. Such a trend is "
        "rough: what comes is often a fraction of it, and now and then several times as much",
        count, best > 0.0 ? std::max(0.0, best - fall) : best - fall));
  }
  return lines;
}

}  // namespace mirevo
