#include "algorithms/analyses/morris_settings.h"

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {

const SettingSection<MorrisSettings>& morrisSection() {
  using Settings = MorrisSettings;
  static const SettingSection<MorrisSettings> section{
      {"SENSITIVITY_ANALYSIS/MORRIS",
       "when `Sensitivity_Type` is `'Morris'`, if it is there",
       "Screening by elementary effects (Morris), see [Morris screening](morris.md).",
       {setting<&Settings::trajectories>(
            {.name = kTrajectoriesKeyword,
             .defaultValue = "30",
             .range = from(2),
             .refusal = "Error: Number of trajectories in Morris analysis invalid",
             .meaning = "Elementary effects of each parameter; each trajectory takes one model run for every variable "
                        "parameter and one more."}),
        choice<Settings>(
            [](Settings& s, const SetupValue& value) {
              const bool isChain = equalIgnoringCase(std::get<std::string>(value), kEffectDesignNames[1].name);
              s.design = isChain ? EffectDesign::trajectories : EffectDesign::radial;
            },
            {.name = "Design",
             .defaultValue = "'radial'",
             .codes = kEffectDesignNames,
             .meaning = "From where a parameter steps: from the base point of its trajectory, which is a Sobol' point, "
                        "or from where the parameter before it has stepped to, on levels."}),
        checked<Settings>(
            setting<&Settings::levels>({.name = kLevelsKeyword,
                                        .defaultValue = "4",
                                        .range = between(4, 64),
                                        .refusal = "Error: Number of levels in Morris analysis invalid",
                                        .meaning = "Of `Design = 'trajectories'`: values of a parameter, an even "
                                                   "number; a step goes over a quarter to three quarters of them."}),
            [](const Settings& s) -> std::optional<SettingRefusal> {
              if (s.levels % 2 == 0) return std::nullopt;
              return SettingRefusal{"Error: Number of levels in Morris analysis invalid", kLevelsKeyword,
                                    fmt::format("expected an even number, found {}", s.levels)};
            }),
        setting<&Settings::candidates>(
            {.name = kCandidatesKeyword,
             .defaultValue = "50",
             .range = between(1, 100000),
             .refusal = "Error: Number of candidate designs in Morris analysis invalid",
             .meaning = "Of `Design = 'trajectories'`: random designs of which the one is taken whose trajectories "
                        "differ most."}),
        setting<&Settings::bootstrapSamples>(
            {.name = "Bootstrap_Samples",
             .defaultValue = "1000",
             .range = between(100, 100000),
             .refusal = "Error: Number of bootstrap samples in Morris analysis invalid",
             .meaning = "Resamples of the trajectories from which limits and stability are computed.",
             .bearsOnResults = kNotOfResults}),
        setting<&Settings::negligibleShare>(
            {.name = "Negligible_Share",
             .defaultValue = "0.1",
             .range = {.lowest = 0, .highest = 1, .lowestExcluded = true},
             .refusal = "Error: Negligible share in Morris analysis invalid",
             .meaning = "A parameter is negligible if its mu* is less than this share of the largest.",
             .bearsOnResults = kNotOfResults})}}};
  return section;
}

}  // namespace mirevo
