#include "run/results/row_check.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <optional>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/checksum.h"
#include "common/text.h"
#include "measures/objective_functions.h"

namespace mirevo {
namespace {

/// A sum is rounded otherwise on another machine, by far less than what an edit of a row changes.
constexpr double kRelativeTolerance = 1e-9;

/// `magnitude`: the sum of the absolute values of all terms of `expected`.
bool agrees(double found, double expected, double magnitude) {
  if (found == expected || (std::isnan(found) && std::isnan(expected))) return true;
  // An aggregate may be infinite, with a weight or a scale that is out of range.
  return std::isfinite(found) && std::isfinite(expected) &&
         std::abs(found - expected) <= kRelativeTolerance * magnitude;
}

bool isFailedValue(double value) {
  return value == kFailedRunValue;
}

/// Calls `visit` for each value of the row that is computed from its model run; false if it returns false for any.
template <class Visit>
bool allResults(const ResultRow& row, Visit visit) {
  return std::all_of(row.measures.begin(), row.measures.end(), visit) &&
         std::all_of(row.objectives.begin(), row.objectives.end(), visit);
}

std::vector<ObjectiveFunction> withAbsoluteTerms(std::vector<ObjectiveFunction> functions) {
  for (ObjectiveFunction& function : functions) {
    if (function.functionType == FunctionType::sum) function.functionType = FunctionType::sumOfAbsolutes;
  }
  return functions;
}

/// Whether the values of a row follow from each other.
class RowArithmetic final {
 public:
  explicit RowArithmetic(const RunConfig& config)
      : config_(config),
        magnitudes_(withAbsoluteTerms(config.objectives)),
        aggregator_(config.objectives, config.aggregationMethod) {}

  /// What does not; empty if all do.
  std::string faultOf(const ResultRow& row) const {
    if (!row.ok) {
      const bool isFailed = allResults(row, isFailedValue) && isFailedValue(row.aggregate);
      return isFailed
                 ? std::string()
                 : fmt::format("its status is FAILED, but not all of its values are {}", formatReal(kFailedRunValue));
    }
    if (!allResults(row, [](double value) { return std::isfinite(value); })) {
      return "its status is OK, but a value is not finite";
    }
    const std::vector<double> expected = objectiveFunctionValues(config_.objectives, row.measures);
    const std::vector<double> magnitudes = objectiveFunctionValues(magnitudes_, row.measures);
    for (std::size_t j = 0; j < expected.size(); ++j) {
      if (agrees(row.objectives[j], expected[j], magnitudes[j])) continue;
      return fmt::format("objective function \"{}\" is {}, its output measures give {}",
                         trimTrailing(config_.objectives[j].name), formatReal(row.objectives[j]),
                         formatReal(expected[j]));
    }
    return faultOfAggregate(row);
  }

 private:
  std::string faultOfAggregate(const ResultRow& row) const {
    if (!aggregator_.isSettled()) return {};
    const double expected = aggregator_.aggregate(row.objectives);
    if (agrees(row.aggregate, expected, magnitudeOfAggregate(row.objectives))) return {};
    return fmt::format("the aggregate is {}, its objective functions give {}", formatReal(row.aggregate),
                       formatReal(expected));
  }

  double magnitudeOfAggregate(const std::vector<double>& values) const {
    double magnitude = 0.0;
    for (std::size_t i = 0; i < values.size(); ++i) {
      const double weight = std::abs(config_.objectives[i].weight);
      switch (config_.aggregationMethod) {
        case AggregationMethod::none:
          magnitude += weight * std::abs(values[i]);
          break;
        case AggregationMethod::commonDistance:
          magnitude += weight * (std::abs(values[i] / aggregator_.sigma()[i]) + std::abs(aggregator_.mu()[i]));
          break;
        case AggregationMethod::commonProbability:
          magnitude += weight;  // a probability is at most 1
          break;
        case AggregationMethod::zero:
          break;
      }
    }
    return magnitude;
  }

  const RunConfig& config_;
  std::vector<ObjectiveFunction> magnitudes_;
  ObjectiveAggregator aggregator_;
};

enum class ChecksumState { right, wrong, none };

/// By the row's numbers and not by its line, whose ends another program may have changed.
ChecksumState stateOf(const ResultRow& row, const RowChecksums& checksums) {
  if (!checksums.has(row.number)) return ChecksumState::none;
  // Of a line that nobody has touched there is no need to write it again.
  const bool isRight =
      checksums.has({row.number, row.lineChecksum}) || checksums.has({row.number, checksumOf(resultRowText(row))});
  return isRight ? ChecksumState::right : ChecksumState::wrong;
}

/// The lines of rows by their numbers, which nearly always rise.
class LinesByNumber final {
 public:
  void add(int number, std::size_t line) {
    if (rising_.empty() || rising_.back().first < number) {
      rising_.emplace_back(number, line);
    } else {
      others_.emplace(number, line);
    }
  }
  /// Empty for a number that no row has.
  std::optional<std::size_t> lineOf(int number) const {
    if (const auto other = others_.find(number); other != others_.end()) return other->second;
    if (rising_.empty() || rising_.back().first < number) return std::nullopt;
    const auto found = std::lower_bound(rising_.begin(), rising_.end(), std::pair(number, std::size_t{0}));
    return found->first == number ? std::optional(found->second) : std::nullopt;
  }

 private:
  std::vector<std::pair<int, std::size_t>> rising_;
  std::map<int, std::size_t> others_;
};

}  // namespace

CheckedRows checkRows(const ResultRows& rows, const RowChecksums& checksums, const RunConfig& config,
                      RowOrigin origin) {
  CheckedRows checked;
  const RowArithmetic arithmetic(config);
  const int planned = config.plannedModelRuns();
  std::size_t withChecksum = rows.size();  // up to the last row that has one
  while (withChecksum > 0 && !checksums.has(rows.number(withChecksum - 1))) --withChecksum;
  LinesByNumber lines;  // of rows that hold
  const auto faultOf = [&](const ResultRow& row, bool isBeforeChecksums) -> std::string {
    const ChecksumState state = stateOf(row, checksums);
    if (state == ChecksumState::wrong) return "it is not as it was written: it has another checksum";
    if (state == ChecksumState::none) {
      if (isBeforeChecksums) return "it has no checksum, though rows below it have one";
      ++checked.withoutChecksum;
    }
    if (const auto other = lines.lineOf(row.number)) return fmt::format("the evaluation is in line {}, too", *other);
    if (origin == RowOrigin::perhapsOther && state == ChecksumState::right) return {};
    if (row.number > planned) return fmt::format("the run has at most {} evaluations", planned);
    // A model may write this number, but without a checksum the status may have been edited as well.
    const bool isOfFailed =
        row.ok && state == ChecksumState::none && !row.measures.empty() && allResults(row, isFailedValue);
    return isOfFailed ? "its status is OK, but its values are those of a failed evaluation" : arithmetic.faultOf(row);
  };
  std::size_t index = 0;
  for (const ResultRow& row : rows) {
    if (std::string what = faultOf(row, index++ < withChecksum); !what.empty()) {
      checked.faults.push_back({row.line, row.number, std::move(what)});
    } else {
      lines.add(row.number, row.line);
    }
  }
  return checked;
}

std::string rowFaultText(const RowFault& fault) {
  return fmt::format("line {} (evaluation No. {}): {}", fault.line, fault.number, fault.what);
}

}  // namespace mirevo
