#include "algorithms/analyses/glue_settings.h"

#include <algorithm>
#include <iterator>
#include <span>

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// The place of the name that was read among those of the keyword.
template <class Code>
Code codeNamed(std::span<const CodeName> names, const SetupValue& value) {
  const auto found =
      std::find_if(names.begin(), names.end(), [&](const CodeName& name) { return isCode(name, value); });
  return static_cast<Code>(std::distance(names.begin(), found));
}

std::optional<SettingRefusal> validateBehavioural(const GlueSettings& settings) {
  if (settings.threshold.has_value() != settings.share.has_value()) return std::nullopt;
  return SettingRefusal{
      std::string(kBehaviouralRefusal), settings.share ? kShareKeyword : kThresholdKeyword,
      fmt::format("expected either {} or {}, found {}", kThresholdKeyword, kShareKeyword,
                  settings.share ? "both" : "neither: which sets are acceptable is the choice that GLUE asks for")};
}

std::optional<SettingRefusal> validateShare(const GlueSettings& settings) {
  if (!settings.share || (*settings.share > 0.0 && *settings.share <= 1.0)) return std::nullopt;
  return SettingRefusal{std::string(kBehaviouralRefusal), kShareKeyword,
                        fmt::format("expected a share above 0 and up to 1, found {}", formatReal(*settings.share))};
}

}  // namespace

const SettingSection<GlueSettings>& glueSection() {
  static const SettingSection<GlueSettings> section{
      {"UNCERTAINTY_ESTIMATION/GLUE",
       "when `Uncertainty_Type` is 'GLUE'",
       "Generalised likelihood uncertainty estimation: sets that are acceptable, their weights, and what these say of "
       "parameters and series.",
       {choice<GlueSettings>(
            [](GlueSettings& settings, const SetupValue& value) {
              settings.sampling = codeNamed<GlueSampling>(kGlueSamplingNames, value);
            },
            {.name = kSamplingKeyword,
             .defaultValue = "'Latin hypercube'",
             .codes = kGlueSamplingNames,
             .meaning = "Points of the unit cube that the distributions of the parameters make into sets: Latin "
                        "hypercube sample, scrambled Sobol sequence, or random points."}),
        setting<&GlueSettings::judgedBy>(
            {.name = kJudgedByKeyword,
             .defaultValue = kNoDefault,
             .meaning = "Name of the output measure, or else of the objective function, by which sets are behavioural "
                        "and likely. Without it the only output measure, or of several measures the first objective "
                        "function.",
             .bearsOnResults = kNotOfResults}),
        setting<&GlueSettings::threshold>(
            {.name = kThresholdKeyword,
             .defaultValue = kNoDefault,
             .unit = "as what judges",
             .meaning = "Sets are behavioural that are at least as good: at or above it where large values are good, "
                        "at or below it where small ones are, and between it and its negative where 0 is best.",
             .bearsOnResults = kNotOfResults}),
        checked<GlueSettings>(
            setting<&GlueSettings::share>(
                {.name = kShareKeyword,
                 .defaultValue = kNoDefault,
                 .meaning = "In place of a threshold: the share of the successful evaluations, the best of them, "
                            "that is behavioural. Equally good ones at the limit all are.",
                 .isOfNewSection = true,
                 .bearsOnResults = kNotOfResults}),
            [](const GlueSettings& settings) -> std::optional<SettingRefusal> {
              if (auto refusal = validateBehavioural(settings)) return refusal;
              return validateShare(settings);
            }),
        choice<GlueSettings>(
            [](GlueSettings& settings, const SetupValue& value) {
              settings.likelihood = codeNamed<LikelihoodShape>(kGlueLikelihoodNames, value);
            },
            {.name = kGlueLikelihoodKeyword,
             .defaultValue = "'inverse variance'",
             .codes = kGlueLikelihoodNames,
             .meaning = "Likelihood of a behavioural set, before all are scaled to the sum 1; see the page on GLUE.",
             .bearsOnResults = kNotOfResults}),
        setting<&GlueSettings::shapeFactor>(
            {.name = kShapeFactorKeyword,
             .defaultValue = "1",
             .range = kPositive,
             .refusal = kLikelihoodRefusal,
             .meaning = "The larger, the more the best sets outweigh the others. No effect on equal weights.",
             .bearsOnResults = kNotOfResults}),
        setting<&GlueSettings::earlierFile>(
            {.name = kEarlierRunKeyword,
             .type = KeywordType::fileName,
             .defaultValue = kNoDefault,
             .meaning = "Result file of an earlier run with the same parameters, output measures and objective "
                        "functions, whose evaluations are judged. No model is run, and `Sample_Size` has no effect.",
             .bearsOnResults = kNotOfResults})}}};
  return section;
}

}  // namespace mirevo
