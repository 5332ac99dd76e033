#include "parameters/read_template.h"

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {

ReadTemplate readTemplate(const ParameterFileItem& item, std::span<const ModelParameter> parameters) {
  const std::string name(trimTrailing(item.templateFileName));
  const bool isNumericId = item.templateType == TemplateType::numericId;
  std::string reason;
  const auto text = readTextFile(name, reason);
  if (!text) {
    fatalError((isNumericId ? "Error: Unable to open " : "Error: Unable to open template file ") + name, reason);
  }
  if (!isNumericId) return {ParameterTemplate(name, *text, parameters), {}};
  std::string converted = ConvertIdTemplate(name, *text, parameters);
  ParameterTemplate filled(name, converted, parameters, true);
  return {std::move(filled), std::move(converted)};
}

}  // namespace mirevo
