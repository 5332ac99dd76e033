#include "algorithms/analyses/sobol_report.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <numeric>

#include <fmt/format.h>

#include "algorithms/analyses/sample_sensitivity.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/run_files.h"
#include "common/short_list.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostShownFactors = 20;
constexpr std::size_t kMostNames = 10;
/// Limits farther than this from an index leave open which factor matters more.
constexpr double kWideHalfWidth = 0.1;
constexpr double kMostFurther = 100.0;  // times the blocks: more are not worth naming
constexpr double kTail = 0.05;

std::string share(double value) {
  return std::abs(value) < 1000.0 ? fmt::format("{:.3f}", value == 0.0 ? 0.0 : value) : fmt::format("{:.3g}", value);
}

std::string limitsText(const SobolIndex& index) {
  return fmt::format("{} to {}", share(index.lower), share(index.upper));
}

/// The positions of the indices, the largest first, NaN last.
std::vector<std::size_t> descending(std::span<const SobolIndex> indices) {
  std::vector<std::size_t> order(indices.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  const auto key = [&](std::size_t i) {
    return std::isnan(indices[i].value) ? -std::numeric_limits<double>::infinity() : indices[i].value;
  };
  std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) { return key(a) > key(b); });
  return order;
}

/// "a (0.1 to 0.2), b (0.01 to 0.3) and 3 more"
std::string namesWithLimits(std::span<const std::string> names, std::span<const SobolIndex> indices,
                            std::span<const std::size_t> chosen) {
  ShortList list(kMostNames);
  for (const std::size_t i : chosen) {
    const SobolIndex& index = indices[i];
    const bool isInert = index.value == 0.0 && index.lower == 0.0 && index.upper == 0.0;
    list.add(fmt::format("{} ({})", names[i], isInert ? "no effect in any block" : limitsText(index)));
  }
  return list.text();
}

std::vector<std::string> factorNames(const SobolFindings& findings) {
  std::vector<std::string> names;
  for (const SobolFactor& factor : findings.factors) names.push_back(factor.name);
  return names;
}

std::vector<std::string> pairNames(const SobolFindings& findings) {
  std::vector<std::string> names;
  for (const auto& [j, l] : findings.design.pairs()) {
    names.push_back(fmt::format("{} and {}", findings.factors[j].name, findings.factors[l].name));
  }
  return names;
}

/// Whether the values vary, and not by so much or so little that the squares of differences leave the range of numbers.
bool hasVariance(const SobolIndices& indices) {
  return std::isfinite(indices.variance) && indices.variance > 0.0 && std::isfinite(indices.mean);
}

/// Empty where there are indices.
std::string whyNoIndices(const SobolIndices& indices) {
  if (indices.valueCount < 2) return "no indices, too few runs succeeded";
  if (indices.isConstant) return "no parameter has an influence, all runs have the same value";
  if (hasVariance(indices)) return "";
  return fmt::format("no indices, {}", kNoFiniteVariance);
}

/// "2 of the 64 blocks make more than 90 % of the variance, and other points may give other indices"
std::string dominanceText(const SobolFindings& findings, const SobolIndices& indices) {
  const std::size_t count = indices.dominatingBlocks;
  return fmt::format(
      "{} of the {} blocks make{} more than 90 % of the variance, and other points may give other indices", count,
      findings.design.rows, count == 1 ? "s" : "");
}

/// Why an index of an output, or its limits, are not known; empty if they are.
std::string problemOf(const SobolFindings& findings, const SobolIndices& indices, const SobolIndex& index) {
  if (std::string none = whyNoIndices(indices); !none.empty()) return none;
  if (std::isnan(index.value)) {
    return index.blocks == 0 ? "no block of the design has all runs that the index needs"
                             : "its estimate is not a finite number";
  }
  if (!std::isnan(index.lower)) return "";
  if (indices.dominatingBlocks > 0) return "no limits, " + dominanceText(findings, indices);
  return "no limits, too few blocks of the design have all runs that the index needs";
}

bool isShown(const SobolFindings& findings, const SobolOutput& output) {
  const auto isObjective = [](const SobolOutput& one) { return one.kind == "objective"; };
  return isObjective(output) || std::ranges::none_of(findings.outputs, isObjective);
}

std::string kindText(const SobolOutput& output) {
  return output.kind == "objective" ? "Objective function" : "Output measure";
}

void appendTable(const SobolFindings& findings, const SobolOutput& output, std::vector<std::string>& lines) {
  const SobolIndices& indices = output.indices;
  static const std::vector<std::string> kHeadings{"First-order", "lower", "upper", "Total", "lower", "upper"};
  std::vector<std::string> names;
  std::vector<std::vector<double>> rows;
  const auto add = [&](const std::string& name, const SobolIndex& first, const SobolIndex& total) {
    names.push_back(name);
    rows.push_back({first.value, first.lower, first.upper, total.value, total.lower, total.upper});
  };
  std::vector<std::size_t> order = descending(indices.total);
  const std::size_t left = order.size() - std::min(order.size(), kMostShownFactors);
  order.resize(order.size() - left);
  for (const std::size_t j : order) add(findings.factors[j].name, indices.first[j], indices.total[j]);
  add("Sum", indices.sumOfFirst, indices.sumOfTotal);
  for (std::string& line : formatTable("Share of the variance", kHeadings, names, rows)) {
    lines.push_back(std::move(line));
  }
  if (left > 0) lines.push_back(fmt::format("   {} more have smaller total indices", left));
}

/// The factors that meet a condition, those with the largest total index first.
template <class Condition>
std::vector<std::size_t> factorsWhere(const SobolIndices& indices, Condition isMet) {
  std::vector<std::size_t> chosen = descending(indices.total);
  std::erase_if(chosen, [&](std::size_t j) { return !isMet(j); });
  return chosen;
}

void appendFixable(const SobolFindings& findings, const SobolOutput& output, std::vector<std::string>& lines) {
  const SobolIndices& indices = output.indices;
  const double limit = findings.negligibleIndex;
  const auto fixable = factorsWhere(indices, [&](std::size_t j) { return indices.total[j].upper < limit; });
  const std::vector<std::string> names = factorNames(findings);
  if (fixable.empty()) {
    lines.push_back(
        fmt::format("   No parameter can be fixed: none has a total index that is below {:g} for certain", limit));
  } else {
    double most = 0.0;
    std::size_t fewest = std::numeric_limits<std::size_t>::max();
    for (const std::size_t j : fixable) {
      most += indices.total[j].upper;
      fewest = std::min(fewest, indices.total[j].blocks);
    }
    lines.push_back(fmt::format("   Can be fixed, as the upper limit of the total index is below {:g}: {}", limit,
                                namesWithLimits(names, indices.total, fixable)));
    if (fixable.size() > 1) {
      lines.push_back(
          fmt::format("   All of these fixed together cost about {} of the variance at most, the sum of these limits",
                      share(most)));
    }
    lines.push_back(
        fmt::format("   What acts in less than {:.2g} % of the space may have gone unseen in {} blocks (95 %)",
                    100.0 * (1.0 - std::pow(kTail, 1.0 / static_cast<double>(fewest))), fewest));
  }
  const auto open = factorsWhere(
      indices, [&](std::size_t j) { return indices.total[j].upper >= limit && indices.total[j].lower < limit; });
  if (!open.empty()) {
    lines.push_back(fmt::format("   Undecided, as the limits of the total index include {:g}: {}", limit,
                                namesWithLimits(names, indices.total, open)));
  }
  const auto unknown = factorsWhere(indices, [&](std::size_t j) { return std::isnan(indices.total[j].upper); });
  if (!unknown.empty()) {
    ShortList list(kMostNames);
    for (const std::size_t j : unknown) list.add(names[j]);
    lines.push_back(fmt::format("   Not known, as too few blocks have results for limits: {}", list.text()));
  }
}

void appendInteractions(const SobolFindings& findings, const SobolOutput& output, std::vector<std::string>& lines) {
  const SobolIndices& indices = output.indices;
  if (findings.factors.size() < 2) return;
  if (!std::isnan(indices.sumOfFirst.value)) {
    lines.push_back(fmt::format(
        "   By themselves the parameters explain {} ({}) of the variance; interactions explain what is missing to 1",
        share(indices.sumOfFirst.value), limitsText(indices.sumOfFirst)));
  }
  const auto interacting = factorsWhere(indices, [&](std::size_t j) {
    return indices.interactions[j].lower > 0.0 && indices.interactions[j].value >= findings.negligibleIndex;
  });
  if (!interacting.empty()) {
    lines.push_back(fmt::format("   Interact with others, with shares of the variance of: {}",
                                namesWithLimits(factorNames(findings), indices.interactions, interacting)));
  }
  std::vector<std::size_t> pairs = descending(indices.second);
  std::erase_if(pairs, [&](std::size_t m) { return !(indices.second[m].lower > 0.0); });
  if (!pairs.empty()) {
    lines.push_back(fmt::format("   Interactions of two that are above 0 for certain: {}",
                                namesWithLimits(pairNames(findings), indices.second, pairs)));
  } else if (!indices.second.empty()) {
    lines.emplace_back("   No interaction of two is above 0 for certain");
  }
}

/// What negative estimates mean.
void appendNegative(const SobolFindings& findings, const SobolOutput& output, std::vector<std::string>& lines) {
  const std::vector<SobolIndex>& first = output.indices.first;
  std::vector<std::size_t> negative;
  for (const std::size_t j : descending(first)) {
    if (first[j].value < 0.0) negative.push_back(j);
  }
  if (negative.empty()) return;
  std::ranges::reverse(negative);
  lines.push_back(fmt::format(
      "   First-order indices estimated below 0: {}. An index cannot be negative: this is the noise of the estimate, "
      "and where the limits hold 0 no effect of the parameter by itself was found",
      namesWithLimits(factorNames(findings), first, negative)));
  const auto surely = std::ranges::count_if(negative, [&](std::size_t j) { return first[j].upper < 0.0; });
  if (surely > 0) {
    lines.push_back(fmt::format("   {} of them {} even the upper limit below 0, as one in forty may by chance", surely,
                                surely == 1 ? "has" : "have"));
  }
}

void appendConvergence(const SobolOutput& output, std::vector<std::string>& lines) {
  if (output.stages.size() < 2) return;
  const SobolStage& half = output.stages[output.stages.size() - 2];
  double largest = 0.0;
  for (std::size_t j = 0; j < half.total.size(); ++j) {
    const double difference = std::abs(half.total[j].value - output.indices.total[j].value);
    if (std::isfinite(difference)) largest = std::max(largest, difference);
  }
  lines.push_back(
      fmt::format("   The first {} of the {} blocks give total indices that differ from these by at most {}", half.rows,
                  output.stages.back().rows, share(largest)));
}

/// The largest distance of a limit from its index, NaN if there is none.
double widest(const SobolIndices& indices) {
  double most = std::numeric_limits<double>::quiet_NaN();
  for (const std::vector<SobolIndex>* of : {&indices.first, &indices.total}) {
    for (const SobolIndex& index : *of) most = std::fmax(most, 0.5 * (index.upper - index.lower));
  }
  return most;
}

}  // namespace

std::string singleFactorText(std::span<const SobolFactor> factors) {
  if (factors.size() != 1) return {};
  const SobolFactor& only = factors.front();
  return fmt::format(
      "{} is the only {}: its first-order and its total index are 1 by definition, as all variance comes from it. What "
      "the run estimates besides is the error of the design; indices compare two or more parameters or groups",
      only.name, only.parameters.size() > 1 ? "group, and has all parameters" : "parameter that varies");
}

SobolOutput sobolOutput(const SobolDesign& design, std::span<const double> values, const ReplicateBootstrap& bootstrap,
                        std::string kind, std::string name) {
  SobolOutput output{std::move(kind), std::move(name), sobolIndices(design, values, bootstrap, bootstrap.size()), {}};
  for (const std::size_t part : {std::size_t{8}, std::size_t{4}, std::size_t{2}}) {
    SobolDesign stage = design;
    stage.rows = design.rows / part;
    if (stage.rows < 2 * kSobolReplicates) continue;
    SobolIndices found = sobolIndices(stage, values.first(stage.setCount()), bootstrap, bootstrap.size(), false);
    output.stages.push_back({stage.rows, std::move(found.first), std::move(found.total)});
  }
  output.stages.push_back({design.rows, output.indices.first, output.indices.total});
  return output;
}

std::vector<DataTable> sobolTables(const SobolFindings& findings) {
  DataTable all;
  all.file = run_files::kSobol;
  all.headLines = {
      "Sobol' indices, shares of the variance of an output, with limits of 95 % and the blocks of the design used"};
  for (const SobolFactor& factor : findings.factors) {
    if (factor.parameters.size() == 1 && findings.parameters[factor.parameters.front()] == factor.name) continue;
    std::string members;
    for (const std::size_t j : factor.parameters) members += (members.empty() ? "" : ", ") + findings.parameters[j];
    all.headLines.push_back(fmt::format("Group {}: {}", factor.name, members));
  }
  all.columns = {"Kind",  "Output", "Parameter", "With",     "Order",  "Index",
                 "Lower", "Upper",  "Blocks",    "Variance", "Problem"};
  DataTable stages;
  stages.file = run_files::kSobolConvergence;
  stages.headLines = {"Sobol' indices from the first blocks of the design, with limits of 95 %"};
  stages.columns = {"Kind", "Output", "Parameter", "Order", "Rows", "Index", "Lower", "Upper"};
  const std::vector<SobolFactor>& factors = findings.factors;
  for (const SobolOutput& output : findings.outputs) {
    const SobolIndices& indices = output.indices;
    const auto add = [&](const std::string& parameter, const std::string& with, const char* order,
                         const SobolIndex& index) {
      all.rows.push_back({output.kind, output.name, parameter, with, std::string(order), index.value, index.lower,
                          index.upper, static_cast<std::int64_t>(index.blocks), indices.variance,
                          problemOf(findings, indices, index)});
    };
    for (std::size_t j = 0; j < factors.size(); ++j) {
      add(factors[j].name, "", "first", indices.first[j]);
      add(factors[j].name, "", "total", indices.total[j]);
      add(factors[j].name, "", "interactions", indices.interactions[j]);
    }
    add("", "", "sum of first", indices.sumOfFirst);
    add("", "", "sum of total", indices.sumOfTotal);
    const auto pairs = findings.design.pairs();
    for (std::size_t m = 0; m < pairs.size(); ++m) {
      add(factors[pairs[m].first].name, factors[pairs[m].second].name, "second", indices.second[m]);
    }
    for (const SobolStage& stage : output.stages) {
      for (std::size_t j = 0; j < factors.size(); ++j) {
        for (const bool isTotal : {false, true}) {
          const SobolIndex& index = isTotal ? stage.total[j] : stage.first[j];
          stages.rows.push_back({output.kind, output.name, factors[j].name, std::string(isTotal ? "total" : "first"),
                                 static_cast<std::int64_t>(stage.rows), index.value, index.lower, index.upper});
        }
      }
    }
  }
  return {std::move(all), std::move(stages)};
}

std::vector<std::string> formatSobol(const SobolFindings& findings, std::string_view tableFile) {
  std::vector<std::string> lines{
      fmt::format("Sobol' sensitivity analysis: {} blocks of {} model runs for {}, {} of {} evaluations failed",
                  findings.design.rows, findings.design.setsPerRow(), factorCountText(findings.factors),
                  findings.failedCount, findings.runCount)};
  if (findings.failedCount > 0) {
    lines.emplace_back(
        "   A failed run is left out of the estimates that need it, whose limits are the wider, and of no other");
  }
  if (const std::string single = singleFactorText(findings.factors); !single.empty()) lines.push_back("   " + single);
  for (const SobolOutput& output : findings.outputs) {
    if (!isShown(findings, output)) continue;
    const SobolIndices& indices = output.indices;
    lines.emplace_back();
    if (const std::string none = whyNoIndices(indices); !none.empty()) {
      lines.push_back(fmt::format("{} {}: {}", kindText(output), output.name, none));
      continue;
    }
    lines.push_back(fmt::format("{} {}: mean {:.6g}, standard deviation {:.6g}; indices with limits of 95 %",
                                kindText(output), output.name, indices.mean, std::sqrt(indices.variance)));
    appendTable(findings, output, lines);
    if (indices.dominatingBlocks > 0) {
      lines.push_back(fmt::format("   Which parameters can be fixed is not said, and there are no limits: {}",
                                  dominanceText(findings, indices)));
      continue;
    }
    if (findings.factors.size() == 1) continue;
    appendFixable(findings, output, lines);
    appendInteractions(findings, output, lines);
    appendNegative(findings, output, lines);
    appendConvergence(output, lines);
  }
  lines.emplace_back();
  lines.push_back(fmt::format("   The indices of all output measures and objective functions are in {}", tableFile));
  return lines;
}

std::vector<std::string> sobolWarnings(const SobolFindings& findings) {
  std::vector<std::string> warnings;
  for (const SobolOutput& output : findings.outputs) {
    const SobolIndices& indices = output.indices;
    if (indices.valueCount < 2 || indices.isConstant || hasVariance(indices)) continue;
    warnings.push_back(fmt::format("{} {}: {}. A run that yields such values should fail, or have bounds that avoid it",
                                   kindText(output), output.name, whyNoIndices(indices)));
  }
  for (const SobolOutput& output : findings.outputs) {
    if (!isShown(findings, output) || output.indices.dominatingBlocks == 0) continue;
    warnings.push_back(fmt::format(
        "{} {}: {}. The farthest value is that of evaluation No. {}: see whether it is what the model should yield; if "
        "so, take more blocks, or an output that grows less, such as a logarithm",
        kindText(output), output.name, dominanceText(findings, output.indices), output.indices.farthestSet + 1));
  }
  double most = 0.0;
  std::string name;
  for (const SobolOutput& output : findings.outputs) {
    const double width = widest(output.indices);
    if (!isShown(findings, output) || !(width > most)) continue;
    most = width;
    name = output.name;
  }
  if (most > kWideHalfWidth && findings.factors.size() > 1) {
    // The limits narrow with the root of the sample at least.
    const double factor = std::pow(most / kWideHalfWidth, 2);
    const std::string remedy =
        factor <= kMostFurther
            ? fmt::format("Sample_Size = {} would bring them to about {:g}",
                          std::bit_ceil(static_cast<std::uint64_t>(
                              std::ceil(static_cast<double>(findings.design.rows) * factor))),
                          kWideHalfWidth)
            : fmt::format("No Sample_Size worth running would bring them to {:g}: a few runs make most of the variance",
                          kWideHalfWidth);
    warnings.push_back(fmt::format(
        "The design is too small to tell which parameter matters more: limits of the indices of {} are {} away from "
        "them. {}",
        name, share(most), remedy));
  }
  const double failed =
      static_cast<double>(findings.failedCount) / static_cast<double>(std::max<std::size_t>(findings.runCount, 1));
  if (failed > 0.05) {
    warnings.push_back(fmt::format(
        "{:.0f} % of the model runs failed. Failures at random widen the limits alone, but if they come with certain "
        "parameter values, the indices are those of the rest of the ranges: the failures may tell which, and narrower "
        "ranges avoid them",
        100.0 * failed));
  }
  return warnings;
}

}  // namespace mirevo
