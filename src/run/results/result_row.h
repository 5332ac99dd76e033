#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "parameters/search_space.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The names of those columns of a result file of which there is one per parameter, measure or objective function.
struct ResultColumns {
  std::vector<std::string> parameters;  ///< variable parameters
  std::vector<std::string> measures;
  std::vector<std::string> objectives;
  std::vector<std::string> validation = {};  ///< measures in validation periods
  bool hasRepeats = false;                   ///< the last column says which evaluation a row repeats
};

/// One evaluation in a result file. result_row.cpp defines its columns, for writing and reading alike.
struct ResultRow {
  int number = 0;                  ///< the evaluation's number in its run, from 1
  bool ok = false;                 ///< its status
  std::vector<double> parameters;  ///< model scale, one per variable parameter
  std::vector<double> measures;
  std::vector<double> objectives;
  double aggregate = kFailedRunValue;
  std::vector<double> validation = {};
  /// The number of the evaluation of the same set whose result this one has, without a model run of its own; 0 for one
  /// that had its own. Empty in a file without the column, where no evaluation repeats another.
  std::optional<int> repeats = {};
  std::size_t line = 0;            ///< of a row that was read: the line of its file, from 1
  std::uint64_t lineChecksum = 0;  ///< likewise: checksumOf() the line
};

/// The columns for a setup.
ResultColumns resultColumns(const RunConfig& config, const SearchSpace& space);

/// The row of an evaluation; `parameterValues` are on the model scale.
ResultRow resultRow(std::span<const double> parameterValues, const EvaluationResult& result);

/// The header row, without its line end. A name that an earlier column has gets a number: "flow (2)".
std::string resultHeader(const ResultColumns& columns);
/// A row, without its line end. Numbers read back as the same 64 bits.
std::string resultRowText(const ResultRow& row);

/// Number of cells of a row or header row.
std::size_t cellCount(std::string_view line);
/// Whether the line is the header row of a result file, whatever its columns.
bool isResultHeader(std::string_view line);
/// These columns, with that of repeats if the header row has it behind them.
ResultColumns withRepeatsOf(std::string_view header, ResultColumns columns);
/// Whether the header row has these columns.
bool hasColumns(std::string_view header, const ResultColumns& columns);
/// The row in a line below a header row with these columns; empty for a line that is not a row.
std::optional<ResultRow> readResultRow(std::string_view line, const ResultColumns& columns);
/// The same into `row`, whose memory is used again; false for a line that is not a row.
bool readResultRow(std::string_view line, const ResultColumns& columns, ResultRow& row);

}  // namespace mirevo
