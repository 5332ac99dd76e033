#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/bayes/dream_sampler.h"
#include "algorithms/bayes/likelihoods.h"
#include "common/settings/keyword_row.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "run/access/setup_access.h"

namespace mirevo {

/// The error model of a series, as a setup gives it.
struct ErrorModelSettings {
  std::optional<LikelihoodForm> form;
  /// Of each term its value if it is fixed, or its bounds; empty: the default.
  std::array<std::vector<double>, kErrorTermCount> terms;
  std::optional<double> shift;  ///< of the Box-Cox transformation
};

/// The section UNCERTAINTY_ESTIMATION/DREAM.
struct DreamSection {
  DreamSettings sampler;
  ErrorModelSettings errors;  ///< of all series
  std::map<std::size_t, ErrorModelSettings>
      own;                     ///< of an output measure, by its number from 1; what it leaves open is as above
  std::int32_t objective = 0;  ///< of Likelihood = 'objective': its number; 0: the aggregate
  std::optional<std::string> objectiveName;  ///< as the setup gives it, if it does not give the number
  std::string place;                         ///< of the likelihood, "setup.kdx:14:9"
};

inline constexpr std::string_view kDreamSectionName = "UNCERTAINTY_ESTIMATION/DREAM";
inline constexpr std::string_view kDreamObjectiveKeyword = "Objective_Function";
inline constexpr std::string_view kLikelihoodKeyword = "Likelihood";
inline constexpr std::string_view kEffectiveSizeKeyword = "Effective_Size";
inline constexpr std::string_view kDreamRefusal = "Error: Setting of DREAM invalid";
inline constexpr std::string_view kDreamLikelihoodRefusal = "Error: Likelihood of DREAM invalid";
inline constexpr std::string_view kErrorModelPrefix = "ERROR_MODEL_";
inline constexpr std::string_view kErrorModelMeasure =
    "expected the number of an output measure that compares series and enters an objective function (of several that "
    "compare the same, the first)";

const SettingSection<DreamSection>& dreamSection();
const SettingSection<ErrorModelSettings>& errorModelSection();

/// The output measures, 0-based, of whose errors a likelihood is: every pair of series that enters an objective
/// function, once.
std::vector<std::size_t> measuresOfLikelihood(std::span<const OutputMeasure> measures,
                                              std::span<const ObjectiveFunction> objectives);

/// Reads the section DREAM of `section` and those inside it, with `settings.sampler.mostRuns` given. Throws FatalError,
/// also where the likelihood does not fit the output measures and objective functions.
void readDreamSection(const SetupSection& section, std::span<const OutputMeasure> measures,
                      std::span<const ObjectiveFunction> objectives, DreamSection& settings);

}  // namespace mirevo
