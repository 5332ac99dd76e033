#include "algorithms/analyses/morris.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include "algorithms/analyses/compared_observations.h"
#include "common/run_files.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr std::size_t kMostValues = 4'000'000;  // in a batch

/// All outputs of an evaluation, one kind behind another.
std::vector<double> outputsOf(const EvaluationResult& result, std::span<const ObjectiveFunction> objectives) {
  const bool isExact = !result.exactMeasures.empty();
  std::vector<double> outputs = isExact ? result.exactMeasures : result.measureValues;
  const std::vector<double> values =
      isExact ? objectiveFunctionValues(objectives, result.exactMeasures) : result.objectiveValues;
  outputs.insert(outputs.end(), values.begin(), values.end());
  outputs.insert(outputs.end(), result.validationValues.begin(), result.validationValues.end());
  return outputs;
}

/// The measures that output i depends on; none for one in a validation period, which is never NaN without reason.
std::vector<std::size_t> measuresOf(std::size_t i, std::size_t measureCount,
                                    std::span<const ObjectiveFunction> objectives) {
  if (i < measureCount) return {i};
  std::vector<std::size_t> measures;
  if (i - measureCount < objectives.size()) {
    for (const MeasureTerm& term : objectives[i - measureCount].measures) measures.push_back(term.index);
  }
  return measures;
}

}  // namespace

void evaluateEffects(const EffectPlan& plan, const ParameterDistributions& distributions, Evaluator& evaluator,
                     EffectResults& taken) {
  std::vector<ParameterSet> batch;
  const auto evaluate = [&] {
    for (EvaluationResult& result : evaluator.evaluateParameterSets(batch, DispatchMode::task)) {
      taken.push_back(std::move(result));
    }
    batch.clear();
  };
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    for (ParameterSet& set : setsOf(plan, trajectory, distributions)) batch.push_back(std::move(set));
    if (batch.size() * distributions.size() >= kMostValues) evaluate();
  }
  if (!batch.empty()) evaluate();
}

MorrisOutcome screenParameters(const EffectPlan& plan, const EffectResults& results, const MorrisSettings& settings,
                               std::int32_t seed, std::span<const ObjectiveFunction> objectives,
                               const AnalysisNames& names) {
  MorrisOutcome outcome;
  std::vector<std::vector<double>> outputs;
  for (const EvaluationResult& result : results) {
    outputs.push_back(result.ok() ? outputsOf(result, objectives) : std::vector<double>());
    if (result.ok()) continue;
    ++(result.failure->kind == EvaluationFailure::Kind::notMade ? outcome.missingCount : outcome.failedCount);
  }
  const ComparedObservations observations(results);
  const auto placeOf = [](int number) { return static_cast<std::size_t>(number - 1); };

  std::vector<std::vector<EffectPair>> pairs;
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    std::vector<EffectPair> ofTrajectory;
    for (const EffectPair& pair : pairsOf(plan, trajectory)) {
      ++outcome.plannedEffects;
      if (results[placeOf(pair.from)].ok() && results[placeOf(pair.to)].ok()) {
        ofTrajectory.push_back(pair);
      } else {
        ++outcome.lostEffects;
      }
    }
    pairs.push_back(std::move(ofTrajectory));
  }
  const Resamples resamples =
      drawResamples(plan.trajectories.size(), static_cast<std::size_t>(settings.bootstrapSamples), seed);
  const auto screen = [&](const char* kind, const std::string& name) {
    const std::size_t i = outcome.outputs.size();
    ScreenedOutput& output = outcome.outputs.emplace_back();
    output.kind = kind;
    output.name = name;
    const std::vector<std::size_t> measures = measuresOf(i, names.measures.size(), objectives);
    EffectRows effects(plan.trajectories.size(), std::vector<double>(names.parameters.size(), kNaN));
    for (std::size_t t = 0; t < pairs.size(); ++t) {
      for (const EffectPair& pair : pairs[t]) {
        const std::size_t from = placeOf(pair.from);
        const std::size_t to = placeOf(pair.to);
        const bool isSame =
            std::ranges::all_of(measures, [&](std::size_t m) { return observations.areSame(from, to, m); });
        double& effect = effects[t][pair.parameter];
        if (isSame && i < outputs[from].size() && i < outputs[to].size()) {
          effect = (outputs[to][i] - outputs[from][i]) / pair.width;
        }
        if (std::isfinite(effect)) continue;
        effect = kNaN;
        ++output.incomparable;
      }
    }
    output.effects = effectStatistics(effects, resamples, settings.negligibleShare);
  };
  for (const std::string& name : names.measures) screen("measure", name);
  for (const std::string& name : names.objectives) screen("objective", name);
  for (const std::string& name : names.validation) screen("validation", name);
  return outcome;
}

std::string_view verdictName(ScreeningVerdict verdict) {
  switch (verdict) {
    case ScreeningVerdict::fix:
      return "fix";
    case ScreeningVerdict::keep:
      return "keep";
    case ScreeningVerdict::undecided:
      return "undecided";
    case ScreeningVerdict::none:
      break;
  }
  return "";
}

DataTable morrisTable(const MorrisOutcome& outcome, const MorrisSettings& settings, const AnalysisNames& names) {
  DataTable table;
  table.file = run_files::kMorris;
  table.headLines = {
      "Elementary effects, in units of the output for the whole range of the parameter; limits at 95 %",
      "Share: mu* over the largest mu* of the output. Certainty: that the share is below Negligible. TopStability: "
      "share of the bootstrap samples with the same parameters, TopCount in number, in front. FixedTogether: certainty "
      "that all shares of those with the verdict fix are negligible. Both certainties say nothing of parameters "
      "without any effect, MuStar 0"};
  table.columns = {"Kind",         "Name",          "Parameter",   "Mu",      "MuLower",    "MuUpper",
                   "MuStar",       "MuStarLower",   "MuStarUpper", "Sigma",   "SigmaLower", "SigmaUpper",
                   "Share",        "ShareLower",    "ShareUpper",  "Effects", "Rank",       "RankLower",
                   "RankUpper",    "RankStability", "Certainty",   "Verdict", "Negligible", "TopCount",
                   "TopStability", "FixedTogether"};
  for (const ScreenedOutput& output : outcome.outputs) {
    for (std::size_t j = 0; j < names.parameters.size(); ++j) {
      const ParameterEffects& p = output.effects.parameters[j];
      std::vector<DataTable::Cell>& row = table.rows.emplace_back();
      row = {output.kind, output.name, names.parameters[j]};
      for (const LimitedValue* value : {&p.mu, &p.muStar, &p.sigma, &p.share}) {
        row.insert(row.end(), {value->value, value->lower, value->upper});
      }
      for (const std::size_t number : {p.count, p.rank, p.rankLower, p.rankUpper}) {
        row.emplace_back(static_cast<std::int64_t>(number));
      }
      row.insert(row.end(), {p.rankStability, p.certainty, std::string(verdictName(p.verdict)),
                             settings.negligibleShare, static_cast<std::int64_t>(output.effects.topCount),
                             output.effects.topStability, output.effects.fixedTogether});
    }
  }
  return table;
}

}  // namespace mirevo
