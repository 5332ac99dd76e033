#pragma once

#include <cstddef>
#include <functional>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace mirevo {

/// How a constraint stands at a set.
struct ConstraintMargin {
  /// The difference of its sides, below 0 where it is violated; NaN where a side has no finite value.
  double value = std::numeric_limits<double>::quiet_NaN();
  double size = 0.0;  ///< of both sides
  bool isStrict = false;

  bool isViolated() const { return value < 0.0 || (isStrict && value == 0.0); }
};

/// Tells before its evaluation whether a parameter set (search scale) can be run: whether it meets the constraints and
/// all equations have a value. Without a test, for a model without constraints and dependent parameters, nothing is
/// asked and every set can.
class Feasibility final {
 public:
  /// Why a set cannot be run, one line; empty if it can.
  using Test = std::function<std::optional<std::string>(std::span<const double> set)>;

  Feasibility() = default;
  /// By how much a set that cannot be run violates the constraints: more than 0; infinite where that is not defined.
  using Amount = std::function<double(std::span<const double> set)>;
  explicit Feasibility(Test test, bool hasConstraints = true, Amount amount = {})
      : test_(std::move(test)), hasConstraints_(hasConstraints), amount_(std::move(amount)) {}

  /// The margins of all constraints at a set.
  using Margins = std::function<std::vector<ConstraintMargin>(std::span<const double> set)>;
  /// `texts`: each constraint for people, "constraint 1 (a + b <= 2)".
  void setMargins(Margins margins, std::vector<std::string> texts) {
    margins_ = std::move(margins);
    texts_ = std::move(texts);
  }
  /// Of which the margins are known.
  std::size_t constraintCount() const { return texts_.size(); }
  const std::string& constraintText(std::size_t c) const { return texts_[c]; }
  std::vector<ConstraintMargin> margins(std::span<const double> set) const {
    return margins_ ? margins_(set) : std::vector<ConstraintMargin>();
  }

  bool isTested() const { return test_ != nullptr; }
  std::optional<std::string> violation(std::span<const double> set) const { return test_ ? test_(set) : std::nullopt; }
  /// 0 if the set can be run; 1 where nobody says by how much it violates the constraints.
  double violationAmount(std::span<const double> set) const {
    if (holds(set)) return 0.0;
    return amount_ ? amount_(set) : 1.0;
  }
  /// With which a task ends that finds no set that can be run.
  std::string_view noSetMessage() const {
    return hasConstraints_ ? "Error: No parameter set found that satisfies the constraints"
                           : "Error: No parameter set found for which all equations have a finite value";
  }
  bool holds(std::span<const double> set) const { return !violation(set); }

 private:
  Test test_;
  bool hasConstraints_ = true;
  Amount amount_;
  Margins margins_;
  std::vector<std::string> texts_;
};

}  // namespace mirevo
