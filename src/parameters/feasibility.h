#pragma once

#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>

namespace mirevo {

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
};

}  // namespace mirevo
