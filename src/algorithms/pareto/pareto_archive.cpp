#include "algorithms/pareto/pareto_archive.h"

namespace mirevo {
namespace {

bool isAtMost(std::span<const double> a, std::span<const double> b) {
  for (std::size_t i = 0; i < a.size(); ++i) {
    if (!(a[i] <= b[i])) return false;
  }
  return true;
}

template <class Element>
void leaveOut(std::vector<Element>& elements, const std::vector<bool>& isLeftOut) {
  std::size_t place = 0;
  std::erase_if(elements, [&](const Element&) { return isLeftOut[place++]; });
}

}  // namespace

bool ParetoArchive::add(int number, const ParameterSet& set, const std::vector<double>& values) {
  ++evaluationCount_;
  for (std::size_t i = 0; i < points_.size(); ++i) {
    if (isAtMost(points_[i], values)) return false;
  }
  // Those that it is at most, it dominates: it equals none.
  std::vector<bool> isDominated;
  for (std::size_t i = 0; i < points_.size(); ++i) {
    if (!isAtMost(values, points_[i])) continue;
    isDominated.resize(points_.size());
    isDominated[i] = true;
    entries_[places_[i]].dominatedBy = evaluationCount_;
  }
  if (!isDominated.empty()) {
    leaveOut(members_, isDominated);
    leaveOut(places_, isDominated);
    points_.leaveOut(isDominated);
  }
  members_.push_back({number, set, values});
  points_.add(values);
  places_.push_back(entries_.size());
  entries_.push_back({evaluationCount_, values});
  return true;
}

std::vector<std::vector<double>> ParetoArchive::front() const {
  std::vector<std::vector<double>> values;
  values.reserve(members_.size());
  for (const FrontMember& member : members_) values.push_back(member.values);
  return values;
}

std::vector<std::vector<double>> ParetoArchive::frontAfter(int evaluations) const {
  std::vector<std::vector<double>> values;
  for (const Entry& entry : entries_) {
    if (entry.evaluation > evaluations) break;
    if (entry.dominatedBy > evaluations) values.push_back(entry.values);
  }
  return values;
}

}  // namespace mirevo
