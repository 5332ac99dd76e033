#pragma once

#include <string_view>

#include "common/settings/keyword_row.h"
#include "run/tasks/task.h"

namespace mirevo {

inline constexpr std::string_view kSensitivitySection = "SENSITIVITY_ANALYSIS";
inline constexpr std::string_view kSensitivityTypeKeyword = "Sensitivity_Type";
/// The forms of the sensitivity analysis; further ones have a name only.
inline constexpr std::string_view kMorrisName = "Morris";
inline constexpr std::string_view kSobolName = "Sobol";
inline constexpr CodeName kSensitivityTypeNames[] = {
    {0, "local"}, {std::nullopt, kMorrisName}, {std::nullopt, kSobolName}};

/// The section that all forms of the sensitivity analysis share; the type has selected the form when it is read.
const SettingSection<Task>& sensitivitySection();

}  // namespace mirevo
