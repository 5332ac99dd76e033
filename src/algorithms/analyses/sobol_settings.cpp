#include "algorithms/analyses/sobol_settings.h"

#include <algorithm>
#include <utility>

#include <fmt/format.h>

#include "common/named_items.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kBootstrapRefusal =
    "Error: Number of bootstrap samples in Sobol sensitivity analysis invalid";
constexpr std::int32_t kLeastSampleSize = 2 * static_cast<std::int32_t>(kSobolReplicates);

/// Adds the group that `text` describes, or returns why it does not.
std::string takeGroup(std::span<const std::string> parameters, std::string_view text,
                      std::vector<std::optional<std::size_t>>& groupOf, std::vector<SobolFactor>& groups) {
  const std::vector<std::string_view> parts = splitAt(text, ':', 2);
  SobolFactor group{std::string(trim(parts.front())), {}};
  if (parts.size() < 2 || group.name.empty()) {
    return fmt::format("expected a name and its parameters, as in 'soil: {}', found {}",
                       parameters.empty() ? "K" : parameters.front(), quotedForMessage(text));
  }
  const auto isSameName = [&group](const SobolFactor& other) { return other.name == group.name; };
  if (std::ranges::any_of(groups, isSameName)) return fmt::format("there are two groups '{}'", group.name);
  for (const std::string_view part : splitAt(parts[1], ',')) {
    const std::string name(trim(part));
    if (name.empty()) {
      return fmt::format("expected names of parameters behind ':', between commas, found none in {}",
                         quotedForMessage(text));
    }
    const std::vector<std::size_t> meant = itemsNamed(name, parameters);
    if (meant.empty()) {
      const auto nearest = nearestName(name, parameters);
      return fmt::format("there is no variable parameter {}{}", quotedForMessage(name),
                         nearest ? fmt::format("; did you mean '{}'?", *nearest) : "");
    }
    if (meant.size() > 1) return ambiguityText(name, parameters, meant);
    const std::size_t index = meant.front();
    if (groupOf[index]) return fmt::format("parameter '{}' is in a group twice", name);
    groupOf[index] = groups.size();
    group.parameters.push_back(index);
  }
  groups.push_back(std::move(group));
  return {};
}

}  // namespace

const SettingSection<SobolSettings>& sobolSection() {
  using Settings = SobolSettings;
  static const SettingSection<SobolSettings> section{
      {"SENSITIVITY_ANALYSIS/SOBOL",
       "when `Sensitivity_Type` is 'Sobol'",
       "Sobol' indices: the shares of the variance of an output that are due to each parameter by itself and with its "
       "interactions.",
       {setting<&Settings::sampleSize>(
            {.name = kSobolSampleSizeKeyword,
             .range = from(kLeastSampleSize),
             .refusal = "Error: Sample size in Sobol sensitivity analysis invalid",
             .unit = "blocks",
             .meaning = "Blocks of the design, N. For k parameters or groups each takes k + 2 model runs, 2k + 2 with "
                        "`Second_Order = 1`. A power of two is best."}),
        setting<&Settings::hasSecondOrder>({.name = "Second_Order",
                                            .defaultValue = "0",
                                            .meaning = "1: also the interaction of each two parameters or groups."}),
        setting<&Settings::groups>(
            {.name = kSobolGroupKeyword,
             .defaultValue = kNoDefault,
             .meaning = "A name and variable parameters, `'soil: Depth, Rate'`, that are varied as one and have one "
                        "index. May be repeated; a parameter in no group stands by itself."}),
        choice<SobolSettings>(
            [](SobolSettings& s, const SetupValue& value) {
              const std::string& name = std::get<std::string>(value);
              const auto found = std::ranges::find_if(
                  kSobolSeriesTimesNames, [&name](const CodeName& one) { return equalIgnoringCase(one.name, name); });
              s.seriesTimes = static_cast<SobolSeriesTimes>(found - std::begin(kSobolSeriesTimesNames));
            },
            {.name = "Series_Indices",
             .defaultValue = "'observations'",
             .codes = kSobolSeriesTimesNames,
             .meaning = "The times at which the simulated series have indices: those of the observations, every "
                        "simulated step, or none. Simulated values are kept on disk for them."}),
        setting<&Settings::bootstrapSamples>({.name = "Bootstrap_Samples",
                                              .defaultValue = "1000",
                                              .range = between(100, 100000),
                                              .refusal = kBootstrapRefusal,
                                              .meaning = "Bootstrap samples for the limits of the indices.",
                                              .bearsOnResults = kNotOfResults}),
        setting<&Settings::negligibleIndex>(
            {.name = "Negligible_Index",
             .defaultValue = "0.05",
             .range = {.lowest = 0, .highest = 1, .lowestExcluded = true},
             .refusal = "Error: Negligible index in Sobol sensitivity analysis invalid",
             .meaning = "A parameter can be fixed if the upper limit of its total index is below this share of the "
                        "variance.",
             .bearsOnResults = kNotOfResults})}}};
  return section;
}

std::vector<SobolFactor> sobolFactors(std::span<const std::string> parameters, std::span<const std::string> groups,
                                      SobolGroupProblem& problem) {
  std::vector<std::optional<std::size_t>> groupOf(parameters.size());
  std::vector<SobolFactor> grouped;
  for (std::size_t g = 0; g < groups.size(); ++g) {
    problem = {takeGroup(parameters, groups[g], groupOf, grouped), g};
    if (!problem.text.empty()) return {};
  }
  const std::vector<SobolFactor> named = grouped;  // in the order of their lines
  std::vector<SobolFactor> factors;
  for (std::size_t j = 0; j < parameters.size(); ++j) {
    if (!groupOf[j]) {
      factors.push_back({std::string(trimTrailing(parameters[j])), {j}});
    } else if (SobolFactor& group = grouped[*groupOf[j]]; !group.parameters.empty()) {
      factors.push_back(std::exchange(group, {}));
    }
  }
  const auto hasNameOf = [&](const SobolFactor& one) {
    return std::ranges::count_if(factors, [&one](const SobolFactor& other) { return other.name == one.name; }) > 1;
  };
  const auto twice = std::ranges::find_if(factors, hasNameOf);
  if (twice == factors.end()) return factors;
  const auto isIt = [&](const SobolFactor& one) { return one.name == twice->name; };
  problem = {fmt::format("group '{}' has the name of a parameter that is not in it", twice->name),
             static_cast<std::size_t>(std::ranges::find_if(named, isIt) - named.begin())};
  return {};
}

}  // namespace mirevo
