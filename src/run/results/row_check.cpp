#include "run/results/row_check.h"

#include <algorithm>
#include <cmath>
#include <map>

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
  const auto [begin, end] = checksums.equal_range(row.number);
  if (begin == end) return ChecksumState::none;
  const std::uint64_t found = checksumOf(resultRowText(row));
  const bool isRight = std::any_of(begin, end, [found](const auto& entry) { return entry.second == found; });
  return isRight ? ChecksumState::right : ChecksumState::wrong;
}

}  // namespace

CheckedRows checkRows(std::span<const ResultRow> rows, const RowChecksums& checksums, const RunConfig& config,
                      RowOrigin origin) {
  CheckedRows checked;
  const RowArithmetic arithmetic(config);
  const int planned = config.plannedModelRuns();
  const auto hasChecksum = [&checksums](const ResultRow& row) { return checksums.count(row.number) > 0; };
  const auto lastWithChecksum = std::find_if(rows.rbegin(), rows.rend(), hasChecksum).base();
  std::map<int, std::size_t> lines;  // of rows that hold, by number
  const auto faultOf = [&](const ResultRow& row, bool isBeforeChecksums) -> std::string {
    const ChecksumState state = stateOf(row, checksums);
    if (state == ChecksumState::wrong) return "it is not as it was written: it has another checksum";
    if (state == ChecksumState::none) {
      if (isBeforeChecksums) return "it has no checksum, though rows below it have one";
      ++checked.withoutChecksum;
    }
    if (const auto other = lines.find(row.number); other != lines.end()) {
      return fmt::format("the evaluation is in line {}, too", other->second);
    }
    if (origin == RowOrigin::perhapsOther && state == ChecksumState::right) return {};
    if (row.number > planned) return fmt::format("the run has at most {} evaluations", planned);
    // A model may write this number, but without a checksum the status may have been edited as well.
    const bool isOfFailed =
        row.ok && state == ChecksumState::none && !row.measures.empty() && allResults(row, isFailedValue);
    return isOfFailed ? "its status is OK, but its values are those of a failed evaluation" : arithmetic.faultOf(row);
  };
  for (auto row = rows.begin(); row != rows.end(); ++row) {
    if (std::string what = faultOf(*row, row < lastWithChecksum); !what.empty()) {
      checked.faults.push_back({row->line, row->number, std::move(what)});
    } else {
      lines.emplace(row->number, row->line);
    }
  }
  return checked;
}

std::string rowFaultText(const RowFault& fault) {
  return fmt::format("line {} (evaluation No. {}): {}", fault.line, fault.number, fault.what);
}

}  // namespace mirevo
