#pragma once

#include <span>
#include <string>
#include <vector>

#include "run/results/failure_table.h"

namespace mirevo {

/// Failed evaluations of one kind.
struct FailureReason {
  std::string reason;  ///< of the first of them
  int count = 0;
  std::string example;  ///< the first of them: its number, and the last lines that its batch printed
};

/// Groups failed evaluations by their reasons, the most frequent first. Reasons that differ in numbers alone (a slot's
/// folder, a value) are one.
std::vector<FailureReason> groupFailures(std::span<const FailureRow> failures);

}  // namespace mirevo
