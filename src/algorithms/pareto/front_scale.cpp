#include "algorithms/pareto/front_scale.h"

#include <algorithm>
#include <cmath>
#include <functional>

#include <fmt/format.h>

#include "algorithms/pareto/dominance.h"
#include "algorithms/pareto/hypervolume.h"
#include "common/rounded_text.h"

namespace mirevo {
namespace {

constexpr int kFewestEvaluations = 20;  ///< below that halves and tenths say nothing
constexpr double kNoted = 1.0e-3;       ///< share of the hypervolume below which a rise is called small

double widthOf(double ideal, double nadir) {
  if (nadir > ideal) return nadir - ideal;
  return ideal != 0.0 ? std::abs(ideal) : 1.0;
}

}  // namespace

FrontScale::FrontScale(const PointTable& front, std::span<const double> reference)
    : ideal_(front[0].begin(), front[0].end()), nadir_(ideal_) {
  for (std::size_t k = 1; k < front.size(); ++k) {
    for (std::size_t i = 0; i < ideal_.size(); ++i) {
      ideal_[i] = std::min(ideal_[i], front[k][i]);
      nadir_[i] = std::max(nadir_[i], front[k][i]);
    }
  }
  if (reference.size() == ideal_.size()) {
    reference_ = scaled(reference);
  } else {
    reference_.assign(ideal_.size(), kUsualReference);
  }
}

std::vector<double> FrontScale::scaled(std::span<const double> values) const {
  std::vector<double> result(values.size());
  for (std::size_t i = 0; i < values.size(); ++i) {
    result[i] = (values[i] - ideal_[i]) / widthOf(ideal_[i], nadir_[i]);
  }
  return result;
}

double FrontScale::distance(std::span<const double> values) const {
  double sum = 0.0;
  for (const double value : scaled(values)) sum += value * value;
  return std::sqrt(sum);
}

bool FrontScale::isReferenceUsable() const {
  return std::ranges::all_of(reference_, [](double value) { return value > 0.0; });
}

bool FrontScale::isBelowReference(std::span<const std::vector<double>> front) const {
  return std::ranges::any_of(front, [this](const std::vector<double>& values) {
    const std::vector<double> place = scaled(values);
    return std::ranges::equal(place, reference_, std::less<>());
  });
}

double FrontScale::hypervolumeShare(std::span<const std::vector<double>> front) const {
  if (!isReferenceUsable()) return 0.0;
  double box = 1.0;
  for (const double value : reference_) box *= value;
  std::vector<std::vector<double>> points;
  for (const std::size_t i : spreadOver(front, mostPointsOfHypervolume(ideal_.size()))) {
    points.push_back(scaled(front[i]));
  }
  return hypervolume(points, reference_) / box;
}

std::optional<std::size_t> nearestToIdeal(std::span<const FrontMember> members) {
  if (members.empty()) return std::nullopt;
  std::vector<std::vector<double>> front;
  for (const FrontMember& member : members) front.push_back(member.values);
  const FrontScale scale(front);
  const auto nearest = std::ranges::min_element(
      front, {}, [&scale](const std::vector<double>& values) { return scale.distance(values); });
  return static_cast<std::size_t>(nearest - front.begin());
}

std::vector<FrontStage> frontCourse(const ParetoArchive& archive, std::span<const double> reference, int most) {
  std::vector<FrontStage> course;
  if (archive.members().empty()) return course;
  const FrontScale scale(archive.points(), reference);
  const int last = archive.evaluationCount();
  const int count = std::min(most, last);
  for (int i = 1; i <= count; ++i) {
    const auto evaluations = static_cast<int>(std::int64_t{last} * i / count);
    const std::vector<std::vector<double>> front = archive.frontAfter(evaluations);
    course.push_back({evaluations, front.size(), scale.hypervolumeShare(front)});
  }
  return course;
}

std::vector<std::string> frontCourseLines(const ParetoArchive& archive, std::span<const double> reference,
                                          bool isBudgetUsed, bool isRepetition) {
  const int count = archive.evaluationCount();
  if (archive.members().empty() || count < kFewestEvaluations) return {};
  const FrontScale scale(archive.points(), reference);
  if (!scale.isBelowReference(archive.front())) return {};
  const std::string_view whose = isRepetition ? "Course over the evaluations of this repetition" : "Course";
  const std::string last =
      fmt::format("{}evaluation {} of {}", isRepetition ? "its " : "", archive.entries().back().evaluation, count);
  const double quarter = scale.hypervolumeShare(archive.frontAfter(count / 4));
  const double half = scale.hypervolumeShare(archive.frontAfter(count / 2));
  const double tenth = scale.hypervolumeShare(archive.frontAfter(static_cast<int>(std::int64_t{count} * 9 / 10)));
  const double end = scale.hypervolumeShare(archive.front());
  const auto riseText = [](double from, double to) {
    if (to <= from) return std::string("did not grow");
    return fmt::format("grew from {:.6g} to {:.6g} ({} %)", from, to, roundedText(100.0 * (to - from) / to, 2));
  };
  std::vector<std::string> lines;
  // A single set has no extent of which a share could be missing: whatever it replaced, its hypervolume is all.
  const bool isOneSet = archive.members().size() == 1;
  if (isOneSet) {
    lines.push_back(fmt::format("{}: the front is a single set, {}, so that the growth of its hypervolume says nothing",
                                whose, last));
  } else {
    lines.push_back(
        fmt::format("{}: in the second half of the evaluations the hypervolume {}, in the last tenth it {}; the last "
                    "set to join the front was {}",
                    whose, riseText(half, end), riseText(tenth, end), last));
  }
  const std::string_view others = isRepetition ? "the other repetitions" : "other values of Random_Seed";
  if (!isBudgetUsed) {
    lines.push_back(fmt::format(
        "The search had ended by itself, before its budget was used up. {}; {} can tell whether there is a better "
        "front",
        isRepetition ? "A smaller Hypervolume_Change would have taken it further"
                     : "A restart with a larger one takes it further",
        others));
    return lines;
  }
  if (isOneSet) return lines;
  const double later = end - half;
  const double earlier = half - quarter;
  const double rise = earlier > later ? later * later / earlier : later;
  if (rise <= kNoted * end) {
    lines.push_back(
        fmt::format("The hypervolume has come to rest; {} can tell whether there is a better front", others));
  } else {
    lines.push_back(
        fmt::format("If it went on growing as it did, {} more evaluations would add about {} % to it. Such a trend "
                    "is rough",
                    count, roundedText(100.0 * rise / end, 2)));
  }
  return lines;
}

}  // namespace mirevo
