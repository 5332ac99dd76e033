#pragma once

#include <span>
#include <string>
#include <vector>

#include "parameters/template_file.h"
#include "run/access/setup_access.h"

namespace mirevo {

/// Warns in the log about everything in the setup file that is never read: unknown sections and keywords, with the
/// nearest known name, and repeated ones of which only the first counts.
void warnAboutUnusedEntries(SetupFile& file);

/// One warning per parameter that has no effect on the model: no template names it, and no dependent parameter named in
/// a template is computed from it. A fixed or dependent one may be there for a constraint.
std::vector<std::string> unusedParameterWarnings(std::span<const ModelParameter> parameters,
                                                 std::span<const InternalConstraint> constraints,
                                                 std::span<const ParameterTemplate> templates);

}  // namespace mirevo
