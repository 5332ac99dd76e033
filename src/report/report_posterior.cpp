#include "report/report_posterior.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <map>
#include <numeric>
#include <string_view>
#include <unordered_map>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "report/analysis_table.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr std::size_t kMostChains = 12;         // with a trace
constexpr std::size_t kMostTraced = 200'000;    // numbers of all traces together: 2 MB of the page
constexpr std::size_t kMostGenerations = 500;   // of a trace: about the pixels of its chart
constexpr std::size_t kFewestGenerations = 50;  // of a trace
constexpr std::size_t kMostDraws = 600;         // of a pair plot
constexpr std::size_t kFirstDimension = 7;      // column of the chains

/// A table and the name of its file.
struct NamedTable {
  std::string file;
  ReadTable table;

  std::string text(std::size_t row, std::string_view name) const {
    const auto column = table.column(name);
    return column ? table.rows[row][*column] : std::string();
  }
  double number(std::size_t row, std::string_view name) const { return realCell(text(row, name)).value_or(kNaN); }
};

/// Empty, with the fault, where the file is not there or has not these columns.
std::optional<NamedTable> readNamed(const std::string& filePrefix, const RunFile& file,
                                    std::initializer_list<std::string_view> columns, std::vector<std::string>& faults) {
  const std::string path = runFilePath(filePrefix, file);
  std::string fault;
  auto table = readAnalysisTable(path, fault);
  if (!table) {
    faults.push_back(fault);
    return std::nullopt;
  }
  NamedTable read{fileNameOf(path), std::move(*table)};
  const bool isWhole = std::ranges::all_of(columns, [&](std::string_view name) { return !!read.table.column(name); });
  if (isWhole && !read.table.rows.empty()) return read;
  faults.push_back(unshownTable(path));
  return std::nullopt;
}

/// The states of the chains, column by column: as numbers a hundred thousand of them take little memory.
struct ChainStates {
  std::vector<std::string> names;            ///< of the dimensions
  std::vector<std::vector<double>> columns;  ///< of the table; one value per state
  std::size_t chainCount = 0;
  std::size_t generationCount = 0;
  bool isCutOff = false;
  bool isUnfinished = false;

  const std::vector<double>& column(std::size_t index) const { return columns[index]; }
};

enum Column : std::size_t { kGeneration, kChain, kBurnIn, kEvaluation, kAccepted, kLogLikelihood, kLogPrior };

/// The head lines and the header row of a table of chains; empty if it has none.
std::optional<ReadTable> readHead(std::string_view text, std::size_t& end) {
  end = 0;
  while (end < text.size() && text[end] == '#') {
    const std::size_t line = text.find('\n', end);
    end = line == std::string_view::npos ? text.size() : line + 1;
  }
  const std::size_t line = text.find('\n', end);
  if (line == std::string_view::npos) return std::nullopt;
  end = line + 1;
  ReadTable head = readDataTable(text.substr(0, end));
  static constexpr std::string_view kNames[] = {"Generation", "Chain",          "Burn_In",  "Evaluation",
                                                "Accepted",   "Log_Likelihood", "Log_Prior"};
  const bool isOfChains =
      head.columns.size() > kFirstDimension && std::equal(std::begin(kNames), std::end(kNames), head.columns.begin());
  if (!isOfChains) return std::nullopt;
  return head;
}

std::optional<ChainStates> readStates(std::string_view text) {
  std::size_t at = 0;
  const auto head = readHead(text, at);
  if (!head) return std::nullopt;
  ChainStates states;
  states.names.assign(head->columns.begin() + kFirstDimension, head->columns.end());
  states.columns.resize(head->columns.size());
  states.isUnfinished = std::ranges::any_of(
      head->headLines, [](const std::string& line) { return line.find("Unfinished run") != std::string::npos; });
  std::vector<double> row(head->columns.size());
  std::size_t rows = 0;
  while (at < text.size() && !states.isCutOff) {
    const std::size_t end = text.find('\n', at);
    const std::vector<std::string_view> cells =
        splitAt(text.substr(at, end == std::string_view::npos ? end : end - at), '\t');
    states.isCutOff = end == std::string_view::npos || cells.size() != row.size();
    if (states.isCutOff) break;
    for (std::size_t k = 0; k < row.size(); ++k) row[k] = realCell(cells[k]).value_or(kNaN);
    // Chain after chain, generation after generation.
    if (row[kGeneration] == 1.0) states.chainCount = rows + 1;
    states.isCutOff = states.chainCount == 0;
    if (states.isCutOff) break;
    const std::size_t generation = rows / states.chainCount + 1;
    const std::size_t chain = rows % states.chainCount + 1;
    states.isCutOff = row[kChain] != static_cast<double>(chain) || row[kGeneration] != static_cast<double>(generation);
    if (states.isCutOff) break;
    for (std::size_t k = 0; k < row.size(); ++k) states.columns[k].push_back(row[k]);
    ++rows;
    at = end + 1;
  }
  if (rows == 0 || states.chainCount == 0) return std::nullopt;
  states.generationCount = rows / states.chainCount;
  states.isCutOff = states.isCutOff || rows % states.chainCount != 0;
  return states;
}

void takeAcceptance(const ChainStates& states, ReportedPosterior& posterior) {
  std::size_t accepted = 0;
  for (std::size_t c = 0; c < states.chainCount; ++c) {
    std::size_t ofChain = 0;
    for (std::size_t g = posterior.burnIn; g < states.generationCount; ++g) {
      if (states.column(kAccepted)[g * states.chainCount + c] == 1.0) ++ofChain;
    }
    const std::size_t proposals = states.generationCount - posterior.burnIn;
    posterior.chainAcceptance.push_back(proposals > 0 ? static_cast<double>(ofChain) / static_cast<double>(proposals)
                                                      : kNaN);
    accepted += ofChain;
  }
  const std::size_t proposals = (states.generationCount - posterior.burnIn) * states.chainCount;
  posterior.acceptance = proposals > 0 ? static_cast<double>(accepted) / static_cast<double>(proposals) : kNaN;
}

/// How much larger the mean log-likelihood of the last third of the generations behind burn-in is than that of the
/// first; NaN where there are too few, or where one is not finite.
double riseOf(const ChainStates& states, const ReportedPosterior& posterior) {
  const std::size_t third = (states.generationCount - posterior.burnIn) / 3;
  const auto meanFrom = [&](std::size_t generation) {
    const auto first =
        states.column(kLogLikelihood).begin() + static_cast<std::ptrdiff_t>(generation * states.chainCount);
    const std::size_t count = third * states.chainCount;
    return std::accumulate(first, first + static_cast<std::ptrdiff_t>(count), 0.0) / static_cast<double>(count);
  };
  const double rise = third == 0 ? kNaN : meanFrom(states.generationCount - third) - meanFrom(posterior.burnIn);
  return std::isfinite(rise) ? rise : kNaN;
}

/// Traces, draws and acceptance.
void takeStates(const ChainStates& states, ReportedPosterior& posterior) {
  posterior.chainCount = states.chainCount;
  posterior.generationCount = states.generationCount;
  while (posterior.burnIn < states.generationCount &&
         states.column(kBurnIn)[posterior.burnIn * states.chainCount] == 1.0) {
    ++posterior.burnIn;
  }
  const std::vector<double>& likelihoods = states.column(kLogLikelihood);
  const auto isPossible = [&](std::size_t i) { return likelihoods[i] > -std::numeric_limits<double>::infinity(); };
  std::vector<std::size_t> counted;  // states of the posterior
  for (std::size_t i = 0; i < states.generationCount * states.chainCount; ++i) {
    if (!isPossible(i)) continue;
    posterior.hasLikelihood = true;
    if (i >= posterior.burnIn * states.chainCount) counted.push_back(i);
  }
  posterior.stateCount = counted.size();
  takeAcceptance(states, posterior);
  posterior.rise = riseOf(states, posterior);
  if (!posterior.hasLikelihood) return;  // chains that have never moved
  const std::size_t chains = std::min(states.chainCount, kMostChains);
  const std::size_t most =
      std::clamp(kMostTraced / (chains * (posterior.dimensions.size() + 1)), kFewestGenerations, kMostGenerations);
  const std::size_t step = std::max<std::size_t>(1, (states.generationCount + most - 1) / most);
  std::vector<std::size_t> shown;
  for (std::size_t g = 0; g < states.generationCount; g += step) shown.push_back(g);
  if (!shown.empty() && shown.back() + 1 < states.generationCount) shown.push_back(states.generationCount - 1);
  for (const std::size_t g : shown) posterior.generations.push_back(static_cast<double>(g + 1));
  const auto tracesOf = [&](const std::vector<double>& values) {
    std::vector<std::vector<double>> traces(chains);
    for (std::size_t c = 0; c < chains; ++c) {
      for (const std::size_t g : shown) traces[c].push_back(values[g * states.chainCount + c]);
    }
    return traces;
  };
  posterior.logLikelihoods = tracesOf(states.column(kLogLikelihood));
  const std::size_t draws = std::min(posterior.stateCount, kMostDraws);
  for (std::size_t j = 0; j < posterior.dimensions.size(); ++j) {
    const std::vector<double>& values = states.column(kFirstDimension + j);
    posterior.dimensions[j].traces = tracesOf(values);
    for (std::size_t k = 0; k < draws; ++k) {
      posterior.dimensions[j].draws.push_back(values[counted[k * counted.size() / draws]]);
    }
  }
}

/// Whether the rows are those of the dimensions.
bool takeSummary(const NamedTable& summary, ReportedPosterior& posterior) {
  if (summary.table.rows.size() != posterior.dimensions.size()) return false;
  for (std::size_t j = 0; j < posterior.dimensions.size(); ++j) {
    ReportedDimension& own = posterior.dimensions[j];
    own.name = summary.text(j, "Name");
    own.isOfErrors = summary.text(j, "Kind") == "error";
    own.mean = summary.number(j, "Mean");
    own.standardDeviation = summary.number(j, "Standard deviation");
    for (const double p : kSummaryProbabilities) {
      own.quantiles.push_back(summary.number(j, fmt::format("{:g} %", 100.0 * p)));
      own.priorQuantiles.push_back(summary.number(j, fmt::format("Prior {:g} %", 100.0 * p)));
    }
    own.mostProbable = summary.number(j, "Most probable");
    own.rHat = summary.number(j, "R-hat");
    own.effectiveSize = summary.number(j, "Effective size");
    own.narrowing = narrowingOf(own.quantiles, own.priorQuantiles);
  }
  return true;
}

std::map<std::string, std::size_t> placesByName(const ReportedPosterior& posterior) {
  std::map<std::string, std::size_t> places;
  for (std::size_t j = 0; j < posterior.dimensions.size(); ++j) places.emplace(posterior.dimensions[j].name, j);
  return places;
}

void takeMarginals(const NamedTable& bins, ReportedPosterior& posterior) {
  const std::map<std::string, std::size_t> places = placesByName(posterior);
  for (std::size_t i = 0; i < bins.table.rows.size(); ++i) {
    const auto found = places.find(bins.text(i, "Name"));
    if (found == places.end()) continue;
    ReportedDimension& own = posterior.dimensions[found->second];
    if (own.edges.empty()) own.edges.push_back(bins.number(i, "From"));
    own.edges.push_back(bins.number(i, "To"));
    own.posterior.push_back(bins.number(i, "Posterior"));
    own.prior.push_back(bins.number(i, "Prior"));
  }
  for (ReportedDimension& own : posterior.dimensions) {
    const bool isRising = std::ranges::is_sorted(own.edges, std::less_equal<>());
    if (!isRising || !std::ranges::all_of(own.edges, [](double edge) { return std::isfinite(edge); })) {
      own.edges.clear();
      own.posterior.clear();
      own.prior.clear();
      continue;
    }
    if (own.edges.size() < 3 || own.edges.front() <= 0.0) continue;
    const double first = own.edges[1] / own.edges[0];
    const double last = own.edges.back() / own.edges[own.edges.size() - 2];
    own.isLogarithmic = std::abs(first / last - 1.0) < 1e-6;
  }
}

void takeChecks(const NamedTable& checks, ReportedPosterior& posterior) {
  const std::map<std::string, std::size_t> places = placesByName(posterior);
  for (std::size_t i = 0; i < checks.table.rows.size(); ++i) {
    const auto found = places.find(checks.text(i, "Name"));
    if (found == places.end()) continue;
    const double runs = checks.number(i, "Evaluations");
    if (posterior.checkedRuns.empty() || runs > posterior.checkedRuns.back()) posterior.checkedRuns.push_back(runs);
    ReportedDimension& own = posterior.dimensions[found->second];
    own.rHats.resize(posterior.checkedRuns.size(), kNaN);
    own.effectiveSizes.resize(posterior.checkedRuns.size(), kNaN);
    own.rHats.back() = checks.number(i, "R-hat");
    own.effectiveSizes.back() = checks.number(i, "Effective size");
  }
}

/// False if it is not a matrix of the dimensions.
/// The rows of a table of pairs, which there is instead of a large matrix.
bool takePairs(const NamedTable& pairs, ReportedPosterior& posterior) {
  std::unordered_map<std::string, std::size_t> places;
  for (const ReportedDimension& one : posterior.dimensions) places.emplace(one.name, places.size());
  for (const std::vector<std::string>& cells : pairs.table.rows) {
    const auto first = places.find(cells[0]);
    const auto second = places.find(cells[1]);
    if (first == places.end() || second == places.end()) return false;
    posterior.largestCorrelations.push_back({first->second, second->second, realCell(cells[2]).value_or(kNaN)});
  }
  return true;
}

bool takeCorrelations(const NamedTable& correlation, ReportedPosterior& posterior) {
  if (correlation.table.columns == std::vector<std::string>{"First", "Second", "Correlation"}) {
    return takePairs(correlation, posterior);
  }
  std::vector<std::vector<double>> matrix;
  for (const std::vector<std::string>& cells : correlation.table.rows) {
    std::vector<double> row;
    for (std::size_t k = 1; k < cells.size(); ++k) row.push_back(realCell(cells[k]).value_or(kNaN));
    if (row.size() != posterior.dimensions.size()) return false;
    matrix.push_back(std::move(row));
  }
  if (matrix.size() != posterior.dimensions.size()) return false;
  posterior.correlations = std::move(matrix);
  posterior.largestCorrelations = largestPairs(posterior.correlations);
  return true;
}

std::vector<DimensionFigures> figuresOf(const ReportedPosterior& posterior) {
  std::vector<DimensionFigures> figures;
  for (const ReportedDimension& own : posterior.dimensions) {
    figures.push_back({own.name, own.rHat, own.effectiveSize, own.narrowing});
  }
  return figures;
}

/// What to do, where there is something to do.
std::vector<std::string> adviceOf(const ReportedPosterior& posterior, Convergence state) {
  std::vector<std::string> advice;
  if (posterior.isUnfinished) {
    advice.emplace_back("The run was interrupted. Restart = 1 lets the chains go on from here");
  }
  if (!posterior.hasLikelihood) return advice;
  // The log-likelihood of d dimensions has about the standard deviation sqrt(d / 2) over its posterior.
  const bool isRising = posterior.rise > static_cast<double>(std::max<std::size_t>(posterior.dimensions.size(), 4));
  if (isRising) {
    advice.push_back(fmt::format(
        "The log-likelihood still rises behind burn-in, by {:.4g} from the first to the last third of the generations: "
        "the chains have not arrived yet",
        posterior.rise));
  }
  if (const auto few = acceptanceWords(posterior.acceptance)) advice.push_back(*few);
  if (!posterior.hasPosterior || state == Convergence::reached) return advice;
  // On the way to the posterior, correlations are those of the way.
  if (!isRising) {
    for (std::string& line : adviceWords(figuresOf(posterior), posterior.limits, posterior.correlations)) {
      advice.push_back(std::move(line));
    }
  }
  if (!posterior.isUnfinished) {
    advice.emplace_back(
        "Bounds or priors that are narrower around good sets, and a likelihood that fits the errors, shorten the way; "
        "a run with other ones begins anew");
  }
  return advice;
}

}  // namespace

std::optional<ReportedPosterior> reportedPosterior(const std::string& filePrefix, const DreamSettings& settings,
                                                   std::size_t parameterCount, std::vector<std::string>& faults) {
  const std::string path = runFilePath(filePrefix, run_files::kChains);
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text) {
    faults.push_back(fmt::format("The chains are not shown: {}: {}", fileNameOf(path), reason));
    return std::nullopt;
  }
  const auto states = readStates(*text);
  if (!states) {
    faults.push_back(fmt::format("The chains are not shown: {} is damaged", fileNameOf(path)));
    return std::nullopt;
  }
  if (states->isCutOff) {
    faults.push_back(fmt::format("{} is cut off or damaged: {} of the chains are shown", fileNameOf(path),
                                 countText(states->generationCount, "generation")));
  }
  ReportedPosterior posterior;
  posterior.limits = {settings.rHatLimit, settings.effectiveSize};
  posterior.isUnfinished = states->isUnfinished;
  for (const std::string& name : states->names) {
    ReportedDimension& own = posterior.dimensions.emplace_back();
    own.name = name;
    own.isOfErrors = posterior.dimensions.size() > parameterCount;
    own.mean = own.standardDeviation = own.mostProbable = own.rHat = own.effectiveSize = own.narrowing = kNaN;
  }
  takeStates(*states, posterior);
  constexpr std::size_t kLeastGenerations = 4;  // behind burn-in, for a posterior
  if (!posterior.hasLikelihood || posterior.generationCount < posterior.burnIn + kLeastGenerations) return posterior;
  const auto damaged = [&](const std::string& file) {
    faults.push_back(fmt::format("{} and {} do not fit together", file, fileNameOf(path)));
  };
  if (const auto summary = readNamed(filePrefix, run_files::kPosterior,
                                     {"Name", "Kind", "Mean", "5 %", "R-hat", "Effective size"}, faults)) {
    posterior.hasPosterior = takeSummary(*summary, posterior);
    if (!posterior.hasPosterior) damaged(summary->file);
  }
  const std::initializer_list<std::string_view> bins = {"Name", "From", "To", "Posterior", "Prior"};
  if (const auto table = readNamed(filePrefix, run_files::kMarginals, bins, faults)) takeMarginals(*table, posterior);
  const std::initializer_list<std::string_view> checks = {"Evaluations", "Name", "R-hat", "Effective size"};
  if (const auto table = readNamed(filePrefix, run_files::kConvergence, checks, faults)) takeChecks(*table, posterior);
  if (const auto table = readNamed(filePrefix, run_files::kSampleCorrelation, {}, faults)) {
    if (!takeCorrelations(*table, posterior)) damaged(table->file);
  }
  return posterior;
}

void writePosterior(JsonWriter& json, const ReportedPosterior& posterior) {
  using Digits = JsonWriter::Digits;
  const std::vector<DimensionFigures> figures = figuresOf(posterior);
  const ConvergenceWords words = convergenceWords(figures, posterior.limits);
  std::vector<std::string> names;
  names.reserve(figures.size());
  for (const DimensionFigures& one : figures) names.push_back(one.name);
  static constexpr const char* kStates[] = {"reached", "fewDraws", "apart"};
  json.key("posterior").beginObject();
  if (posterior.hasPosterior) {
    json.member("state", kStates[static_cast<std::size_t>(words.state)]).member("findings", words.findings);
    if (words.state != Convergence::apart) {
      json.member("tradeOffs", tradeOffWords(names, posterior.largestCorrelations));
    }
  }
  if (!posterior.hasLikelihood) {
    const std::string text = "There is no posterior: no model run has a likelihood. The log says why, and what helps";
    json.member("findings", std::vector{text});
  }
  json.member("advice", adviceOf(posterior, words.state));
  json.member("rHatLimit", posterior.limits.rHat).member("effectiveLimit", posterior.limits.effectiveSize);
  json.member("chains", posterior.chainCount).member("generationCount", posterior.generationCount);
  json.member("burnIn", posterior.burnIn).member("states", posterior.stateCount);
  json.member("acceptance", posterior.acceptance);
  json.key("chainAcceptance").numbers(posterior.chainAcceptance, Digits::drawn);
  json.key("dimensions").beginArray();
  for (std::size_t j = 0; j < figures.size(); ++j) {
    const ReportedDimension& own = posterior.dimensions[j];
    json.beginObject().member("name", own.name).member("isOfErrors", own.isOfErrors).member("mean", own.mean);
    json.member("standardDeviation", own.standardDeviation).member("mostProbable", own.mostProbable);
    json.member("rHat", own.rHat).member("effectiveSize", own.effectiveSize).member("narrowing", own.narrowing);
    json.member("isHardlyNarrower", isHardlyNarrower(figures[j])).member("logarithmic", own.isLogarithmic);
    json.key("quantiles").numbers(own.quantiles, Digits::table);
    json.key("priorQuantiles").numbers(own.priorQuantiles, Digits::table);
    json.key("edges").numbers(own.edges, Digits::drawn).key("posterior").numbers(own.posterior, Digits::drawn);
    json.key("prior").numbers(own.prior, Digits::drawn).key("rHats").numbers(own.rHats, Digits::drawn);
    json.key("effectiveSizes").numbers(own.effectiveSizes, Digits::drawn);
    json.key("traces").rows(own.traces, Digits::drawn).key("draws").numbers(own.draws, Digits::drawn).endObject();
  }
  json.endArray().key("generations").numbers(posterior.generations, Digits::drawn);
  json.key("logLikelihoods").rows(posterior.logLikelihoods, Digits::drawn);
  json.key("checkedRuns").numbers(posterior.checkedRuns, Digits::drawn);
  json.key("correlations").rows(posterior.correlations, Digits::drawn);
  json.endObject();
}

}  // namespace mirevo
