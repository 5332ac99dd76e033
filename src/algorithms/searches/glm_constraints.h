#pragma once

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/searches/glm_step.h"
#include "common/parameter_set.h"
#include "parameters/feasibility.h"

namespace mirevo {

/// Leads the steps of GLM along the constraints that they would violate. Constraints are expressions of the parameters,
/// whose derivatives need no model run.
class GlmConstraints final {
 public:
  GlmConstraints(Feasibility feasibility, SearchBounds bounds)
      : feasibility_(std::move(feasibility)), bounds_(std::move(bounds)) {}

  bool areAny() const { return feasibility_.constraintCount() > 0; }

  /// The set that a step leads to within these constraints.
  using Step = std::function<ParameterSet(std::span<const LinearConstraint> kept)>;
  /// The set of the step that keeps to none if that meets them; else it is made within those that it violates, and so
  /// on until none is violated any more, or no further one is: then it is not one that can be run.
  ParameterSet led(const Step& step, std::span<const double> current) const;
  /// The set moved to the inner side of the constraints that it violates, by Newton's method; curved ones need it.
  ParameterSet movedInside(ParameterSet set) const;
  /// Those at which the set lies, linearised there.
  std::vector<LinearConstraint> holding(std::span<const double> set) const;
  /// Those constraints for people.
  std::vector<std::string> holdingTexts(std::span<const double> set) const;
  /// Those that the set violates.
  std::vector<std::string> violatedTexts(std::span<const double> set) const;

 private:
  /// Of all constraints; a normal of zeros where there are no derivatives.
  std::vector<LinearConstraint> linearised(std::span<const double> set) const;
  /// How much the margin may change between the bounds, to judge by what is small.
  double extentOf(const LinearConstraint& constraint) const;
  bool isAt(const LinearConstraint& constraint) const;

  Feasibility feasibility_;
  SearchBounds bounds_;
};

}  // namespace mirevo
