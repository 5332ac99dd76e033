#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// Which points of the unit cube become sets.
enum class GlueSampling : std::int32_t { latinHypercube, sobol, simpleRandom };
inline constexpr CodeName kGlueSamplingNames[] = {
    {std::nullopt, "Latin hypercube"}, {std::nullopt, "Sobol"}, {std::nullopt, "simple random"}};

/// How likely a behavioural set is, of its value v, its error variance e (GlueJudge) and the shape factor N.
enum class LikelihoodShape : std::int32_t {
  efficiency,       ///< v^N, 0 where v is negative: of an efficiency whose best value is 1
  inverseVariance,  ///< e^-N
  exponential,      ///< exp(-N e / s), s being 1 for an efficiency and else the e of the best set
  rescaled,         ///< (limit - distance)^N: 0 at the limit of what is behavioural
  equal             ///< 1
};
inline constexpr CodeName kGlueLikelihoodNames[] = {{std::nullopt, "efficiency"},
                                                    {std::nullopt, "inverse variance"},
                                                    {std::nullopt, "exponential"},
                                                    {std::nullopt, "rescaled"},
                                                    {std::nullopt, "equal"}};

/// The section UNCERTAINTY_ESTIMATION/GLUE. All but the sampling can be changed without another model run.
struct GlueSettings {
  GlueSampling sampling = GlueSampling::latinHypercube;
  std::string judgedBy = {};             ///< an output measure or an objective function; empty: see glueJudge()
  std::optional<double> threshold = {};  ///< on the scale of what judges; one of this and `share` is given
  std::optional<double> share = {};      ///< of the evaluations that succeeded, the best
  LikelihoodShape likelihood = LikelihoodShape::inverseVariance;
  double shapeFactor = 1.0;      ///< N, above 0
  std::string earlierFile = {};  ///< the result file of the run whose evaluations are judged; empty: the sets are run
};

inline constexpr std::string_view kGlueSectionName = "GLUE";
inline constexpr std::string_view kJudgedByKeyword = "Judged_By";
inline constexpr std::string_view kThresholdKeyword = "Behavioural_Threshold";
inline constexpr std::string_view kShareKeyword = "Behavioural_Share";
inline constexpr std::string_view kGlueLikelihoodKeyword = "Likelihood";
inline constexpr std::string_view kSamplingKeyword = "Sampling";
inline constexpr std::string_view kShapeFactorKeyword = "Shape_Factor";
inline constexpr std::string_view kEarlierRunKeyword = "Earlier_Result_File";
inline constexpr std::string_view kBehaviouralRefusal = "Error: Choice of behavioural sets invalid";
inline constexpr std::string_view kLikelihoodRefusal = "Error: Likelihood of behavioural sets invalid";

const SettingSection<GlueSettings>& glueSection();

}  // namespace mirevo
