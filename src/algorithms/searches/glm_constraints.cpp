#include "algorithms/searches/glm_constraints.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "algorithms/numbers/row_space.h"

namespace mirevo {
namespace {

/// Step of the differences of a margin, as a share of the range: equations have all digits.
constexpr double kStep = 1.0e-5;
/// A set lies at a constraint if its margin is at most this share of what it can change between the bounds.
constexpr double kNear = 1.0e-6;
/// How far inside a set is moved, as such a share: so that rounding does not bring it back across.
constexpr double kInside = 1.0e-14;

}  // namespace

std::vector<LinearConstraint> GlmConstraints::linearised(std::span<const double> set) const {
  std::vector<LinearConstraint> found;
  const std::vector<ConstraintMargin> here = feasibility_.margins(set);
  found.reserve(here.size());
  for (const ConstraintMargin& margin : here) {
    found.push_back({std::vector<double>(set.size(), 0.0), margin.value});
  }
  ParameterSet moved(set.begin(), set.end());
  for (std::size_t j = 0; j < set.size(); ++j) {
    const double step = kStep * (bounds_.upper[j] - bounds_.lower[j]);
    const double high = std::min(set[j] + step, bounds_.upper[j]);
    const double low = std::max(set[j] - step, bounds_.lower[j]);
    moved[j] = high;
    const std::vector<ConstraintMargin> above = feasibility_.margins(moved);
    moved[j] = low;
    const std::vector<ConstraintMargin> below = feasibility_.margins(moved);
    moved[j] = set[j];
    for (std::size_t c = 0; c < here.size(); ++c) {
      const bool hasAbove = std::isfinite(above[c].value);
      const bool hasBelow = std::isfinite(below[c].value);
      const double width = (hasAbove ? high : set[j]) - (hasBelow ? low : set[j]);
      const double change = (hasAbove ? above[c] : here[c]).value - (hasBelow ? below[c] : here[c]).value;
      if (width > 0.0 && std::isfinite(change)) found[c].normal[j] = change / width;
    }
  }
  return found;
}

double GlmConstraints::extentOf(const LinearConstraint& constraint) const {
  double extent = 0.0;
  for (std::size_t j = 0; j < bounds_.size(); ++j) {
    extent += std::abs(constraint.normal[j]) * (bounds_.upper[j] - bounds_.lower[j]);
  }
  return extent;
}

bool GlmConstraints::isAt(const LinearConstraint& constraint) const {
  const double extent = extentOf(constraint);
  return extent > 0.0 && std::abs(constraint.margin) <= kNear * extent;
}

ParameterSet GlmConstraints::led(const Step& step, std::span<const double> current) const {
  ParameterSet set = step({});
  if (feasibility_.holds(set) || !areAny()) return set;
  const std::vector<LinearConstraint> all = linearised(current);
  std::vector<bool> isTaken(all.size(), false);
  std::vector<LinearConstraint> kept;
  for (;;) {
    const std::vector<ConstraintMargin> margins = feasibility_.margins(set);
    const std::size_t before = kept.size();
    for (std::size_t c = 0; c < all.size(); ++c) {
      double expected = all[c].margin;
      for (std::size_t j = 0; j < set.size(); ++j) expected += all[c].normal[j] * (set[j] - current[j]);
      const bool isViolated = std::isnan(margins[c].value) ? expected < 0.0 : margins[c].isViolated();
      if (isTaken[c] || !isViolated || !(extentOf(all[c]) > 0.0)) continue;
      isTaken[c] = true;
      kept.push_back(all[c]);
    }
    if (kept.size() == before) return movedInside(std::move(set));
    set = step(kept);
    if (feasibility_.holds(set)) return set;
  }
}

ParameterSet GlmConstraints::movedInside(ParameterSet set) const {
  constexpr int kMostMoves = 12;
  std::vector<bool> isTaken(feasibility_.constraintCount(), false);
  std::vector<bool> isAtBound(set.size(), false);  // where a move would have left the bounds
  for (int move = 0; move < kMostMoves && !feasibility_.holds(set); ++move) {
    const std::vector<LinearConstraint> all = linearised(set);
    const std::vector<ConstraintMargin> margins = feasibility_.margins(set);
    const double inside = kInside * std::pow(10.0, std::max(0, move - 3));
    RowSpace rows(set.size());
    for (std::size_t c = 0; c < all.size(); ++c) {
      isTaken[c] = isTaken[c] || margins[c].isViolated();
      if (!isTaken[c] || std::isnan(margins[c].value)) continue;
      std::vector<double> row;  // in shares of the ranges
      for (std::size_t j = 0; j < set.size(); ++j) {
        row.push_back(isAtBound[j] ? 0.0 : all[c].normal[j] * (bounds_.upper[j] - bounds_.lower[j]));
      }
      rows.add(row, inside * (extentOf(all[c]) + margins[c].size) - margins[c].value);
    }
    if (rows.size() == 0) break;
    const std::vector<double> change = rows.shortestSolution();
    for (std::size_t j = 0; j < set.size(); ++j) {
      const double value = set[j] + change[j] * (bounds_.upper[j] - bounds_.lower[j]);
      isAtBound[j] = isAtBound[j] || value < bounds_.lower[j] || value > bounds_.upper[j];
      set[j] = std::clamp(value, bounds_.lower[j], bounds_.upper[j]);
    }
  }
  return set;
}

std::vector<LinearConstraint> GlmConstraints::holding(std::span<const double> set) const {
  std::vector<LinearConstraint> found;
  if (!areAny()) return found;
  for (LinearConstraint& constraint : linearised(set)) {
    if (isAt(constraint)) found.push_back(std::move(constraint));
  }
  return found;
}

std::vector<std::string> GlmConstraints::holdingTexts(std::span<const double> set) const {
  std::vector<std::string> texts;
  if (!areAny()) return texts;
  const std::vector<LinearConstraint> all = linearised(set);
  for (std::size_t c = 0; c < all.size(); ++c) {
    if (isAt(all[c])) texts.push_back(feasibility_.constraintText(c));
  }
  return texts;
}

std::vector<std::string> GlmConstraints::violatedTexts(std::span<const double> set) const {
  std::vector<std::string> texts;
  const std::vector<ConstraintMargin> margins = feasibility_.margins(set);
  for (std::size_t c = 0; c < margins.size(); ++c) {
    if (margins[c].isViolated()) texts.push_back(feasibility_.constraintText(c));
  }
  return texts;
}

}  // namespace mirevo
