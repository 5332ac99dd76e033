#include "run/results/earlier_sample_doubts.h"

#include <algorithm>
#include <cstddef>
#include <string_view>
#include <utility>

#include <fmt/core.h>

#include "common/named_items.h"
#include "common/parameter_set.h"
#include "common/short_list.h"
#include "common/text.h"
#include "evaluation/failed_run_policy.h"
#include "parameters/search_space.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostNamed = 10;

struct Bounds {
  double lower = 0.0;
  double upper = 0.0;
  bool operator==(const Bounds&) const = default;
};

std::string rangeText(const Bounds& bounds) {
  return fmt::format("from {} to {}", formatReal(bounds.lower), formatReal(bounds.upper));
}

std::optional<std::string_view> valueOf(const RestartSettings& settings, std::string_view section,
                                        std::string_view keyword) {
  for (const ResultSetting& setting : settings.settings) {
    if (setting.section == section && setting.keyword == keyword) return setting.value;
  }
  return std::nullopt;
}

std::optional<Bounds> boundsThen(const RestartSettings& then, const std::string& name) {
  for (const ResultSetting& setting : then.settings) {
    if (setting.keyword != "Parameter_Name" || !setting.section.starts_with("MODEL_PARAMETERS/")) continue;
    const std::string_view quoted = setting.value;
    if (quoted.size() < 2 || !isSameName(quoted.substr(1, quoted.size() - 2), name)) continue;
    const auto number = [&](std::string_view keyword) {
      const auto value = valueOf(then, setting.section, keyword);
      return value ? parseReal(*value) : std::nullopt;
    };
    const auto lower = number("Lower_Bound");
    const auto upper = number("Upper_Bound");
    if (lower && upper) return Bounds{*lower, *upper};
  }
  return std::nullopt;
}

}  // namespace

std::string otherBoundsText(const std::string& resultFile, const std::optional<RestartSettings>& then,
                            const RunConfig& config, const EarlierSample& earlier) {
  ShortList changed(kMostNamed);
  std::vector<bool> isOutside(earlier.sample.size(), false);
  std::size_t variable = 0;
  for (const ModelParameter& parameter : config.parameters) {
    if (parameter.parameterType != ParameterType::variable) continue;
    const std::vector<double>& values = earlier.sample.parameters.at(variable++);
    const Bounds now{parameter.lowerBound, parameter.upperBound};
    const auto before = then ? boundsThen(*then, parameter.name) : std::nullopt;
    if (before && *before != now) {
      changed.add(
          fmt::format("{} {}, in this setup {}", trimTrailing(parameter.name), rangeText(*before), rangeText(now)));
    }
    for (std::size_t i = 0; i < values.size(); ++i) {
      isOutside[i] = isOutside[i] || values[i] < now.lower || values[i] > now.upper;
    }
  }
  const auto outside = std::ranges::count(isOutside, true);
  // Of the same bounds such sets are those of a distribution that leaves them, as it may in the setup, too.
  if (changed.isEmpty() && (then || outside == 0)) return {};
  if (outside == 0 && !earlier.isOfDistributions) return {};
  const std::string where = fmt::format("{} of its {} sets {} outside the bounds of this setup", outside,
                                        isOutside.size(), outside == 1 ? "lies" : "lie");
  constexpr std::string_view kWhatCounts = "All of them are judged, and what is called drawn is what was drawn there";
  if (changed.isEmpty()) return fmt::format("{}: {}. {}", resultFile, where, kWhatCounts);
  return fmt::format("The run that made {} had other bounds: {}. {}. {}", resultFile, changed.text(), where,
                     kWhatCounts);
}

std::vector<std::string> otherSetsTexts(const std::string& resultFile, const RunConfig& config,
                                        const Feasibility& feasibility, const EvaluatedSample& sample) {
  std::vector<const ModelParameter*> variable;
  for (const ModelParameter& parameter : config.parameters) {
    if (parameter.parameterType == ParameterType::variable) variable.push_back(&parameter);
  }
  std::size_t betweenIntegers = 0;
  std::size_t violating = 0;
  std::string violation;
  for (std::size_t i = 0; i < sample.size(); ++i) {
    if (!sample.ok[i]) continue;
    bool isOnGridOfAll = true;
    ParameterSet set;
    for (std::size_t j = 0; j < variable.size(); ++j) {
      const double value = sample.parameters[j][i];
      isOnGridOfAll = isOnGridOfAll && isOnGrid(*variable[j], value);
      bool failed = false;  // of a logarithm, outside the bounds
      const bool isLogarithmic = variable[j]->transformationType == TransformationType::logarithmic;
      set.push_back(isLogarithmic ? TransformParameterValue(value, 0.0, TransformationType::logarithmic,
                                                            TransformDirection::forward, failed)
                                  : value);
    }
    if (!isOnGridOfAll) ++betweenIntegers;
    const auto found = isOnGridOfAll ? feasibility.violation(set) : std::nullopt;
    if (found && ++violating == 1) violation = *found;
  }
  std::vector<std::string> texts;
  const auto tell = [&](std::size_t count, std::string_view why) {
    texts.push_back(fmt::format("{}: {} of its {} sets would not be made by a run of this setup, {}. All are judged",
                                resultFile, count, sample.size(), why));
  };
  if (betweenIntegers > 0) tell(betweenIntegers, "with values between those of an integer parameter");
  if (violating > 0) tell(violating, "as they violate a constraint (" + violation + ")");
  return texts;
}

std::vector<std::string> unfinishedRunTexts(const std::string& resultFile, const std::optional<RunRecord>& record,
                                            const EvaluatedSample& sample) {
  std::vector<std::string> texts;
  if (record && record->stage != RunStage::finished) {
    const std::string why = !record->stage                         ? "it was cut off, or still goes on"
                            : record->stage == RunStage::failed    ? "it ended with an error"
                            : record->stage == RunStage::cancelled ? "it was cancelled"
                                                                   : "it was cut off";
    const std::string planned =
        record->plannedEvaluations > 0 ? fmt::format(" of {} planned", record->plannedEvaluations) : std::string();
    texts.push_back(fmt::format("The run that made {} is not finished, {}: what is said is said of {} evaluations{}",
                                resultFile, why, sample.size(), planned));
  }
  const auto failed = std::ranges::count(sample.ok, false);
  const int limit = FailedRunPolicy(static_cast<int>(sample.size())).limit();
  if (failed > limit) {
    texts.push_back(fmt::format(
        "{} of the {} evaluations in {} failed, more than the tenth of them at which a run ends. If they come with "
        "certain parameter values, the rest is no sample of the distributions any more",
        failed, sample.size(), resultFile));
  }
  return texts;
}

}  // namespace mirevo
