#pragma once

#include <span>
#include <string>
#include <vector>

#include "parameters/template_file.h"

namespace mirevo {

/// A template as it is filled, and the text that a numeric-ID template was converted into; empty for other templates.
struct ReadTemplate {
  ParameterTemplate filled;
  std::string converted;
  std::vector<std::string> doubts;  ///< warnings that it may be read in another way than meant
};

/// Reads the template of a parameter file. Throws FatalError if the file cannot be read, and as ConvertIdTemplate() and
/// ParameterTemplate do.
ReadTemplate readTemplate(const ParameterFileItem& item, std::span<const ModelParameter> parameters);

}  // namespace mirevo
