#include "run/tasks/sensitivity_section.h"

namespace mirevo {

const SettingSection<Task>& sensitivitySection() {
  static const SettingSection<Task> section{{std::string_view(kSensitivitySection),
                                             "when `Option` is 1",
                                             "Sensitivity analysis.",
                                             {choice<Task>([](Task& /*task*/, const SetupValue& /*value*/) {},
                                                           {.name = kSensitivityTypeKeyword,
                                                            .range = between(0, 0),
                                                            .codes = kSensitivityTypeNames,
                                                            .refusal = "Error: Invalid sensitivity type selection",
                                                            .meaning = "0 local sensitivity analysis."})}}};
  return section;
}

}  // namespace mirevo
