#pragma once

#include <span>
#include <string>
#include <vector>

#include "run/results/failure_table.h"

namespace mirevo {

/// Failed evaluations of one kind.
struct FailureReason {
  std::string reason;  ///< that of the first evaluation
  int count = 0;
  std::string example;  ///< the number of the first evaluation and the last lines that its batch printed
};

/// Groups failed evaluations by their reasons, the most frequent first. Reasons that differ only in numbers (a slot's
/// folder, a value) count as one.
std::vector<FailureReason> groupFailures(std::span<const FailureRow> failures);

}  // namespace mirevo
