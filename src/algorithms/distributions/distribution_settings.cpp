#include "algorithms/distributions/distribution_settings.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {
namespace {

using Settings = DistributionSettings;
using Names = std::vector<std::string_view>;

constexpr std::string_view kScale = "Distribution_Scale";
constexpr std::string_view kMean = "Mean_Value";
constexpr std::string_view kDeviation = "Standard_Deviation";
constexpr std::string_view kLogMean = "Log_Mean";
constexpr std::string_view kLogDeviation = "Log_Standard_Deviation";
constexpr std::string_view kMinimum = "Minimum_Value";
constexpr std::string_view kMaximum = "Maximum_Value";
constexpr std::string_view kMode = "Mode_Value";
constexpr std::string_view kAlpha = "Alpha";
constexpr std::string_view kBeta = "Beta";
constexpr std::string_view kValues = "Values";
constexpr std::string_view kWeights = "Weights";

struct KeywordsOfKind {
  Names needed;
  Names optional = {};
};

/// In the order of DistributionKind.
const KeywordsOfKind& keywordsOf(DistributionKind kind) {
  static const KeywordsOfKind all[] = {{{kMean, kDeviation}},
                                       {{kMean, kDeviation}, {kMinimum, kMaximum}},
                                       {{kLogMean, kLogDeviation}},
                                       {{}, {kMinimum, kMaximum}},
                                       {{}, {kMinimum, kMaximum}},
                                       {{kMode}, {kMinimum, kMaximum}},
                                       {{kAlpha, kBeta}, {kMinimum, kMaximum}},
                                       {{kValues}, {kWeights}},
                                       {{kValuesFileKeyword}, {kValuesColumnKeyword}}};
  return all[static_cast<std::size_t>(kind)];
}

template <class Enum>
Enum enumeratorOf(std::span<const CodeName> names, const SetupValue& value) {
  const auto* name = std::get_if<std::string>(&value);
  const auto found = std::ranges::find_if(
      names, [&](const CodeName& code) { return name != nullptr && equalIgnoringCase(code.name, *name); });
  return found == names.end() ? Enum{} : static_cast<Enum>(found - names.begin());
}

KeywordRow kindRow() {
  return choice<Settings>([](Settings& s, const SetupValue& value) { s.kind = distributionKind(value); },
                          {.name = kDistributionKeyword,
                           .defaultValue = "'normal'",
                           .codes = kDistributionNames,
                           .meaning = "The distribution; the keywords that it uses name it."});
}

KeywordRow scaleRow() {
  return choice<Settings>(
      [](Settings& s, const SetupValue& value) {
        s.scale = enumeratorOf<DistributionScale>(kDistributionScaleNames, value);
      },
      {.name = kScale,
       .defaultValue = kNoDefault,
       .codes = kDistributionScaleNames,
       .meaning =
           "The scale of the distribution: that of the model's values, or that of the search, which has natural "
           "logarithms for a logarithmic parameter and an interval of width 1 above each value for an integer "
           "one. Without it `'normal'` is on the search scale; others need it unless both scales are the same."});
}

std::vector<KeywordRow> rowsOfLimits() {
  return {
      setting<&Settings::minimum>({.name = kMinimum,
                                   .defaultValue = kNoDefault,
                                   .meaning = "Lowest value, of `'truncated normal'`, `'uniform'`, `'log-uniform'`, "
                                              "`'triangular'` and `'beta'`; without it the lower bound."}),
      setting<&Settings::maximum>({.name = kMaximum,
                                   .defaultValue = kNoDefault,
                                   .meaning = "Highest value, of the same; without it the upper bound."})};
}

std::vector<KeywordRow> rowsOfValues() {
  return {setting<&Settings::values>({.name = kValues,
                                      .type = KeywordType::realList,
                                      .defaultValue = kNoDefault,
                                      .meaning = "Values of `'discrete'`."}),
          setting<&Settings::weights>({.name = kWeights,
                                       .type = KeywordType::realList,
                                       .defaultValue = kNoDefault,
                                       .meaning = "Their weights, one for each value, which need not sum to 1; without "
                                                  "them all are equally likely."}),
          setting<&Settings::valuesFile>({.name = kValuesFileKeyword,
                                          .type = KeywordType::fileName,
                                          .defaultValue = kNoDefault,
                                          .meaning = "File of `'values'`, a sample of the parameter: numbers between "
                                                     "blanks or line ends, without lines that begin with `#`."}),
          setting<&Settings::valuesColumn>(
              {.name = kValuesColumnKeyword,
               .type = KeywordType::text,
               .defaultValue = kNoDefault,
               .meaning = "The file is a tab-separated table with a line of column names, such as the program "
                          "writes, and the values are in this column."})};
}

std::vector<KeywordRow> rows(const DistributionSectionFacts& facts) {
  constexpr std::string_view kShapeRefusal = "Error: Shape of the distribution invalid";
  std::vector<KeywordRow> all{
      kindRow(),
      scaleRow(),
      setting<&Settings::mean>(
          {.name = kMean,
           .unit = "scale of the distribution",
           .meaning =
               "Mean of `'normal'`, and of `'truncated normal'` before the truncation; that of the logarithm for a "
               "logarithmic parameter on the search scale, half a step above the value meant for an integer "
               "parameter on that scale."}),
      setting<&Settings::standardDeviation>({.name = kDeviation,
                                             .range = kPositive,
                                             .refusal = facts.deviationRefusal,
                                             .unit = "scale of the distribution",
                                             .meaning = "Standard deviation of the same."}),
      setting<&Settings::logMean>({.name = kLogMean,
                                   .defaultValue = kNoDefault,
                                   .meaning = "Mean of the natural logarithm, of `'lognormal'`."}),
      setting<&Settings::logStandardDeviation>({.name = kLogDeviation,
                                                .defaultValue = kNoDefault,
                                                .range = kPositive,
                                                .refusal = facts.deviationRefusal,
                                                .meaning = "Standard deviation of the natural logarithm."})};
  std::ranges::move(rowsOfLimits(), std::back_inserter(all));
  all.push_back(setting<&Settings::mode>(
      {.name = kMode, .defaultValue = kNoDefault, .meaning = "Most likely value, of `'triangular'`."}));
  all.push_back(setting<&Settings::alpha>({.name = kAlpha,
                                           .defaultValue = kNoDefault,
                                           .range = kPositive,
                                           .refusal = kShapeRefusal,
                                           .meaning = "First shape parameter of `'beta'`."}));
  all.push_back(setting<&Settings::beta>({.name = kBeta,
                                          .defaultValue = kNoDefault,
                                          .range = kPositive,
                                          .refusal = kShapeRefusal,
                                          .meaning = "Second shape parameter of `'beta'`."}));
  std::ranges::move(rowsOfValues(), std::back_inserter(all));
  return all;
}

/// A parameter as a distribution on one of its scales sees it.
struct Target {
  bool isOnModelScale = false;  ///< and the search scale is another
  bool isLogarithmic = false;   ///< the search scale has logarithms of the values of the distribution
  bool isInteger = false;       ///< the distribution is of values of which the model gets the nearest on its grid
  double lowest = 0.0;
  double minimum = 0.0;
  double maximum = 0.0;
  double margin = 0.0;  ///< by which the limits are extended
};

Target targetOf(const Settings& settings, const SearchSpace& space, std::size_t j) {
  const TransformationType type = space.transformation[j];
  Target target;
  target.isOnModelScale = settings.scale == DistributionScale::model && type != TransformationType::none;
  target.isLogarithmic = target.isOnModelScale && type == TransformationType::logarithmic;
  target.isInteger = target.isOnModelScale && type == TransformationType::integer;
  target.lowest = space.lower[j];
  const double lower = target.isLogarithmic ? toModelScale(space, j, space.lower[j]) : space.lower[j];
  const double upper =
      target.isLogarithmic ? toModelScale(space, j, space.upper[j]) : space.upper[j] - (target.isInteger ? 1.0 : 0.0);
  target.margin = target.isInteger ? 0.5 : 0.0;
  target.minimum = settings.minimum.value_or(lower);
  target.maximum = settings.maximum.value_or(upper);
  return target;
}

/// The distribution on its own scale; null if it has none.
DistributionPointer ownDistribution(const Settings& s, const Target& target) {
  const double minimum = target.minimum - target.margin;
  const double maximum = target.maximum + target.margin;
  switch (s.kind) {
    case DistributionKind::normal:
      return normalDistribution(s.mean, s.standardDeviation);
    case DistributionKind::truncatedNormal:
      return truncatedNormal(s.mean, s.standardDeviation, minimum, maximum);
    case DistributionKind::lognormal:
      return lognormal(s.logMean, s.logStandardDeviation);
    case DistributionKind::uniform:
      return uniformDistribution(minimum, maximum);
    case DistributionKind::logUniform:
      return logUniform(minimum, maximum);
    case DistributionKind::triangular:
      return triangular(minimum, s.mode, maximum);
    case DistributionKind::beta:
      return betaDistribution(s.alpha, s.beta, minimum, maximum);
    case DistributionKind::discrete:
    case DistributionKind::values:
      break;
  }
  if (s.kind == DistributionKind::values && !target.isInteger) return sampledDistribution(s.values);
  const std::vector<double> same(s.weights.empty() ? s.values.size() : 0, 1.0);
  return discreteDistribution(s.values, s.weights.empty() ? same : s.weights);
}

std::optional<SettingRefusal> validateLimits(const Settings& settings, const Target& target) {
  if (!std::ranges::count(keywordsOf(settings.kind).optional, kMinimum)) return std::nullopt;
  const double minimum = target.minimum - target.margin;
  const double maximum = target.maximum + target.margin;
  if (!(minimum < maximum)) {
    return SettingRefusal{
        "Error: Limits of the distribution invalid", settings.maximum ? kMaximum : kMinimum,
        fmt::format("expected a minimum below the maximum, found {} and {}{}", formatReal(target.minimum),
                    formatReal(target.maximum),
                    settings.minimum && settings.maximum ? "" : ", one of them the parameter's bound")};
  }
  if (settings.kind == DistributionKind::triangular &&
      !(settings.mode >= target.minimum && settings.mode <= target.maximum)) {
    return SettingRefusal{"Error: Mode of the distribution invalid", kMode,
                          fmt::format("expected {} to {}, found {}", formatReal(target.minimum),
                                      formatReal(target.maximum), formatReal(settings.mode))};
  }
  const bool needsPositive = settings.kind == DistributionKind::logUniform;
  if ((needsPositive && !(minimum > 0.0)) || (target.isLogarithmic && !(minimum >= 0.0))) {
    return SettingRefusal{
        "Error: Limits of the distribution invalid", kMinimum,
        fmt::format("expected a minimum {} {}, as {}, found {}", needsPositive ? "above" : "of at least",
                    formatReal(needsPositive ? target.margin : 0.0),
                    needsPositive && target.isInteger
                        ? "the distribution begins half a step below it, and has logarithms"
                        : "there is no logarithm of others",
                    formatReal(target.minimum))};
  }
  if (settings.kind == DistributionKind::truncatedNormal && ownDistribution(settings, target) == nullptr) {
    return SettingRefusal{"Error: Limits of the distribution invalid", settings.maximum ? kMaximum : kMinimum,
                          fmt::format("the normal distribution has no values from {} to {}", formatReal(target.minimum),
                                      formatReal(target.maximum))};
  }
  return std::nullopt;
}

std::optional<SettingRefusal> validateWeights(const Settings& settings) {
  constexpr const char* kRefusal = "Error: Weights of the distribution invalid";
  if (settings.weights.empty()) return std::nullopt;
  if (settings.weights.size() != settings.values.size()) {
    return SettingRefusal{
        kRefusal, kWeights,
        fmt::format("expected {}, one for each value, found {}", settings.values.size(), settings.weights.size())};
  }
  double sum = 0.0;
  for (const double weight : settings.weights) {
    if (!(weight >= 0.0)) {
      return SettingRefusal{kRefusal, kWeights, fmt::format("expected 0 or more, found {}", formatReal(weight))};
    }
    sum += weight;
  }
  if (sum > 0.0 && std::isfinite(sum)) return std::nullopt;
  return SettingRefusal{kRefusal, kWeights, "expected one above 0 at least"};
}

std::optional<SettingRefusal> validateValues(const Settings& settings, const SearchSpace& space, std::size_t j,
                                             const Target& target) {
  constexpr const char* kRefusal = "Error: Values of the distribution invalid";
  const bool isDiscrete = settings.kind == DistributionKind::discrete;
  if (!isDiscrete && settings.kind != DistributionKind::values) return std::nullopt;
  const std::string_view keyword = isDiscrete ? kValues : kValuesFileKeyword;
  const std::size_t least = isDiscrete ? 1 : 2;
  if (settings.values.size() < least) {
    return SettingRefusal{kRefusal, keyword,
                          fmt::format("expected {} at least, found {}", least, settings.values.size())};
  }
  const bool isIntegerParameter = space.transformation[j] == TransformationType::integer;
  if (isDiscrete && isIntegerParameter && !target.isInteger) {
    return SettingRefusal{kRefusal, kScale,
                          fmt::format("expected 'model', as {} is an integer and on the search scale an interval "
                                      "stands for each value",
                                      space.names[j])};
  }
  for (const double value : settings.values) {
    if (target.isLogarithmic && !(value > 0.0)) {
      return SettingRefusal{
          kRefusal, keyword,
          fmt::format("expected values above 0, as {} is logarithmic, found {}", space.names[j], formatReal(value))};
    }
    if (isDiscrete && target.isInteger && std::abs(std::remainder(value - target.lowest, 1.0)) > 1.0e-6) {
      return SettingRefusal{kRefusal, keyword,
                            fmt::format("expected integers above the lower bound {}, found {}",
                                        formatReal(target.lowest), formatReal(value))};
    }
  }
  if (isDiscrete) return validateWeights(settings);
  if (ownDistribution(settings, target) != nullptr) return std::nullopt;
  return SettingRefusal{kRefusal, keyword,
                        "too many of the values are equal for a continuous distribution; give them as 'discrete', "
                        "each once, with weights"};
}

}  // namespace

SectionRow distributionRow(const DistributionSectionFacts& facts) {
  return {facts.path, facts.readWhen, facts.meaning, rows(facts)};
}

SettingSection<DistributionSettings> distributionSection(const DistributionSectionFacts& facts, DistributionKind kind) {
  SettingSection<DistributionSettings> section{{facts.path, facts.readWhen, facts.meaning}};
  const KeywordsOfKind& ofKind = keywordsOf(kind);
  for (KeywordRow& row : rows(facts)) {
    const bool isNeeded = std::ranges::count(ofKind.needed, row.name()) > 0;
    const bool isOfAll = row.name() == kDistributionKeyword || row.name() == kScale;
    if (!isNeeded && !isOfAll && std::ranges::count(ofKind.optional, row.name()) == 0) continue;
    if (isNeeded) row.facts.defaultValue = {};
    section.row.keywords.push_back(std::move(row));
  }
  return section;
}

DistributionKind distributionKind(const SetupValue& value) {
  return enumeratorOf<DistributionKind>(kDistributionNames, value);
}

std::optional<SettingRefusal> validateDistribution(const DistributionSettings& settings, const SearchSpace& space,
                                                   std::size_t j) {
  const bool isTransformed = space.transformation[j] != TransformationType::none;
  const std::string_view type = space.transformation[j] == TransformationType::integer ? "an integer" : "logarithmic";
  if (isTransformed && !settings.scale && settings.kind != DistributionKind::normal) {
    return SettingRefusal{"Error: Scale of the distribution missing", kScale,
                          fmt::format("expected 'model' or 'search', as {} is {}", space.names[j], type)};
  }
  const Target target = targetOf(settings, space, j);
  if (settings.kind == DistributionKind::normal && target.isLogarithmic) {
    return SettingRefusal{"Error: Distribution of a logarithmic parameter has values that are not above 0",
                          kDistributionKeyword,
                          fmt::format("expected 'truncated normal' or 'lognormal' on the model scale, or "
                                      "Distribution_Scale = 'search', as {} is logarithmic",
                                      space.names[j])};
  }
  if (auto refusal = validateLimits(settings, target)) return refusal;
  return validateValues(settings, space, j, target);
}

DistributionPointer searchDistribution(const DistributionSettings& settings, const SearchSpace& space, std::size_t j) {
  const Target target = targetOf(settings, space, j);
  DistributionPointer own = ownDistribution(settings, target);
  if (target.isLogarithmic) return ofLogarithm(std::move(own));
  if (target.isInteger) return onGridOf(target.lowest, std::move(own));
  return own;
}

}  // namespace mirevo
