#pragma once

#include <optional>
#include <string>
#include <vector>

#include "algorithms/analyses/evaluated_sample.h"
#include "parameters/feasibility.h"
#include "run/results/restart_settings.h"
#include "run/results/run_record.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// Of an earlier run whose parameters had other bounds than the setup gives them: which, and how many of its sets lie
/// outside those of the setup. Without the settings of that run (`then`), the sets alone are told of. Empty where there
/// is nothing to say.
std::string otherBoundsText(const std::string& resultFile, const std::optional<RestartSettings>& then,
                            const RunConfig& config, const EarlierSample& earlier);

/// That sets of successful evaluations have values between those of an integer parameter of the setup, and that they
/// violate its constraints.
std::vector<std::string> otherSetsTexts(const std::string& resultFile, const RunConfig& config,
                                        const Feasibility& feasibility, const EvaluatedSample& sample);

/// That the earlier run did not come to its end, and that more of its evaluations failed than a run may have. Nothing
/// is said of an end that is not known, as the record of the run is not there.
std::vector<std::string> unfinishedRunTexts(const std::string& resultFile, const std::optional<RunRecord>& record,
                                            const EvaluatedSample& sample);

}  // namespace mirevo
