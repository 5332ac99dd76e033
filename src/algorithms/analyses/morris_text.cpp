// The log lines of a Morris screening.
#include <algorithm>
#include <cmath>
#include <utility>

#include <fmt/core.h>

#include "algorithms/analyses/morris.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/short_list.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostListed = 50;  // parameters in a table of the log
constexpr std::size_t kMostNamed = 20;   // in a sentence
constexpr int kFewTrajectories = 10;     // with fewer the limits are too narrow or of no use
constexpr double kMostFurther = 100.0;   // times the trajectories: more are not worth naming
constexpr double kStable = 0.95;
constexpr double kTail = 0.05;
constexpr double kNearlyAll = 0.9;  // of mu*, of one effect

std::string percent(double share) {
  const double value = 100.0 * share;
  return value > 0.0 && value < 10.0 ? fmt::format("{:.2g} %", value) : fmt::format("{:.0f} %", value);
}

/// Never 100 % for what a number of samples cannot show.
std::string surenessText(double certainty, int samples) {
  const double most = 1.0 - 1.0 / samples;
  if (certainty > most) return fmt::format("more than {:.4g} %", 100.0 * most);
  return fmt::format("{:.4g} %", 100.0 * certainty);
}

/// Behind "No parameter changes it": those of which that is not known.
std::string unknownEffects(const OutputEffects& effects, std::span<const std::string> names) {
  ShortList unknown(kMostNamed);
  for (std::size_t j = 0; j < effects.parameters.size(); ++j) {
    if (effects.parameters[j].count == 0) unknown.add(names[j]);
  }
  if (unknown.isEmpty()) return {};
  return " as far as effects are known; there is none of " + unknown.text();
}

struct Texts {
  const MorrisSettings& settings;
  const AnalysisNames& names;
  std::vector<std::string> lines;

  void appendTable(const ScreenedOutput& output, std::span<const std::size_t> order, std::string_view file);
  void appendVerdicts(const ScreenedOutput& output, std::span<const std::size_t> order);
  void appendRanking(const ScreenedOutput& output);
  void appendSingleEffects(const ScreenedOutput& output, std::span<const std::size_t> order);
};

std::vector<std::size_t> byRank(const OutputEffects& effects) {
  std::vector<std::size_t> order(effects.parameters.size());
  for (std::size_t j = 0; j < order.size(); ++j) order[j] = j;
  std::ranges::stable_sort(order, [&](std::size_t a, std::size_t b) {
    const std::size_t one = effects.parameters[a].rank;
    const std::size_t other = effects.parameters[b].rank;
    return one != 0 && (other == 0 || one < other);
  });
  return order;
}

void Texts::appendTable(const ScreenedOutput& output, std::span<const std::size_t> order, std::string_view file) {
  std::vector<std::string> labels;
  std::vector<std::vector<double>> rows;
  for (const std::size_t j : order.first(std::min(order.size(), kMostListed))) {
    const ParameterEffects& p = output.effects.parameters[j];
    labels.push_back(fmt::format("{:>3}. {}", p.rank, names.parameters[j]));
    rows.push_back({p.muStar.value, p.muStar.lower, p.muStar.upper, p.mu.value, p.sigma.value, 100.0 * p.share.value,
                    100.0 * std::min(p.share.upper, 1.0), static_cast<double>(p.count), 100.0 * p.rankStability});
  }
  const std::string headings[] = {"mu*",         "lower 95 %", "upper 95 %",    "mu", "sigma", "% of largest",
                                  "at most (%)", "effects",    "rank holds (%)"};
  const std::string kind = output.kind == "objective" ? "Objective function"
                           : output.kind == "measure" ? "Output measure"
                                                      : "Validation";
  lines.emplace_back();
  for (std::string& line : formatTable(kind + " " + output.name, headings, labels, rows)) {
    lines.push_back(std::move(line));
  }
  if (order.size() > kMostListed) {
    lines.push_back(
        fmt::format("   The other {} of {} parameters are in {}", order.size() - kMostListed, order.size(), file));
  }
}

void Texts::appendVerdicts(const ScreenedOutput& output, std::span<const std::size_t> order) {
  const auto list = [&](ScreeningVerdict verdict, bool isFromLast, const auto& textOf) {
    ShortList found(kMostNamed);
    for (std::size_t k = 0; k < order.size(); ++k) {
      const std::size_t j = order[isFromLast ? order.size() - 1 - k : k];
      if (output.effects.parameters[j].verdict == verdict) found.add(textOf(j));
    }
    return std::pair(found.count(), found.text());
  };
  const auto ofParameter = [&](std::size_t j) -> const ParameterEffects& { return output.effects.parameters[j]; };
  const auto [fixed, fixable] = list(ScreeningVerdict::fix, true, [&](std::size_t j) {
    if (ofParameter(j).muStar.value == 0.0) return names.parameters[j] + " (no effect in any trajectory)";
    return fmt::format("{} (at most {}, sure to {})", names.parameters[j], percent(ofParameter(j).share.upper),
                       surenessText(ofParameter(j).certainty, settings.bootstrapSamples));
  });
  const std::string limit = percent(settings.negligibleShare);
  lines.push_back(fixed == 0
                      ? fmt::format("   Can be fixed: none is known to have less than {} of the largest mu*", limit)
                      : fmt::format("   Can be fixed, with less than {} of the largest mu*: {}", limit, fixable));
  std::size_t inert = 0;
  std::size_t fewest = std::numeric_limits<std::size_t>::max();
  for (const ParameterEffects& p : output.effects.parameters) {
    if (p.verdict != ScreeningVerdict::fix || p.muStar.value != 0.0) continue;
    ++inert;
    fewest = std::min(fewest, p.count);
  }
  if (fixed - inert > 1) {
    lines.push_back(fmt::format("      all {}{} together: sure to {}", fixed - inert,
                                inert > 0 ? " that have an effect" : "",
                                surenessText(output.effects.fixedTogether, settings.bootstrapSamples)));
  }
  if (inert > 0) {
    lines.push_back(
        fmt::format("      without any effect in {} or more steps: what acts in less than {} of the space may have "
                    "gone unseen (95 %)",
                    fewest, percent(1.0 - std::pow(kTail, 1.0 / static_cast<double>(fewest)))));
  }
  const auto [kept, keepable] = list(ScreeningVerdict::keep, false, [&](std::size_t j) { return names.parameters[j]; });
  if (kept > 0) lines.push_back("   Must be kept: " + keepable);
  const auto [open, undecided] = list(ScreeningVerdict::undecided, false, [&](std::size_t j) {
    return fmt::format("{} ({} to {})", names.parameters[j], percent(ofParameter(j).share.lower),
                       percent(std::min(ofParameter(j).share.upper, 1.0)));
  });
  if (open == 0) return;
  const double needed = output.effects.trajectoriesToDecide;
  const std::string remedy =
      needed <= kMostFurther * settings.trajectories
          ? fmt::format("if the values hold, about {:.0f} trajectories would decide", std::ceil(needed))
          : fmt::format("some are so close to {} that no number of trajectories worth running would decide", limit);
  lines.push_back(
      fmt::format("   Undecided, {} of the largest mu* lies within the limits: {}; {}", limit, undecided, remedy));
}

void Texts::appendRanking(const ScreenedOutput& output) {
  const OutputEffects& effects = output.effects;
  if (std::isnan(effects.topStability) || effects.topCount == 0 || effects.topCount >= effects.parameters.size())
    return;
  lines.push_back(fmt::format("   The {} parameter{} in front {} the same in {} of the bootstrap samples",
                              effects.topCount, effects.topCount == 1 ? "" : "s", effects.topCount == 1 ? "is" : "are",
                              percent(effects.topStability)));
  if (effects.topStability < kStable) {
    lines.back() += ": who is in front is not certain with so few trajectories";
  }
}

/// Of a few effects the largest may well be most of the sum.
void Texts::appendSingleEffects(const ScreenedOutput& output, std::span<const std::size_t> order) {
  ShortList parameters(kMostNamed);
  for (const std::size_t j : order) {
    const ParameterEffects& p = output.effects.parameters[j];
    if (p.count < kFewestEffects || !(p.largestPart > kNearlyAll) || p.share.value < settings.negligibleShare) continue;
    parameters.add(names.parameters[j]);
  }
  if (parameters.isEmpty()) return;
  lines.push_back(
      fmt::format("Warning: A single effect on {} makes more than 90 % of the mu* of {}: see whether the value of that "
                  "run is what the model should yield. Other points may give another mu*",
                  output.name, parameters.text()));
}

void appendStepProblems(const EffectPlan& plan, const AnalysisNames& names, std::vector<std::string>& lines) {
  const std::size_t r = plan.trajectories.size();
  for (std::size_t j = 0; j < names.parameters.size(); ++j) {
    if (plan.unchanged[j] > 0) {
      lines.push_back(
          fmt::format("Warning: Parameter {} makes no step in {} of {} trajectories: no step found changes "
                      "its value",
                      names.parameters[j], plan.unchanged[j], r));
    }
    if (plan.infeasible[j] > 0) {
      lines.push_back(
          fmt::format("Warning: Parameter {} has no effect in {} of {} trajectories: the sets of its step "
                      "cannot be run",
                      names.parameters[j], plan.infeasible[j], r));
    }
  }
  if (plan.infeasiblePoints > 0) {
    lines.push_back(
        fmt::format("Warning: {} points of the trajectories are not run, and the effects of their steps "
                    "are left out: {}",
                    plan.infeasiblePoints, plan.violation));
  }
  if (plan.isCorrelated) lines.push_back(std::string("   ") + kCorrelatedStepsText);
}

void appendLosses(const MorrisOutcome& outcome, const EffectPlan& plan, std::vector<std::string>& lines) {
  if (outcome.lostEffects == 0) return;
  std::string what;
  if (outcome.failedCount > 0) {
    what = countText(outcome.failedCount, "evaluation") + " failed";
  }
  if (outcome.missingCount > 0) {
    what += what.empty() ? countText(outcome.missingCount, "evaluation") : fmt::format(" and {}", outcome.missingCount);
    what += outcome.missingCount == 1 ? " was not made" : " were not made";
  }
  const char* cost = plan.design == EffectDesign::radial
                         ? "a base point costs the effects of its trajectory, any other point one"
                         : "a point costs the two effects of its steps";
  lines.push_back(fmt::format("Warning: {}: {} of {} effects are left out ({}), and the limits are wider", what,
                              outcome.lostEffects, outcome.plannedEffects, cost));
}

}  // namespace

std::string infeasiblePointsText(const EffectPlan& plan, std::span<const std::string> parameters) {
  ShortList lacking(kMostNamed);
  const std::size_t count = plan.trajectories.size();
  for (std::size_t j = 0; j < parameters.size(); ++j) {
    if (plan.infeasible[j] > 0) lacking.add(fmt::format("{} ({} of {})", parameters[j], plan.infeasible[j], count));
  }
  if (plan.infeasiblePoints == 0 && lacking.isEmpty()) return {};
  const bool hasPoints = plan.infeasiblePoints > 0;
  std::string text =
      hasPoints ? fmt::format(
                      "{} of {} points of the trajectories cannot be run and {} left out, with the effects of their "
                      "steps",
                      plan.infeasiblePoints, count * (parameters.size() + 1), plan.infeasiblePoints == 1 ? "is" : "are")
                : std::string("Of some parameters no step that can be run was found");
  const std::string& violation = hasPoints ? plan.violation : plan.stepViolation;
  if (!violation.empty()) text += fmt::format("; {}: {}", hasPoints ? "the first" : "one that was tried", violation);
  if (!lacking.isEmpty()) text += "\n   Parameters that lack effects, in how many trajectories: " + lacking.text();
  if (plan.design == EffectDesign::trajectories) {
    text += "\n   Design = 'radial' takes other points instead, as far as it finds some that can be run";
  }
  return text;
}

std::vector<std::string> formatMorris(const MorrisOutcome& outcome, const EffectPlan& plan,
                                      const MorrisSettings& settings, const AnalysisNames& names,
                                      std::string_view file) {
  Texts texts{settings, names, {}};
  const std::string how =
      plan.design == EffectDesign::radial ? "radial, from Sobol' points" : fmt::format("on {} levels", settings.levels);
  texts.lines.push_back(fmt::format("Morris screening: {} trajectories ({}) of {} parameters, {} evaluations",
                                    plan.trajectories.size(), how, names.parameters.size(), plan.evaluationCount));
  texts.lines.emplace_back(
      "   Effects are changes of an output for the whole range of a parameter; limits are those of the bootstrap over "
      "trajectories, at 95 %");
  appendLosses(outcome, plan, texts.lines);
  appendStepProblems(plan, names, texts.lines);
  if (settings.trajectories < kFewTrajectories) {
    texts.lines.push_back(
        fmt::format("Warning: {} trajectories are few: limits of fewer than {} effects hold less often "
                    "than they say, and below {} there are none",
                    settings.trajectories, kFewTrajectories, kFewestEffects));
  }
  const bool hasObjectives = !names.objectives.empty();
  for (const ScreenedOutput& output : outcome.outputs) {
    const std::vector<std::size_t> order = byRank(output.effects);
    if (output.incomparable > 0) {
      texts.lines.push_back(
          fmt::format("Warning: {} effects on {} are left out: a value is not finite, or the two runs "
                      "are judged by different observations",
                      output.incomparable, output.name));
    }
    if (output.kind != (hasObjectives ? "objective" : "measure")) continue;
    texts.appendTable(output, order, file);
    const ParameterEffects& first = output.effects.parameters[order.front()];
    if (first.count == 0) {
      texts.lines.emplace_back("   No effect is known");
    } else if (first.muStar.value == 0.0) {
      texts.lines.push_back("   No parameter changes it" + unknownEffects(output.effects, names.parameters));
    } else if (!first.share.hasLimits()) {
      texts.lines.push_back(
          fmt::format("   Which parameters can be fixed is not said: that takes {} effects of each", kFewestEffects));
    } else {
      texts.appendSingleEffects(output, order);
      texts.appendVerdicts(output, order);
      texts.appendRanking(output);
    }
  }
  return std::move(texts.lines);
}

}  // namespace mirevo
