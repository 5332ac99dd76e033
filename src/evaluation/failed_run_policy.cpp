#include "evaluation/failed_run_policy.h"

#include <fmt/core.h>

#include "common/fatal_error.h"

namespace mirevo {

void FailedRunPolicy::countFailure(int number, const EvaluationFailure& failure) {
  if (isFolderWanted(failure)) --foldersLeft_;
  ++failedCount_;
  if (failure.isOfConstraints()) ++notRunCount_;
  if (failedCount_ <= limit_) return;
  const std::string notRun =
      notRunCount_ == 0
          ? ""
          : fmt::format(", {} of them not run as they violate a constraint or an equation has no finite value",
                        notRunCount_);
  std::string detail = fmt::format(
      "failed evaluations: {}{}; at most {} may fail, a tenth of the {} planned\nthe last of them, No. {}: {}",
      failedCount_, notRun, limit_, planned_, number, failure.reason);
  for (const std::string& line : failure.lastOutput) detail += "\n| " + line;
  fatalError(kTooManyFailures, detail);
}

}  // namespace mirevo
