#include "algorithms/pareto/pareto_archive.h"

#include <algorithm>

#include "algorithms/pareto/dominance.h"

namespace mirevo {
namespace {

bool coversOther(std::span<const double> a, std::span<const double> b) {
  return std::ranges::equal(a, b) || dominates(a, b);
}

}  // namespace

bool ParetoArchive::add(int number, const ParameterSet& set, const std::vector<double>& values) {
  ++evaluationCount_;
  const auto covers = [&values](const FrontMember& member) { return coversOther(member.values, values); };
  if (std::ranges::any_of(members_, covers)) return false;
  std::erase_if(members_, [&values](const FrontMember& member) { return dominates(values, member.values); });
  members_.push_back({number, set, values});
  entries_.push_back({evaluationCount_, values});
  return true;
}

std::vector<std::vector<double>> ParetoArchive::front() const {
  std::vector<std::vector<double>> values;
  values.reserve(members_.size());
  for (const FrontMember& member : members_) values.push_back(member.values);
  return values;
}

const std::vector<std::vector<double>>& FrontHistory::frontAfter(int evaluations) {
  for (; next_ < entries_.size() && entries_[next_].evaluation <= evaluations; ++next_) {
    const std::vector<double>& values = entries_[next_].values;
    std::erase_if(front_, [&values](const std::vector<double>& other) { return dominates(values, other); });
    front_.push_back(values);
  }
  return front_;
}

}  // namespace mirevo
