#pragma once

#include <functional>
#include <optional>
#include <span>
#include <string>
#include <utility>

namespace mirevo {

/// Tells before its evaluation whether a parameter set (search scale) can be run: whether it meets the constraints and
/// all equations have a value. Without a test, for a model without constraints, nothing is asked and every set can.
class Feasibility final {
 public:
  /// Why a set cannot be run, one line; empty if it can.
  using Test = std::function<std::optional<std::string>(std::span<const double> set)>;

  Feasibility() = default;
  explicit Feasibility(Test test) : test_(std::move(test)) {}

  bool isTested() const { return test_ != nullptr; }
  std::optional<std::string> violation(std::span<const double> set) const { return test_ ? test_(set) : std::nullopt; }
  bool holds(std::span<const double> set) const { return !violation(set); }

 private:
  Test test_;
};

}  // namespace mirevo
