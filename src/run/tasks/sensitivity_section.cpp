#include "run/tasks/sensitivity_section.h"

namespace mirevo {

const SettingSection<Task>& sensitivitySection() {
  static const SettingSection<Task> section{
      {std::string_view(kSensitivitySection),
       "when `Option` is 1",
       "Sensitivity analysis.",
       {choice<Task>([](Task& /*task*/, const SetupValue& /*value*/) {},
                     {.name = kSensitivityTypeKeyword,
                      .range = between(0, 0),
                      .codes = kSensitivityTypeNames,
                      .refusal = "Error: Invalid sensitivity type selection",
                      .meaning = "0 local sensitivity analysis; `'Morris'` screening by elementary effects; `'Sobol'` "
                                 "Sobol' indices."}),
        setting<&Task::randomSeed>(
            {.name = "Random_Seed",
             .defaultValue = "1",
             .meaning = "Seed of the run, from which a design with random numbers is drawn; its sign does not matter. "
                        "A local sensitivity analysis draws none."})}}};
  return section;
}

}  // namespace mirevo
