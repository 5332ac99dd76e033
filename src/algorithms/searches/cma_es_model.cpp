#include <algorithm>
#include <limits>
#include <numeric>

#include "algorithms/searches/cma_es.h"

namespace mirevo {
namespace {

/// The points in the order of their values, those without one behind; the first `parents` of them sorted by their
/// places in the generation, as of these it matters only which they are.
struct Ranking {
  std::size_t best = 0;
  std::vector<std::size_t> parents;
  std::vector<std::size_t> order;
};

Ranking rankingOf(std::span<const std::optional<double>> values, std::size_t parents) {
  Ranking ranking;
  ranking.order.resize(values.size());
  std::iota(ranking.order.begin(), ranking.order.end(), std::size_t{0});
  const auto valueOf = [&](std::size_t i) { return values[i].value_or(std::numeric_limits<double>::infinity()); };
  std::ranges::stable_sort(ranking.order, [&](std::size_t a, std::size_t b) { return valueOf(a) < valueOf(b); });
  ranking.best = ranking.order.front();
  ranking.parents.assign(ranking.order.begin(), ranking.order.begin() + static_cast<std::ptrdiff_t>(parents));
  std::ranges::sort(ranking.parents);
  return ranking;
}

}  // namespace

void CmaEs::predict(std::vector<Point>& points) const {
  for (Point& point : points) {
    if (!point.isRun) point.value = surrogate_->predict(problem_.selector->scaled(point.set));
  }
}

/// Points that make a run that was made have its value, as integer parameters bring about; where all do, but for one,
/// so that every generation costs a run. Returns how many have.
std::size_t CmaEs::takeKnown(std::vector<Point>& points) const {
  std::size_t count = 0;
  for (Point& point : points) {
    const std::vector<double> place = problem_.selector->scaled(point.set);
    point.isRun = count + 1 < points.size() && surrogate_->isKnown(place);
    if (!point.isRun) continue;
    point.value = surrogate_->valueOf(place);
    ++count;
  }
  return count;
}

bool CmaEs::proposeMinimum(std::vector<Point>& points) const {
  const auto best = std::ranges::min_element(points, [](const Point& a, const Point& b) {
    return a.value.value_or(std::numeric_limits<double>::infinity()) <
           b.value.value_or(std::numeric_limits<double>::infinity());
  });
  const auto placeOf = [this](const std::vector<double>& place) -> std::optional<std::vector<double>> {
    const ParameterSet set = setAt(place);
    if (!problem_.feasibility.holds(set)) return std::nullopt;
    return problem_.selector->scaled(set);
  };
  const auto place = surrogate_->minimum(problem_.selector->scaled(best->set), placeOf);
  if (!place) return false;
  Point& point = points.back();
  point.set = setAt(*place);
  point.place = relative(point.set);
  point.step = distribution_->stepTo(point.place);
  distribution_->limitLength(point.step);
  point.value = surrogate_->predict(*place);
  return true;
}

bool CmaEs::runWithModel(std::vector<Point>& points) {
  const std::size_t lambda = points.size();
  const std::size_t perRun = problem_.selector->proposalsPerRun();
  const std::size_t batch = (lambda + perRun - 1) / perRun;
  if (firstRuns_ == 0 || firstRuns_ > lambda) firstRuns_ = lambda;
  firstRuns_ = std::max(firstRuns_, batch);
  const auto rankingNow = [&] {
    std::vector<std::optional<double>> values;
    values.reserve(lambda);
    for (const Point& point : points) values.push_back(point.value);
    return rankingOf(values, distribution_->constants().parents);
  };
  const auto bestLeft = [&](const Ranking& ranking, std::size_t count) {
    std::vector<std::size_t> chosen;
    for (const std::size_t i : ranking.order) {
      if (!points[i].isRun && chosen.size() < count) chosen.push_back(i);
    }
    return chosen;
  };

  predict(points);
  const bool hasMinimum = proposeMinimum(points);
  std::size_t made = takeKnown(points);
  Ranking before = rankingNow();
  if (hasMinimum) {
    const auto minimum = std::ranges::find(before.order, lambda - 1);
    std::rotate(before.order.begin(), minimum, minimum + 1);
  }
  const std::vector<std::size_t> first = bestLeft(before, firstRuns_);
  if (!runPoints(points, first)) return false;
  made += first.size();
  int furtherBatches = 0;
  while (made < lambda) {
    if (!surrogate_->fit(*distribution_)) break;
    predict(points);
    const Ranking now = rankingNow();
    // A form of what Bouzarkouna, Auger and Ding (2010) ask for: the parents are the same, or, with a quarter of the
    // generation run, the best.
    if (now.parents == before.parents || (now.best == before.best && 4 * made >= lambda)) break;
    before = now;
    const std::vector<std::size_t> next = bestLeft(now, batch);
    if (!runPoints(points, next)) return false;
    made += next.size();
    ++furtherBatches;
  }
  if (furtherBatches > 1) {
    firstRuns_ = std::min(lambda, firstRuns_ + batch);
  } else {
    firstRuns_ = firstRuns_ > 2 * batch ? firstRuns_ - batch : batch;
  }
  // A prediction must not be better than what was found.
  double best = std::numeric_limits<double>::infinity();
  for (const Point& point : points) {
    if (point.isRun && point.value) best = std::min(best, *point.value);
  }
  for (Point& point : points) {
    if (!point.isRun && point.value) point.value = std::max(*point.value, best);
  }
  return true;
}

}  // namespace mirevo
