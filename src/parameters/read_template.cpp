#include "parameters/read_template.h"

#include <utility>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "parameters/template_doubts.h"

namespace mirevo {

ReadTemplate readTemplate(const ParameterFileItem& item, std::span<const ModelParameter> parameters) {
  const std::string name(trimTrailing(item.templateFileName));
  const bool isNumericId = item.templateType == TemplateType::numericId;
  std::string reason;
  const auto text = readTextFile(name, reason);
  if (!text) {
    fatalError((isNumericId ? "Error: Unable to open " : "Error: Unable to open template file ") + name, reason);
  }
  try {
    std::string converted = isNumericId ? ConvertIdTemplate(name, *text, parameters) : std::string();
    ParameterTemplate filled(name, isNumericId ? converted : *text, parameters, isNumericId);
    std::vector<std::string> doubts = templateDoubts(filled, item.templateType, *text, parameters);
    return {std::move(filled), std::move(converted), std::move(doubts)};
  } catch (const FatalError& error) {
    fatalError(error.message(), error.detail() + hintOnMisreadTemplate(item.templateType, *text, parameters));
  }
}

}  // namespace mirevo
