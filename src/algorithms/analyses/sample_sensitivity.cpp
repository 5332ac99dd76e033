#include "algorithms/analyses/sample_sensitivity.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <limits>
#include <map>
#include <numbers>
#include <numeric>
#include <random>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/short_list.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr std::size_t kHarmonics = 6;
constexpr std::size_t kMostClasses = kHarmonics + 1;
constexpr double kNormal95 = 1.959963984540054;

/// As large, to two digits.
double twoDigits(double value) {
  const double unit = std::pow(10.0, std::max(0.0, std::floor(std::log10(value)) - 1.0));
  return std::ceil(value / unit) * unit;
}

using Columns = std::vector<std::vector<double>>;

/// The values of a parameter in ascending order, and where equal ones end.
struct Order {
  std::vector<std::size_t> rows;
  std::vector<std::size_t> ends;  ///< of groups of equal values, in `rows`
};

Order orderOf(const std::vector<double>& values) {
  Order order;
  order.rows.resize(values.size());
  std::iota(order.rows.begin(), order.rows.end(), std::size_t{0});
  std::stable_sort(order.rows.begin(), order.rows.end(),
                   [&](std::size_t a, std::size_t b) { return values[a] < values[b]; });
  for (std::size_t k = 1; k <= values.size(); ++k) {
    if (k == values.size() || values[order.rows[k]] != values[order.rows[k - 1]]) order.ends.push_back(k);
  }
  return order;
}

/// The mean rank of equal values.
std::vector<double> ranksOf(const Order& order) {
  std::vector<double> ranks(order.rows.size());
  std::size_t begin = 0;
  for (const std::size_t end : order.ends) {
    for (std::size_t k = begin; k < end; ++k) ranks[order.rows[k]] = 0.5 * static_cast<double>(begin + end - 1);
    begin = end;
  }
  return ranks;
}

/// The values of outputs, centred, one row beside another, with how often each row counts.
class WeightedOutputs final {
 public:
  explicit WeightedOutputs(const Columns& columns)
      : columns_(columns), centred_(columns.size() * columns.front().size()), squares_(columns.size()) {
    weigh(std::vector<std::size_t>(rowCount(), 1));
  }

  std::size_t size() const { return columns_.size(); }
  std::size_t rowCount() const { return columns_.front().size(); }

  /// `weights` sum to the number of rows.
  void weigh(std::vector<std::size_t> weights) {
    weights_ = std::move(weights);
    const auto n = static_cast<double>(rowCount());
    for (std::size_t q = 0; q < size(); ++q) {
      double sum = 0.0;
      for (std::size_t i = 0; i < rowCount(); ++i) sum += static_cast<double>(weights_[i]) * columns_[q][i];
      squares_[q] = 0.0;
      for (std::size_t i = 0; i < rowCount(); ++i) {
        const double difference = columns_[q][i] - sum / n;
        centred_[i * size() + q] = difference;
        squares_[q] += static_cast<double>(weights_[i]) * difference * difference;
      }
    }
  }

  std::size_t weight(std::size_t row) const { return weights_[row]; }
  const double* centred(std::size_t row) const { return &centred_[row * size()]; }
  double sumOfSquares(std::size_t output) const { return squares_[output]; }

 private:
  const Columns& columns_;
  std::vector<double> centred_;
  std::vector<double> squares_;
  std::vector<std::size_t> weights_;
};

/// The sum of squares that `explained` is of it, without what as many freedoms explain of noise.
double withoutBias(double explained, double all, std::size_t n, std::size_t freedoms) {
  if (!(all > 0.0)) return kNaN;
  const double rest = 1.0 - explained / all;
  return 1.0 - rest * static_cast<double>(n - 1) / static_cast<double>(n - 1 - freedoms);
}

/// First-order indices of all outputs by one parameter.
class FirstOrder final {
 public:
  explicit FirstOrder(std::size_t rowCount) : cosines_(2 * rowCount + 1) {
    for (std::size_t k = 0; k < cosines_.size(); ++k) {
      cosines_[k] = std::cos(std::numbers::pi * static_cast<double>(k) / static_cast<double>(2 * rowCount));
    }
  }

  std::vector<double> of(const Order& order, const WeightedOutputs& outputs) const {
    return order.ends.size() <= kMostClasses ? byClasses(order, outputs) : byCosines(order, outputs);
  }

 private:
  static std::vector<double> byClasses(const Order& order, const WeightedOutputs& outputs) {
    std::vector<double> explained(outputs.size());
    std::vector<double> sums(outputs.size());
    std::size_t k = 0;
    std::size_t classes = 0;
    for (const std::size_t end : order.ends) {
      std::ranges::fill(sums, 0.0);
      double count = 0.0;
      for (; k < end; ++k) {
        const auto weight = static_cast<double>(outputs.weight(order.rows[k]));
        const double* centred = outputs.centred(order.rows[k]);
        count += weight;
        for (std::size_t q = 0; q < sums.size(); ++q) sums[q] += weight * centred[q];
      }
      if (count == 0.0) continue;
      ++classes;
      for (std::size_t q = 0; q < sums.size(); ++q) explained[q] += sums[q] * sums[q] / count;
    }
    return indices(explained, outputs, std::max<std::size_t>(classes, 1) - 1);
  }

  /// Equal values are at the middle of their places.
  std::vector<double> byCosines(const Order& order, const WeightedOutputs& outputs) const {
    const std::size_t count = outputs.size();
    std::vector<double> sums(kHarmonics * count);
    std::size_t k = 0;
    std::size_t before = 0;
    for (const std::size_t end : order.ends) {
      std::size_t weightOfGroup = 0;
      for (std::size_t i = k; i < end; ++i) weightOfGroup += outputs.weight(order.rows[i]);
      const double cosine = cosines_[2 * before + weightOfGroup];
      before += weightOfGroup;
      std::array<double, kHarmonics> harmonics{};
      double previous = 1.0;
      harmonics[0] = cosine;
      for (std::size_t h = 1; h < kHarmonics; ++h) {
        harmonics[h] = 2.0 * cosine * harmonics[h - 1] - previous;
        previous = harmonics[h - 1];
      }
      for (; k < end; ++k) {
        const auto weight = static_cast<double>(outputs.weight(order.rows[k]));
        if (weight == 0.0) continue;
        const double* centred = outputs.centred(order.rows[k]);
        for (std::size_t h = 0; h < kHarmonics; ++h) {
          for (std::size_t q = 0; q < count; ++q) sums[h * count + q] += weight * harmonics[h] * centred[q];
        }
      }
    }
    std::vector<double> explained(count);
    for (std::size_t h = 0; h < kHarmonics; ++h) {
      for (std::size_t q = 0; q < count; ++q) {
        explained[q] += 2.0 * sums[h * count + q] * sums[h * count + q] / static_cast<double>(outputs.rowCount());
      }
    }
    return indices(explained, outputs, kHarmonics);
  }

  static std::vector<double> indices(std::vector<double> explained, const WeightedOutputs& outputs,
                                     std::size_t freedoms) {
    for (std::size_t q = 0; q < explained.size(); ++q) {
      explained[q] = withoutBias(explained[q], outputs.sumOfSquares(q), outputs.rowCount(), freedoms);
    }
    return explained;
  }

  std::vector<double> cosines_;  ///< of pi k / 2n, the angles of places and of the middles between them
};

std::size_t bootstrapCount(std::size_t rows, std::size_t parameters, std::size_t outputs) {
  constexpr double kMost = 200.0;
  constexpr double kFewest = 20.0;
  constexpr double kOperations = 1.0e10;
  const double each = static_cast<double>(rows * parameters) * static_cast<double>(kHarmonics * (outputs + 1));
  return static_cast<std::size_t>(std::clamp(kOperations / each, kFewest, kMost));
}

/// Fills the indices of the outputs, p parameters each.
void addFirstOrder(const std::vector<Order>& orders, const Columns& outputs, std::int32_t seed,
                   std::span<OutputDependence*> found) {
  WeightedOutputs weighted(outputs);
  for (std::size_t q = 0; q < found.size(); ++q) {
    const double variance = weighted.sumOfSquares(q);
    found[q]->hasVariance = std::isfinite(variance) && variance > 0.0;
  }
  const std::size_t n = weighted.rowCount();
  const FirstOrder firstOrder(n);
  const auto isVaried = [&](std::size_t j) { return orders[j].ends.size() > 1; };
  for (std::size_t j = 0; j < orders.size(); ++j) {
    if (!isVaried(j)) continue;
    const std::vector<double> indices = firstOrder.of(orders[j], weighted);
    for (std::size_t q = 0; q < found.size(); ++q) found[q]->parameters[j].firstOrder = indices[q];
  }
  // The run's generator takes each of its 259,200 steps once before it repeats them: too even for bootstrap samples,
  // which are as large.
  std::mt19937_64 random(static_cast<std::uint64_t>(std::abs(std::int64_t{seed})));
  const std::size_t count = bootstrapCount(n, orders.size(), found.size());
  std::vector<double> sums(orders.size() * found.size());
  std::vector<double> squares(sums.size());
  for (std::size_t b = 0; b < count; ++b) {
    std::vector<std::size_t> weights(n);
    for (std::size_t k = 0; k < n; ++k) ++weights[random() % n];
    weighted.weigh(std::move(weights));
    for (std::size_t j = 0; j < orders.size(); ++j) {
      const std::vector<double> indices = firstOrder.of(orders[j], weighted);
      for (std::size_t q = 0; q < indices.size(); ++q) {
        sums[j * found.size() + q] += indices[q];
        squares[j * found.size() + q] += indices[q] * indices[q];
      }
    }
  }
  const auto replicates = static_cast<double>(count);
  for (std::size_t j = 0; j < orders.size(); ++j) {
    for (std::size_t q = 0; q < found.size(); ++q) {
      const double sum = sums[j * found.size() + q];
      const double variance = (squares[j * found.size() + q] - sum * sum / replicates) / (replicates - 1.0);
      const double margin = kNormal95 * std::sqrt(std::max(variance, 0.0));
      SampleDependence& one = found[q]->parameters[j];
      one.lower = one.firstOrder - margin;
      one.upper = one.firstOrder + margin;
      if (std::isnan(variance) || !isVaried(j)) one.lower = one.upper = kNaN;
    }
  }
}

/// Outputs that have values in the same rows.
void addDependences(const Columns& parameters, const std::vector<std::size_t>& rows, const Columns& outputs,
                    std::int32_t seed, std::span<OutputDependence*> found) {
  Columns outputRanks;
  outputRanks.reserve(outputs.size());
  for (std::size_t q = 0; q < outputs.size(); ++q) {
    const Order order = orderOf(outputs[q]);
    found[q]->isConstant = order.ends.size() == 1;
    outputRanks.push_back(ranksOf(order));
  }
  std::vector<Order> orders;
  for (std::size_t j = 0; j < parameters.size(); ++j) {
    std::vector<double> values;
    values.reserve(rows.size());
    for (const std::size_t row : rows) values.push_back(parameters[j][row]);
    const Order& order = orders.emplace_back(orderOf(values));
    const std::vector<double> ranks = ranksOf(order);
    for (std::size_t q = 0; q < found.size(); ++q) {
      found[q]->parameters[j].rankCorrelation = sampleCorrelation(ranks, outputRanks[q]);
      found[q]->parameters[j].isVaried = order.ends.size() > 1;
    }
  }
  if (rows.size() >= kLeastForIndices) addFirstOrder(orders, outputs, seed, found);
}

/// "X1" and what is said of it, the parameters with the largest indices first, or without indices rank correlations.
std::vector<std::size_t> byImportance(const OutputDependence& output) {
  std::vector<std::size_t> order(output.parameters.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  const auto importance = [&](std::size_t j) {
    const SampleDependence& one = output.parameters[j];
    const double value = std::isnan(one.firstOrder) ? std::abs(one.rankCorrelation) : one.firstOrder;
    return std::isnan(value) ? -std::numeric_limits<double>::infinity() : value;
  };
  std::stable_sort(order.begin(), order.end(),
                   [&](std::size_t a, std::size_t b) { return importance(a) > importance(b); });
  return order;
}

/// What the intervals say; lines of text.
void appendJudgement(const OutputDependence& output, const AnalysisNames& names, std::vector<std::string>& lines) {
  constexpr double kNegligible = 0.05;
  constexpr double kWide = 0.1;
  ShortList negligible(kMostShownParameters);
  ShortList constant(kMostShownParameters);
  double widest = 0.0;
  for (std::size_t j = 0; j < output.parameters.size(); ++j) {
    const SampleDependence& one = output.parameters[j];
    widest = std::fmax(widest, 0.5 * (one.upper - one.lower));
    if (!one.isVaried) constant.add(names.parameters[j]);
    if (one.upper < kNegligible) negligible.add(names.parameters[j]);
  }
  if (!constant.isEmpty()) {
    lines.push_back("   Not varied in this sample, which says nothing of them: " + constant.text());
  }
  if (!negligible.isEmpty()) {
    lines.push_back(
        fmt::format("   Less than {:g} of the variance each, by themselves: {}; what they do together with "
                    "others does not show here",
                    kNegligible, negligible.text()));
  }
  if (widest > kWide) {
    lines.push_back(
        fmt::format("   The sample is small for this: limits are up to {:.2g} from an index; for {:g} it "
                    "would take some {:.0f} runs",
                    widest, kWide, twoDigits(static_cast<double>(output.count) * widest * widest / (kWide * kWide))));
  }
}

}  // namespace

SampleSensitivity sampleSensitivity(const EvaluatedSample& sample, const AnalysisNames& names, std::int32_t seed) {
  SampleSensitivity sensitivity;
  sensitivity.failedCount = static_cast<std::size_t>(std::ranges::count(sample.ok, false));
  const std::size_t parameterCount = sample.size() == 0 ? names.parameters.size() : sample.parameters.size();
  const std::size_t measureCount = names.measures.size();
  const auto columnOf = [&](std::size_t q) -> const std::vector<double>* {
    const Columns& columns = q < measureCount ? sample.measures : sample.objectives;
    const std::size_t place = q < measureCount ? q : q - measureCount;
    return place < columns.size() ? &columns[place] : nullptr;
  };
  std::map<std::vector<std::size_t>, std::vector<std::size_t>> outputsByRows;
  for (std::size_t q = 0; q < measureCount + names.objectives.size(); ++q) {
    const bool isMeasure = q < measureCount;
    OutputDependence& output = sensitivity.outputs.emplace_back();
    output.kind = isMeasure ? "measure" : "objective";
    output.name = isMeasure ? names.measures[q] : names.objectives[q - measureCount];
    output.parameters.assign(parameterCount, {kNaN, kNaN, kNaN, kNaN});
    std::vector<std::size_t> rows;
    const std::vector<double>* const values = columnOf(q);
    for (std::size_t i = 0; values != nullptr && i < sample.size(); ++i) {
      if (sample.ok[i] && std::isfinite((*values)[i])) rows.push_back(i);
    }
    output.count = rows.size();
    if (rows.size() >= 2) outputsByRows[std::move(rows)].push_back(q);
  }
  for (const auto& [rows, outputs] : outputsByRows) {
    Columns columns;
    std::vector<OutputDependence*> found;
    for (const std::size_t q : outputs) {
      std::vector<double>& column = columns.emplace_back();
      for (const std::size_t row : rows) column.push_back((*columnOf(q))[row]);
      found.push_back(&sensitivity.outputs[q]);
    }
    addDependences(sample.parameters, rows, columns, seed, found);
  }
  return sensitivity;
}

SampleSensitivity sampleSensitivity(const UncertaintyOutcome& outcome, const SearchSpace& space,
                                    const AnalysisNames& names, std::int32_t seed) {
  EvaluatedSample sample;
  for (std::size_t i = 0; i < outcome.results.size(); ++i) {
    sample.add(ToModelScale(space, outcome.sample[i]), outcome.results[i]);
  }
  return sampleSensitivity(sample, names, seed);
}

DataTable sampleSensitivityTable(const SampleSensitivity& sensitivity, const AnalysisNames& names, bool areCorrelated) {
  DataTable table;
  table.file = run_files::kSampleSensitivities;
  table.headLines = {
      "Rank correlation of each output with each parameter, and first-order sensitivity index with 95 % limits, of the "
      "evaluations whose model run succeeded"};
  if (areCorrelated) table.headLines.emplace_back("The parameters were drawn with correlations");
  table.columns = {"Kind", "Output", "Parameter", "Count", "RankCorrelation", "FirstOrder", "Lower", "Upper"};
  for (const OutputDependence& output : sensitivity.outputs) {
    for (std::size_t j = 0; j < output.parameters.size(); ++j) {
      const SampleDependence& one = output.parameters[j];
      table.rows.push_back({output.kind, output.name, names.parameters[j], static_cast<std::int64_t>(output.count),
                            one.rankCorrelation, one.firstOrder, one.lower, one.upper});
    }
  }
  return table;
}

std::vector<std::string> formatSampleSensitivity(const SampleSensitivity& sensitivity, const AnalysisNames& names,
                                                 std::string_view file, bool areCorrelated) {
  std::vector<std::string> lines;
  const std::string_view shownKind = names.objectives.empty() ? "measure" : "objective";
  for (const OutputDependence& output : sensitivity.outputs) {
    if (output.kind != shownKind) continue;
    const std::vector<std::size_t> order = byImportance(output);
    std::vector<std::string> shown;
    std::vector<std::vector<double>> rows;
    const bool hasIndices = output.count >= kLeastForIndices;
    for (std::size_t k = 0; k < std::min(order.size(), kMostShownParameters); ++k) {
      const SampleDependence& one = output.parameters[order[k]];
      shown.push_back(names.parameters[order[k]]);
      rows.push_back({one.rankCorrelation});
      if (hasIndices) rows.back().insert(rows.back().end(), {one.firstOrder, one.lower, one.upper});
    }
    std::vector<std::string> headings{"Rank corr."};
    if (hasIndices) headings.insert(headings.end(), {"First order", "Lower 95 %", "Upper 95 %"});
    lines.emplace_back();
    for (std::string& line : formatTable("Dependence of " + output.name, headings, shown, rows)) {
      lines.push_back(std::move(line));
    }
    if (hasIndices && output.isConstant) {
      lines.emplace_back("   No indices: all runs have the same value");
    } else if (hasIndices && !output.hasVariance) {
      lines.push_back(fmt::format("   No first-order indices: {}", kNoFiniteVariance));
    } else if (hasIndices) {
      appendJudgement(output, names, lines);
    } else {
      lines.push_back(fmt::format("   {} runs with a value are too few for first-order indices, at least {}",
                                  output.count, kLeastForIndices));
    }
    if (output.count > 2) {
      lines.push_back(fmt::format("   Rank correlations within {:.2g} of 0 may be chance",
                                  kNormal95 / std::sqrt(static_cast<double>(output.count - 1))));
    }
  }
  if (lines.empty()) return lines;
  if (areCorrelated) {
    lines.emplace_back(
        "   The parameters are correlated: an index has what the parameter shares with others, and their sum means "
        "nothing");
  }
  lines.push_back(fmt::format("   All outputs and parameters are in {}", file));
  return lines;
}

}  // namespace mirevo
