#include "algorithms/searches/glm.h"
#include "common/settings/named_choice.h"

namespace mirevo {
namespace {

constexpr CodeName kDifferenceNames[] = {
    {std::nullopt, "automatic"}, {std::nullopt, "forward"}, {std::nullopt, "central"}};

}  // namespace

BoundSection GlmMethod::section() {
  using Settings = GlmSettings;
  static const SettingSection<GlmSettings> section{
      {"OPTIMISATION_ALGORITHM/GLM_CONTROL_PARAMETERS",
       "when `Algorithm_Type` is `'GLM'`",
       "Gauss-Levenberg-Marquardt.",
       {namedChoice<Settings, kDifferenceNames>(
            [](auto& filled) -> auto& { return filled.differences; },
            {.name = "Differencing",
             .defaultValue = "'automatic'",
             .meaning = "Kind of differences: forward until an iteration gains less than a tenth of the sum of "
                        "squares and then central, or one of the two throughout."}),
        setting<&Settings::perturbationOption>(
            {.name = "Perturbation_Option",
             .defaultValue = "0",
             .range = between(0, 1),
             .codes = kPerturbationOptionNames,
             .refusal = "Error: Perturbation option in GLM algorithm invalid",
             .meaning = "The step of a difference is a fraction of the parameter's range, or of its value."}),
        setting<&Settings::perturbationFraction>(
            {.name = "Perturbation_Fraction",
             .defaultValue = "0.01",
             .range = {.lowest = 0, .highest = 1, .lowestExcluded = true},
             .refusal = "Error: Perturbation fraction in GLM algorithm invalid",
             .meaning = "That fraction. Larger if the model prints few digits or its results are not smooth."}),
        setting<&Settings::lambdaCount>({.name = "Lambdas",
                                         .defaultValue = "4",
                                         .range = between(1, 64),
                                         .refusal = "Error: No. of lambdas in GLM algorithm invalid",
                                         .meaning = "Trial sets of an iteration, each with another damping, run as one "
                                                    "batch; the first is not damped."}),
        setting<&Settings::initialLambda>({.name = "Initial_Lambda",
                                           .defaultValue = "0.01",
                                           .range = kPositive,
                                           .refusal = "Error: Initial lambda in GLM algorithm invalid",
                                           .meaning = "Damping of the first iteration, relative to the squared length "
                                                      "of a column of the derivatives."}),
        setting<&Settings::smallestSingularValue>(
            {.name = "Singular_Value_Limit",
             .defaultValue = "1e-7",
             .range = kFraction,
             .refusal = "Error: Singular value limit in GLM algorithm invalid",
             .meaning = "Directions whose singular value is at most this share of the largest are left as they are; "
                        "of the derivatives scaled to columns of length 1."}),
        setting<&Settings::broydenUpdates>(
            {.name = "Broyden_Updates",
             .defaultValue = "2",
             .range = from(0),
             .refusal = "Error: No. of Broyden updates in GLM algorithm invalid",
             .meaning = "Most iterations in a row that use derivatives updated after Broyden instead of new ones."}),
        setting<&Settings::regularisation>(
            {.name = "Regularisation",
             .defaultValue = "0",
             .range = kNonNegative,
             .refusal = "Error: Regularisation in GLM algorithm invalid",
             .meaning = "Weight of the squared distances of the parameters to their prior values, as shares of their "
                        "ranges on the search scale, which are added to the sum of squares. 0: none."}),
        setting<&Settings::priorValues>(
            {.name = "Prior_Values",
             .defaultValue = kNoDefault,
             .meaning = "These values, one for each variable parameter in setup order; without them the initial "
                        "values."}),
        setting<&Settings::priorWeights>(
            {.name = "Prior_Weights",
             .defaultValue = kNoDefault,
             .meaning = "A factor of 0 or more of each squared distance; without them each 1."}),
        setting<&Settings::sampleSize>(
            {.name = "Sample_Size",
             .defaultValue = "1",
             .range = from(1),
             .refusal = "Error: Sample size in GLM algorithm invalid",
             .meaning = "Sets of the initial sample, the best of which are where the search starts."}),
        setting<&Settings::startCount>({.name = "Starts",
                                        .defaultValue = "1",
                                        .range = from(1),
                                        .refusal = "Error: No. of starts in GLM algorithm invalid",
                                        .meaning = "Sets of the initial sample, at least so many, from which the "
                                                   "search runs one after the other."}),
        setting<&Settings::minStep>(
            {.name = "Min_Step",
             .defaultValue = "1e-6",
             .range = kNonNegative,
             .refusal = "Error: Minimum step in GLM algorithm invalid",
             .meaning = "Step below which a run has converged: the largest one, as a share of the parameter's range."}),
        setting<&Settings::minGradient>(
            {.name = "Min_Gradient",
             .defaultValue = "1e-8",
             .range = kNonNegative,
             .refusal = "Error: Minimum gradient in GLM algorithm invalid",
             .meaning = "Largest cosine of the angle between the residuals and the derivatives by a parameter below "
                        "which a run has converged."})}}};
  return {section, settings};
}

}  // namespace mirevo
