#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/analyses/sobol_design.h"
#include "common/settings/keyword_row.h"

namespace mirevo {

/// For which times of the simulated series there are indices. Names only, in the order of the enumerators.
enum class SobolSeriesTimes : std::int32_t { observations, steps, none };
inline constexpr CodeName kSobolSeriesTimesNames[] = {
    {std::nullopt, "observations"}, {std::nullopt, "steps"}, {std::nullopt, "none"}};

struct SobolSettings {
  std::int32_t sampleSize = 0;  ///< N, the blocks of the design
  bool hasSecondOrder = false;
  std::vector<std::string> groups;  ///< "soil: K, Depth"
  SobolSeriesTimes seriesTimes = SobolSeriesTimes::observations;
  std::int32_t bootstrapSamples = 1000;
  double negligibleIndex = 0.05;  ///< a factor whose total index is below it can be fixed
};

inline constexpr std::string_view kSobolSampleSizeKeyword = "Sample_Size";
inline constexpr std::string_view kSobolGroupKeyword = "Group";

/// The section SENSITIVITY_ANALYSIS/SOBOL.
const SettingSection<SobolSettings>& sobolSection();

/// Why a group is none.
struct SobolGroupProblem {
  std::string text;       ///< empty: all are groups
  std::size_t group = 0;  ///< 0-based, which of them
};

/// The factors of the analysis, in the order of their first parameters: each group as one, every parameter that is in
/// none by itself. Empty, with the reason in `problem`, where a group is none.
std::vector<SobolFactor> sobolFactors(std::span<const std::string> parameters, std::span<const std::string> groups,
                                      SobolGroupProblem& problem);

}  // namespace mirevo
