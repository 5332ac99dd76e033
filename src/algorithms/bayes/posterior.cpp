#include "algorithms/bayes/posterior.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <functional>
#include <limits>
#include <numeric>
#include <utility>

#include <fmt/format.h>

#include "algorithms/bayes/posterior_words.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/run_files.h"
#include "common/short_list.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kBins = 40;
constexpr std::size_t kMostListed = 50;  // dimensions in the table of the log

bool hasLikelihood(const ChainHistory::State& state) {
  return state.logLikelihood > -std::numeric_limits<double>::infinity();
}

/// Calls `take(state)` for each state behind burn-in. Those without a likelihood, of chains that have not come out of
/// where they began, are no part of the posterior.
template <class Take>
void forPosterior(const DreamSampler& sampler, const Take& take) {
  const ChainHistory& history = sampler.history();
  for (std::size_t g = sampler.burnIn().value_or(history.generations()); g < history.generations(); ++g) {
    for (std::size_t c = 0; c < history.chainCount(); ++c) {
      const ChainHistory::State state = history.at(g, c);
      if (hasLikelihood(state)) take(state);
    }
  }
}

std::vector<std::vector<double>> shownColumns(const ShownDimensions& dimensions,
                                              std::span<const std::vector<double>> points) {
  std::vector<std::vector<double>> columns(dimensions.names.size());
  for (const std::vector<double>& point : points) {
    const std::vector<double> values = dimensions.shown(point);
    for (std::size_t j = 0; j < columns.size(); ++j) columns[j].push_back(values[j]);
  }
  return columns;
}

std::vector<double> quantilesOf(std::span<const double> values) {
  const SampleSummary summary = summariseSample(values);
  return {summary.quantiles.begin(), summary.quantiles.end()};
}

std::string percent(double share) {
  return fmt::format("{:.1f} %", 100.0 * share);
}

std::string endText(const DreamSettings& settings, DreamEnd end) {
  switch (end) {
    case DreamEnd::converged:
      return fmt::format("The chains ended as R-hat is at most {:g} and the effective sample size at least {:g}",
                         settings.rHatLimit, settings.effectiveSize);
    case DreamEnd::budget:
      return fmt::format("The chains ended as the next generation would need more than {} evaluations",
                         settings.mostRuns);
    case DreamEnd::generations:
      return "The chains ended as most proposals need no evaluation: they lie outside the bounds or the prior, violate "
             "constraints, or change parameters of the error model alone";
    case DreamEnd::none:
      break;
  }
  return "The chains were interrupted";
}

/// "90 failed, and 3 have ..."
std::string reasonsText(const RunsWithoutLikelihood& runs) {
  const std::pair<int, const char*> all[] = {
      {runs.failed, "failed"},
      {runs.missing, "lack simulated values where observations count"},
      {runs.untransformed,
       "have simulated values without a Box-Cox transformation, zeros with a lambda of at most 0 or values below the "
       "negative Box_Cox_Shift"},
      {runs.notFinite, "have no finite errors, or errors too large for their deviation"},
      {runs.notNumbers, "have no finite value of the objective function"},
  };
  std::vector<std::string> parts;
  for (const auto& [count, text] : all) {
    if (count > 0) parts.push_back(fmt::format("{} {}", count, text));
  }
  return fmt::format("{}", fmt::join(parts, "; "));
}

std::string remedyText(const RunsWithoutLikelihood& runs) {
  std::string text;
  if (runs.failed > 0) text += " Keep the chains away from where the model fails: narrower bounds, or another prior.";
  if (runs.missing > 0) text += " Simulated values are needed at the times of all observations that count.";
  if (runs.untransformed > 0) {
    text +=
        " Zeros have a transformation with bounds of Box_Cox_Lambda above 0; a larger Box_Cox_Shift is for them "
        "and for values below it.";
  }
  if (runs.notFinite > 0) {
    text +=
        " Error_Deviation, Error_Share and Error_Bias must fit the size of the errors; without them the bounds of "
        "the deviation come from the observations.";
  }
  if (runs.notNumbers > 0) text += " The objective function has to be a finite number.";
  return text;
}

std::vector<DimensionFigures> figuresOf(const ShownDimensions& dimensions, const PosteriorSummary& summary) {
  std::vector<DimensionFigures> figures;
  for (std::size_t j = 0; j < dimensions.names.size(); ++j) {
    const PosteriorSummary::Dimension& own = summary.dimensions[j];
    figures.push_back(
        {dimensions.names[j], own.rHat, own.effectiveSize, narrowingOf(own.quantiles, own.priorQuantiles)});
  }
  return figures;
}

/// Whether the chains agree, and what to do where they do not.
void appendConvergence(const DreamSettings& settings, std::span<const DimensionFigures> figures,
                       std::vector<std::string>& lines) {
  const ConvergenceWords words = convergenceWords(figures, {settings.rHatLimit, settings.effectiveSize});
  const char* const mark = words.state == Convergence::reached ? "" : "Warning: ";
  for (const std::string& finding : words.findings) lines.push_back(mark + finding);
}

void appendCounts(const DreamSampler& sampler, std::vector<std::string>& lines) {
  const DreamCounts& parallel = sampler.parallelCounts();
  const DreamCounts& snooker = sampler.snookerCounts();
  const DreamCounts all{parallel.proposals + snooker.proposals, parallel.accepted + snooker.accepted};
  lines.push_back(
      fmt::format("Acceptance rate behind burn-in: {} of {} proposals ({} of parallel-direction updates, {} "
                  "of snooker updates)",
                  percent(all.rate()), all.proposals, percent(parallel.rate()), percent(snooker.rate())));
  const auto few = all.proposals > 0 ? acceptanceWords(all.rate()) : std::nullopt;
  if (few) lines.push_back("Warning: " + *few);
  if (sampler.outlierCount() > 0) {
    lines.push_back(fmt::format("{} during burn-in: each went on from the state of the best chain",
                                countText(static_cast<std::size_t>(sampler.outlierCount()), "outlier chain")));
  }
}

/// All dimensions, or of many those of whose priors least is left, in their order.
std::vector<std::size_t> mostNarrowed(std::span<const DimensionFigures> figures) {
  std::vector<std::size_t> order(figures.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  if (order.size() <= kMostListed) return order;
  const auto key = [&](std::size_t j) {
    return std::isnan(figures[j].narrowing) ? std::numeric_limits<double>::infinity() : figures[j].narrowing;
  };
  std::ranges::stable_sort(order, std::less(), key);
  order.resize(kMostListed);
  std::ranges::sort(order);
  return order;
}

void appendQuantiles(const ShownDimensions& dimensions, const PosteriorSummary& summary,
                     std::span<const DimensionFigures> figures, std::string_view file,
                     std::vector<std::string>& lines) {
  std::vector<std::string> headings{"Mean", "Std. deviation"};
  for (const double p : kSummaryProbabilities) headings.push_back(fmt::format("{:g} %", 100.0 * p));
  headings.insert(headings.end(), {"Most probable", "R-hat", "Eff. size"});
  std::vector<std::vector<double>> rows;
  std::vector<std::string> names;
  for (const std::size_t j : mostNarrowed(figures)) {
    names.push_back(dimensions.names[j]);
    const PosteriorSummary::Dimension& own = summary.dimensions[j];
    std::vector<double> row{own.mean, own.standardDeviation};
    row.insert(row.end(), own.quantiles.begin(), own.quantiles.end());
    row.insert(row.end(), {summary.mostProbable[j], own.rHat, std::round(own.effectiveSize)});
    rows.push_back(std::move(row));
  }
  lines.emplace_back();
  for (std::string& line : formatTable("Posterior", headings, names, rows)) lines.push_back(std::move(line));
  if (const std::size_t left = figures.size() - names.size(); left > 0) {
    lines.push_back(fmt::format("   The other {} of {} parameters, which the data have narrowed less, are in {}", left,
                                figures.size(), file));
  }
  lines.push_back(fmt::format("The most probable state is that of evaluation {}", summary.mostProbableRun));
}

/// What the data have told: nothing while chains are at different places.
void appendTold(const ShownDimensions& dimensions, const PosteriorSummary& summary,
                std::span<const DimensionFigures> figures, std::vector<std::string>& lines) {
  const std::vector<PairCorrelation> pairs =
      summary.correlations.empty() ? summary.largestCorrelations : largestPairs(summary.correlations);
  for (std::string& line : tradeOffWords(dimensions.names, pairs)) lines.push_back(std::move(line));
  constexpr std::size_t kMostLines = 10;
  std::size_t hardlyNarrower = 0;
  for (const DimensionFigures& one : figures.first(dimensions.modelParameterCount)) {
    if (isHardlyNarrower(one) && ++hardlyNarrower <= kMostLines) lines.push_back(hardlyNarrowerWords(one));
  }
  if (hardlyNarrower > kMostLines) {
    lines.push_back(fmt::format("... and so of {}", countText(hardlyNarrower - kMostLines, "other parameter")));
  }
}

/// Those that have one value in all states of chains that move.
void appendKnown(const ShownDimensions& dimensions, const PosteriorSummary& summary, std::vector<std::string>& lines) {
  ShortList known(kMostListed);
  for (std::size_t j = 0; j < dimensions.names.size(); ++j) {
    const PosteriorSummary::Dimension& own = summary.dimensions[j];
    if (own.standardDeviation != 0.0 || own.rHat != 1.0) continue;
    known.add(fmt::format("{} = {}", dimensions.names[j], formatReal(own.mean)));
  }
  if (known.isEmpty()) return;
  lines.push_back(fmt::format("The same in all states, so that there is nothing on which the chains could disagree: {}",
                              known.text()));
}

void appendCorrelations(const ShownDimensions& dimensions, const PosteriorSummary& summary,
                        std::string_view correlationFile, std::vector<std::string>& lines) {
  lines.emplace_back();
  const std::string title = "Correlation";
  for (std::string& line : summary.correlations.empty()
                               ? formatLargest(title, dimensions.names, summary.largestCorrelations, correlationFile)
                               : formatCorrelation(title, dimensions.names, summary.correlations, correlationFile)) {
    lines.push_back(std::move(line));
  }
}

}  // namespace

std::optional<PosteriorSummary> summarisePosterior(const DreamSampler& sampler, const ShownDimensions& dimensions,
                                                   std::span<const std::vector<double>> priorDraws,
                                                   std::size_t matrixLimit) {
  const auto check = sampler.checkNow();
  if (!check) return std::nullopt;
  PosteriorSummary summary;
  std::vector<std::vector<double>> rows;
  double largest = -std::numeric_limits<double>::infinity();
  forPosterior(sampler, [&](const ChainHistory::State& state) {
    rows.push_back(dimensions.shown(state.point));
    const double density = state.logLikelihood + state.logPrior;
    if (!summary.mostProbable.empty() && !(density > largest)) return;
    largest = density;
    summary.mostProbable = rows.back();
    summary.mostProbableRun = state.evaluation;
  });
  if (rows.empty()) return std::nullopt;
  summary.draws = rows.size();
  const ChainHistory& history = sampler.history();
  summary.withoutLikelihood = (history.generations() - *sampler.burnIn()) * history.chainCount() - rows.size();
  const std::vector<std::vector<double>> prior = shownColumns(dimensions, priorDraws);
  for (std::size_t j = 0; j < dimensions.names.size(); ++j) {
    std::vector<double> values;
    values.reserve(rows.size());
    for (const std::vector<double>& row : rows) values.push_back(row[j]);
    const SampleSummary found = summariseSample(values);
    summary.dimensions.push_back({found.mean,
                                  found.standardDeviation,
                                  {found.quantiles.begin(), found.quantiles.end()},
                                  quantilesOf(prior[j]),
                                  check->rHat[j],
                                  check->effectiveSizes[j]});
  }
  if (dimensions.names.size() <= matrixLimit) {
    summary.correlations = correlationMatrix(rows);
  } else {
    summary.largestCorrelations = largestCorrelations(SampleCorrelations(rows), kMostLargeCorrelations);
  }
  return summary;
}

DataTable posteriorCorrelationTable(const PosteriorSummary& summary, const ShownDimensions& dimensions) {
  const std::string title = "Correlation of the posterior";
  if (!summary.correlations.empty()) {
    return matrixTable(run_files::kSampleCorrelation, title, dimensions.names, summary.correlations);
  }
  return pairTable(run_files::kSampleCorrelation, title, dimensions.names, summary.largestCorrelations);
}

DataTable chainsTable(const DreamSampler& sampler, const ShownDimensions& dimensions) {
  DataTable table{run_files::kChains,
                  {"The states of the chains. Rows with 1 in Burn_In are no part of the posterior; a rejected proposal "
                   "repeats the state before it, and Evaluation is the model run of the state"},
                  {"Generation", "Chain", "Burn_In", "Evaluation", "Accepted", "Log_Likelihood", "Log_Prior"},
                  {}};
  table.columns.insert(table.columns.end(), dimensions.names.begin(), dimensions.names.end());
  table.realColumns.resize(2 + dimensions.names.size());
  const ChainHistory& history = sampler.history();
  const std::size_t burnIn = sampler.burnIn().value_or(history.generations());
  for (std::size_t g = 0; g < history.generations(); ++g) {
    for (std::size_t c = 0; c < history.chainCount(); ++c) {
      const ChainHistory::State state = history.at(g, c);
      table.rows.push_back({static_cast<std::int64_t>(g + 1), static_cast<std::int64_t>(c + 1),
                            static_cast<std::int64_t>(g < burnIn ? 1 : 0), static_cast<std::int64_t>(state.evaluation),
                            static_cast<std::int64_t>(state.accepted ? 1 : 0)});
      std::vector<double> values{state.logLikelihood, state.logPrior};
      const std::vector<double> shown = dimensions.shown(state.point);
      values.insert(values.end(), shown.begin(), shown.end());
      for (std::size_t k = 0; k < values.size(); ++k) table.realColumns[k].push_back(values[k]);
    }
  }
  return table;
}

DataTable posteriorTable(const PosteriorSummary& summary, const ShownDimensions& dimensions) {
  DataTable table{run_files::kPosterior,
                  {fmt::format("The posterior by {} states of the chains, and quantiles of the prior", summary.draws),
                   fmt::format("Most probable: evaluation {}", summary.mostProbableRun)},
                  {"Name", "Kind", "Mean", "Standard deviation"},
                  {}};
  for (const double p : kSummaryProbabilities) table.columns.push_back(fmt::format("{:g} %", 100.0 * p));
  table.columns.insert(table.columns.end(), {"Most probable", "R-hat", "Effective size"});
  for (const double p : kSummaryProbabilities) table.columns.push_back(fmt::format("Prior {:g} %", 100.0 * p));
  for (std::size_t j = 0; j < dimensions.names.size(); ++j) {
    const PosteriorSummary::Dimension& own = summary.dimensions[j];
    const std::string kind = j < dimensions.modelParameterCount ? "parameter" : "error";
    std::vector<DataTable::Cell> row{dimensions.names[j], kind, own.mean, own.standardDeviation};
    row.insert(row.end(), own.quantiles.begin(), own.quantiles.end());
    for (const double value : {summary.mostProbable[j], own.rHat, own.effectiveSize}) row.emplace_back(value);
    row.insert(row.end(), own.priorQuantiles.begin(), own.priorQuantiles.end());
    table.rows.push_back(std::move(row));
  }
  return table;
}

DataTable marginalsTable(const DreamSampler& sampler, const ShownDimensions& dimensions,
                         std::span<const std::vector<double>> priorDraws) {
  DataTable table{
      run_files::kMarginals,
      {"Shares of the posterior and of the prior in bins over the range of the posterior: of equal width or, where the "
       "prior is one of orders of magnitude, of equal ratio"},
      {"Name", "From", "To", "Posterior", "Prior"},
      {}};
  std::vector<std::vector<double>> columns(dimensions.names.size());
  forPosterior(sampler, [&](const ChainHistory::State& state) {
    const std::vector<double> values = dimensions.shown(state.point);
    for (std::size_t j = 0; j < columns.size(); ++j) columns[j].push_back(values[j]);
  });
  const std::vector<std::vector<double>> prior = shownColumns(dimensions, priorDraws);
  for (std::size_t j = 0; j < columns.size(); ++j) {
    if (columns[j].empty()) continue;
    const auto [least, largest] = std::ranges::minmax(columns[j]);
    if (!(largest > least)) continue;
    const bool isLogarithmic = least > 0.0 && isOfMagnitudes(quantilesOf(prior[j]));
    const auto scaled = [isLogarithmic](double value) { return isLogarithmic ? std::log(value) : value; };
    const double origin = scaled(least);
    const double width = (scaled(largest) - origin) / kBins;
    const auto edge = [&](std::size_t bin) {
      const double value = origin + static_cast<double>(bin) * width;
      return isLogarithmic ? std::exp(value) : value;
    };
    const auto sharesOf = [&, from = least, to = largest](std::span<const double> values) {
      std::vector<double> shares(kBins, 0.0);
      for (const double value : values) {
        if (value < from || value > to) continue;
        const auto bin = std::min(static_cast<std::size_t>((scaled(value) - origin) / width), kBins - 1);
        shares[bin] += 1.0 / static_cast<double>(values.size());
      }
      return shares;
    };
    const std::vector<double> after = sharesOf(columns[j]);
    const std::vector<double> before = sharesOf(prior[j]);
    for (std::size_t b = 0; b < kBins; ++b) {
      table.rows.push_back({dimensions.names[j], edge(b), edge(b + 1), after[b], before[b]});
    }
  }
  return table;
}

DataTable convergenceTable(const DreamSampler& sampler, const ShownDimensions& dimensions) {
  DataTable table{run_files::kConvergence,
                  {"R-hat and effective sample sizes behind burn-in"},
                  {"Generation", "Evaluations", "Name", "R-hat", "Effective size"},
                  {}};
  std::vector<ConvergenceCheck> checks = sampler.checks();
  const auto last = sampler.checkNow();
  if (last && (checks.empty() || checks.back().generations != last->generations)) checks.push_back(*last);
  for (const ConvergenceCheck& check : checks) {
    for (std::size_t j = 0; j < dimensions.names.size(); ++j) {
      table.rows.push_back({static_cast<std::int64_t>(check.generations), static_cast<std::int64_t>(check.runs),
                            dimensions.names[j], check.rHat[j], check.effectiveSizes[j]});
    }
  }
  return table;
}

std::string noLikelihoodText(const DreamSampler& sampler, const RunsWithoutLikelihood& runs) {
  const ChainHistory& history = sampler.history();
  // A chain never goes back to where there is no likelihood.
  for (std::size_t c = 0; c < history.chainCount() && history.generations() > 0; ++c) {
    if (hasLikelihood(history.at(history.generations() - 1, c))) return {};
  }
  return fmt::format("No posterior: none of the {} has a likelihood: {}.{}",
                     countText(static_cast<std::size_t>(sampler.runs()), "evaluation"), reasonsText(runs),
                     remedyText(runs));
}

std::vector<std::string> formatPosterior(const DreamSettings& settings, const DreamSampler& sampler,
                                         const ShownDimensions& dimensions, const PosteriorSummary* summary,
                                         const RunsWithoutLikelihood& runs, const PosteriorFiles& files) {
  const ChainHistory& history = sampler.history();
  std::vector<std::string> lines{fmt::format("DREAM(ZS): {} chains, {} generations, {}", history.chainCount(),
                                             history.generations(),
                                             countText(static_cast<std::size_t>(sampler.runs()), "evaluation"))};
  lines.push_back(endText(settings, sampler.end()));
  if (const std::string text = noLikelihoodText(sampler, runs); !text.empty()) {
    lines.push_back("Warning: " + text);
    return lines;
  }
  if (runs.count() > 0) {
    lines.push_back(fmt::format("{} without a likelihood, whose sets were rejected: {}",
                                countText(static_cast<std::size_t>(runs.count()), "evaluation"), reasonsText(runs)));
  }
  if (summary == nullptr) {
    lines.emplace_back(sampler.burnIn() ? "Warning: No posterior: there are fewer than 4 generations behind burn-in"
                                        : "Warning: No posterior: the run ended in burn-in");
    return lines;
  }
  lines.push_back(
      fmt::format("Burn-in: the first {} generations, {:g} of {} evaluations, which are left out; the "
                  "posterior is {} states behind it",
                  *sampler.burnIn(), settings.burnInShare,
                  settings.burnInOf > 0 ? settings.burnInOf : settings.mostRuns, summary->draws));
  if (summary->withoutLikelihood > 0) {
    lines.push_back(
        fmt::format("Warning: {} more behind burn-in {} no likelihood and {} left out: chains have not "
                    "found a set that has one, or late. Narrower bounds or another prior help, or a larger "
                    "Burn_In_Share",
                    countText(summary->withoutLikelihood, "state"), summary->withoutLikelihood == 1 ? "has" : "have",
                    summary->withoutLikelihood == 1 ? "is" : "are"));
  }
  const std::vector<DimensionFigures> figures = figuresOf(dimensions, *summary);
  appendConvergence(settings, figures, lines);
  appendCounts(sampler, lines);
  appendQuantiles(dimensions, *summary, figures, files.posterior, lines);
  appendKnown(dimensions, *summary, lines);
  const ConvergenceLimits limits{settings.rHatLimit, settings.effectiveSize};
  if (convergenceWords(figures, limits).state != Convergence::apart) appendTold(dimensions, *summary, figures, lines);
  appendCorrelations(dimensions, *summary, files.correlations, lines);
  return lines;
}

}  // namespace mirevo
