#pragma once

#include <span>
#include <string>
#include <vector>

#include "parameters/template_file.h"
#include "run/access/setup_access.h"

namespace mirevo {

/// Warns in the log about everything in the setup file that no reader will ever look at: unknown sections and keywords,
/// with the nearest known name, and repeated ones of which only the first counts.
void warnAboutUnusedEntries(SetupFile& file);

/// One warning a variable parameter that changes nothing in the model: no template names it, and no dependent parameter
/// that a template names is computed from it. A search would spend its evaluations on it.
std::vector<std::string> unusedParameterWarnings(std::span<const ModelParameter> parameters,
                                                 std::span<const ParameterTemplate> templates);

}  // namespace mirevo
