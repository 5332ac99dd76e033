#pragma once

#include <cstdint>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// How the points of a trajectory follow from one another.
enum class EffectDesign : std::int32_t {
  radial,       ///< each step starts from the base point
  trajectories  ///< each step starts where the last one ended
};
/// Names only, in the order of the enumerators.
inline constexpr CodeName kEffectDesignNames[] = {{std::nullopt, "radial"}, {std::nullopt, "trajectories"}};

struct MorrisSettings {
  EffectDesign design = EffectDesign::radial;
  std::int32_t trajectories = 30;  ///< r
  std::int32_t levels = 4;         ///< of each parameter in trajectories, even
  std::int32_t candidates =
      50;  ///< random designs on levels, of which that with the most different trajectories is taken
  std::int32_t bootstrapSamples = 1000;
  double negligibleShare = 0.1;  ///< of the largest mu*, below which a parameter is negligible
};

inline constexpr std::string_view kTrajectoriesKeyword = "Trajectories";
inline constexpr std::string_view kLevelsKeyword = "Levels";
inline constexpr std::string_view kCandidatesKeyword = "Candidate_Designs";

/// The section SENSITIVITY_ANALYSIS/MORRIS.
const SettingSection<MorrisSettings>& morrisSection();

}  // namespace mirevo
