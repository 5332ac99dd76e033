#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "parameters/model_parameter.h"
#include "parameters/template_file.h"

namespace mirevo {

/// What is valid in a template and suggests that it is read in another way than meant, a warning each: text behind the
/// delimiter, marks of the other kind of template, no placeholder at all.
std::vector<std::string> templateDoubts(const ParameterTemplate& parameterTemplate, TemplateType type,
                                        std::string_view text, std::span<const ModelParameter> parameters);

/// The same for a template that is refused, as a hint behind the reason; empty if there is none.
std::string hintOnMisreadTemplate(TemplateType type, std::string_view text, std::span<const ModelParameter> parameters);

}  // namespace mirevo
