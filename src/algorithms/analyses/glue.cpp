#include "algorithms/analyses/glue.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>

#include <fmt/format.h>

#include "algorithms/numbers/weighted_sample.h"
#include "common/named_items.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInfinity = std::numeric_limits<double>::infinity();

/// What makes an objective function or a measure a judge.
GlueJudge judgeOf(const OutputMeasure& measure, std::size_t index) {
  GlueJudge judge{.name = measure.name, .index = index};
  std::string what;
  if (measure.interfaceType == InterfaceType::measureFile) {
    judge.best = measure.observedValue ? Best::zero : Best::smallest;
    judge.isSquaredForVariance = measure.observedValue.has_value();
    what = measure.observedValue ? "a difference to an observed value; best 0" : "written by the model; small is good";
  } else {
    judge.best = statisticOf(measure.statisticType).best;
    constexpr std::string_view kSumOfSquares = "sum of squared errors";
    judge.isSquaredForVariance =
        judge.best != Best::largest && statisticOf(measure.statisticType).key.name != kSumOfSquares;
    what = fmt::format("{}; {}", describeStatistic(measure),
                       judge.best == Best::largest ? "large is good, best 1"
                       : judge.best == Best::zero  ? "best 0"
                                                   : "small is good, best 0");
  }
  judge.description = fmt::format("output measure {} ({})", trimTrailing(measure.name), what);
  return judge;
}

GlueJudge judgeOf(const ObjectiveFunction& objective, std::size_t index) {
  return {.name = objective.name,
          .isObjective = true,
          .index = index,
          .description = fmt::format("objective function {} (small is good)", trimTrailing(objective.name))};
}

template <class Item>
std::vector<std::string> namesOf(std::span<const Item> items) {
  std::vector<std::string> names;
  for (const Item& item : items) names.push_back(item.name);
  return names;
}

/// The measure of this name, or else the objective function; one whose name differs by case only where no other is of
/// exactly this name.
std::optional<GlueJudge> judgeNamed(std::string_view name, std::span<const OutputMeasure> measures,
                                    std::span<const ObjectiveFunction> objectives, SettingRefusal& refusal) {
  const std::vector<std::string> ofMeasures = namesOf(measures);
  const std::vector<std::string> ofObjectives = namesOf(objectives);
  const std::vector<std::size_t> meant = itemsNamed(name, ofMeasures);
  const std::vector<std::size_t> others = itemsNamed(name, ofObjectives);
  const bool isExactMeasure = !meant.empty() && isSameName(ofMeasures[meant.front()], name);
  const bool isExactObjective = !others.empty() && isSameName(ofObjectives[others.front()], name);
  const bool isObjective = meant.empty() || (isExactObjective && !isExactMeasure);
  const std::vector<std::size_t>& chosen = isObjective ? others : meant;
  if (chosen.size() > 1) {
    refusal = {std::string(kBehaviouralRefusal), kJudgedByKeyword,
               ambiguityText(name, isObjective ? ofObjectives : ofMeasures, chosen)};
  }
  if (chosen.size() != 1) return std::nullopt;
  const std::size_t i = chosen.front();
  return isObjective ? judgeOf(objectives[i], i) : judgeOf(measures[i], i);
}

SettingRefusal unknownJudge(std::string_view name, std::span<const OutputMeasure> measures,
                            std::span<const ObjectiveFunction> objectives) {
  std::vector<std::string> known;
  for (const OutputMeasure& measure : measures) known.push_back(quotedForMessage(trim(measure.name)));
  for (const ObjectiveFunction& objective : objectives) known.push_back(quotedForMessage(trim(objective.name)));
  constexpr std::size_t kMostShown = 20;
  const std::size_t shown = std::min(known.size(), kMostShown);
  return {std::string(kBehaviouralRefusal), kJudgedByKeyword,
          fmt::format("expected the name of an output measure or an objective function, {}{}, found {}",
                      fmt::join(std::span(known).first(shown), ", "), shown < known.size() ? ", ..." : "",
                      quotedForMessage(name))};
}

/// Why threshold or likelihood cannot be those of this judge.
std::optional<SettingRefusal> misfit(const GlueJudge& judge, const GlueSettings& settings) {
  if (settings.likelihood == LikelihoodShape::efficiency && judge.best != Best::largest) {
    return SettingRefusal{std::string(kLikelihoodRefusal), kGlueLikelihoodKeyword,
                          fmt::format("'efficiency' is for statistics whose best value is 1, found {}; 'inverse "
                                      "variance' is a likelihood of errors",
                                      judge.description)};
  }
  if (!settings.threshold) return std::nullopt;
  const double threshold = *settings.threshold;
  const bool isMeasureOfErrors = !judge.isObjective && (judge.best == Best::zero || judge.isSquaredForVariance);
  const bool isPastBest = judge.best == Best::largest ? threshold > 1.0 : isMeasureOfErrors && threshold < 0.0;
  if (!isPastBest) return std::nullopt;
  return SettingRefusal{
      std::string(kBehaviouralRefusal), kThresholdKeyword,
      fmt::format("no set can be that good: expected {}, as behaviour is judged by {}, found {}",
                  judge.best == Best::largest ? "1 or less" : "0 or more", judge.description, formatReal(threshold))};
}

/// The natural logarithm of the likelihood of a set with the value `value`; NaN where it has none.
double logLikelihood(const GlueJudge& judge, const GlueSettings& settings, double value, double limit,
                     double bestVariance) {
  const double variance = judge.varianceOf(value);
  switch (settings.likelihood) {
    case LikelihoodShape::efficiency:
      return value > 0.0 ? settings.shapeFactor * std::log(value) : -kInfinity;
    case LikelihoodShape::inverseVariance:
      return variance < 0.0 ? kNaN : -settings.shapeFactor * std::log(variance);
    case LikelihoodShape::exponential: {
      const double scale = judge.best == Best::largest ? 1.0 : bestVariance;
      if (scale == 0.0) return variance == 0.0 ? 0.0 : -kInfinity;
      return scale < 0.0 ? kNaN : -settings.shapeFactor * (variance / scale);
    }
    case LikelihoodShape::rescaled: {
      const double margin = limit - judge.distanceOf(value);
      return margin > 0.0 ? settings.shapeFactor * std::log(margin) : -kInfinity;
    }
    case LikelihoodShape::equal:
      break;
  }
  return 0.0;
}

/// Weights in proportion to the likelihoods, which only together need to be numbers of a computer: N may be 1,000. A
/// perfect set, whose likelihood is infinite, leaves the others none.
std::vector<double> scaledWeights(std::span<const double> logarithms) {
  double largest = -kInfinity;
  for (const double value : logarithms) {
    if (value > largest) largest = value;  // not of NaN
  }
  std::vector<double> weights;
  double sum = 0.0;
  for (const double value : logarithms) {
    double weight = 0.0;
    if (largest == kInfinity) {
      weight = value == kInfinity ? 1.0 : 0.0;
    } else if (largest > -kInfinity && value > -kInfinity) {
      weight = std::exp(value - largest);
    }
    sum += weights.emplace_back(weight);
  }
  if (sum > 0.0) {
    for (double& weight : weights) weight /= sum;
  }
  return weights;
}

std::vector<double> pick(const std::vector<double>& column, std::span<const std::size_t> indices) {
  std::vector<double> values;
  values.reserve(indices.size());
  for (const std::size_t i : indices) values.push_back(column[i]);
  return values;
}

std::vector<SampleSummary> summariseColumns(std::span<const std::vector<double>> columns, const GlueWeights& weights) {
  std::vector<SampleSummary> summaries;
  for (const std::vector<double>& column : columns) {
    summaries.push_back(summariseWeighted(pick(column, weights.behavioural), weights.weights));
  }
  return summaries;
}

}  // namespace

double GlueJudge::distanceOf(double value) const {
  if (best == Best::largest) return 1.0 - value;
  return best == Best::zero ? std::abs(value) : value;
}

double GlueJudge::varianceOf(double value) const {
  const double distance = distanceOf(value);
  return isSquaredForVariance ? distance * distance : distance;
}

std::string GlueJudge::rangeText(double threshold) const {
  if (best == Best::zero) return fmt::format("{} to {}", formatReal(-threshold), formatReal(threshold));
  return fmt::format("{} or {}", formatReal(threshold), best == Best::largest ? "more" : "less");
}

std::optional<GlueJudge> glueJudge(const GlueSettings& settings, std::span<const OutputMeasure> measures,
                                   std::span<const ObjectiveFunction> objectives, SettingRefusal& refusal) {
  std::optional<GlueJudge> judge;
  refusal = {};
  if (!settings.judgedBy.empty()) {
    judge = judgeNamed(settings.judgedBy, measures, objectives, refusal);
  } else if (measures.size() == 1 || objectives.empty()) {
    judge = judgeOf(measures.front(), 0);
  } else {
    judge = judgeOf(objectives.front(), 0);
  }
  if (!judge) {
    if (refusal.message.empty()) refusal = unknownJudge(settings.judgedBy, measures, objectives);
    return std::nullopt;
  }
  if (auto unfit = misfit(*judge, settings)) {
    refusal = *std::move(unfit);
    return std::nullopt;
  }
  return judge;
}

std::vector<double> GlueWeights::ofAll(std::size_t count) const {
  std::vector<double> all(count, 0.0);
  for (std::size_t k = 0; k < behavioural.size(); ++k) all[behavioural[k]] = weights[k];
  return all;
}

GlueWeights glueWeights(const EvaluatedSample& sample, const GlueJudge& judge, const GlueSettings& settings) {
  GlueWeights found;
  found.successCount = static_cast<std::size_t>(std::count(sample.ok.begin(), sample.ok.end(), true));
  found.failedCount = sample.size() - found.successCount;
  if (found.successCount == 0) return found;
  const std::vector<double>& values = judge.valuesOf(sample);
  std::vector<std::size_t> judged;  // whose value is a number; the best first, of equals the one evaluated first
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (sample.ok[i] && !std::isnan(values[i])) judged.push_back(i);
  }
  const auto distance = [&](std::size_t i) { return judge.distanceOf(values[i]); };
  std::stable_sort(judged.begin(), judged.end(),
                   [&](std::size_t a, std::size_t b) { return distance(a) < distance(b); });
  if (judged.empty()) return found;
  found.best = judged.front();

  std::size_t count = 0;
  double limit = 0.0;  // distance at which a set is behavioural no more
  if (settings.threshold) {
    limit = judge.distanceOf(*settings.threshold);
    while (count < judged.size() && distance(judged[count]) <= limit) ++count;
  } else {
    const double wanted = std::ceil(settings.share.value_or(1.0) * static_cast<double>(found.successCount) - 1e-9);
    count = std::clamp<std::size_t>(static_cast<std::size_t>(wanted), 1, judged.size());
    while (count < judged.size() && distance(judged[count]) == distance(judged[count - 1])) ++count;
    limit = distance(judged[std::min(count, judged.size() - 1)]);
  }
  found.behavioural.assign(judged.begin(), judged.begin() + static_cast<std::ptrdiff_t>(count));
  std::sort(found.behavioural.begin(), found.behavioural.end());

  std::vector<double> logarithms;
  const double bestVariance = judge.varianceOf(values[*found.best]);
  for (const std::size_t i : found.behavioural) {
    logarithms.push_back(logLikelihood(judge, settings, values[i], limit, bestVariance));
    if (std::isnan(logarithms.back())) ++found.undefinedCount;
  }
  found.weights = scaledWeights(logarithms);
  found.isInfinite = std::ranges::find(logarithms, kInfinity) != logarithms.end();
  found.unweightedCount = static_cast<std::size_t>(std::count(found.weights.begin(), found.weights.end(), 0.0));
  found.effective = effectiveCount(found.weights);
  return found;
}

GlueSummary summariseGlue(const EvaluatedSample& sample, const GlueWeights& weights, std::int32_t matrixLimit) {
  GlueSummary summary;
  std::vector<std::vector<double>> behavioural;
  std::vector<std::size_t> succeeded;
  for (std::size_t i = 0; i < sample.size(); ++i) {
    if (sample.ok[i]) succeeded.push_back(i);
  }
  const std::vector<double> equal(sample.size(), 1.0 / static_cast<double>(std::max<std::size_t>(sample.size(), 1)));
  for (const std::vector<double>& column : sample.parameters) {
    behavioural.push_back(pick(column, weights.behavioural));
    GlueParameter& parameter = summary.parameters.emplace_back();
    parameter.drawn = summariseWeighted(column, equal);
    parameter.behavioural = summariseWeighted(behavioural.back(), weights.weights);
    parameter.distance = distributionDistance(behavioural.back(), weights.weights, pick(column, succeeded));
  }
  summary.measures = summariseColumns(sample.measures, weights);
  summary.objectives = summariseColumns(sample.objectives, weights);
  summary.validation = summariseColumns(sample.validation, weights);
  if (!weights.hasWeights()) return summary;
  if (sample.parameters.size() <= static_cast<std::size_t>(std::max(matrixLimit, 0))) {
    summary.correlations = weightedCorrelations(behavioural, weights.weights);
  } else {
    summary.largestCorrelations = largestWeightedCorrelations(behavioural, weights.weights);
  }
  summary.distanceLimit = chanceDistance(weights.effective, weights.successCount);
  return summary;
}

}  // namespace mirevo
