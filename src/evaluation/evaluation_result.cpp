#include "evaluation/evaluation_result.h"

#include <algorithm>
#include <array>

namespace mirevo {
namespace {

/// In the order of the kinds. These stand in calSimErr.dat, from which a restarted run reads them.
constexpr std::array<std::string_view, 10> kKindNames = {"parameter constraints violated",
                                                         "equation without a finite value",
                                                         "batch could not be started",
                                                         "batch ended with an exit code",
                                                         "batch ended by a signal",
                                                         "batch ran too long",
                                                         "results not written",
                                                         "results not readable",
                                                         "result not finite",
                                                         "reason not known any more"};

}  // namespace

std::string_view failureKindName(EvaluationFailure::Kind kind) {
  return kKindNames.at(static_cast<std::size_t>(kind));
}

std::optional<EvaluationFailure::Kind> failureKindCalled(std::string_view name) {
  const auto found = std::find(kKindNames.begin(), kKindNames.end(), name);
  if (found == kKindNames.end()) return std::nullopt;
  return static_cast<EvaluationFailure::Kind>(found - kKindNames.begin());
}

}  // namespace mirevo
