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
  explicit Feasibility(Test test, bool hasConstraints = true)
      : test_(std::move(test)), hasConstraints_(hasConstraints) {}

  bool isTested() const { return test_ != nullptr; }
  std::optional<std::string> violation(std::span<const double> set) const { return test_ ? test_(set) : std::nullopt; }
  /// With which a task ends that finds no set that can be run.
  std::string_view noSetMessage() const {
    return hasConstraints_ ? "Error: No parameter set found that satisfies the constraints"
                           : "Error: No parameter set found for which all equations have a finite value";
  }
  bool holds(std::span<const double> set) const { return !violation(set); }

 private:
  Test test_;
  bool hasConstraints_ = true;
};

}  // namespace mirevo
