#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "measures/output_measure.h"

namespace mirevo {

/// An evaluation that is shown: the initial or the best one.
struct ShownEvaluation {
  int number = 0;
  double aggregate = 0.0;  ///< NaN while it is not known
  bool operator==(const ShownEvaluation&) const = default;
};

/// An output measure's observed and simulated values over the evaluation period; one entry per time in each vector, NaN
/// where there is no value.
struct ShownSeries {
  std::string measure;
  std::vector<std::int64_t> seconds;  ///< secondNumber() of each time, ascending
  std::vector<float> observed;
  std::vector<float> initial;
  std::vector<float> best;
};

/// In a head line: the series of an evaluation have no values in the validation periods, though the model had.
inline constexpr std::string_view kInEvaluationPeriodAlone = "in the evaluation period alone";

/// The content of `<setup>_Series.dat`: the simulated series of a run's initial and its best evaluation beside the
/// observed ones.
struct SeriesTable {
  std::vector<std::string> headLines;  ///< without "# "; except those that are made from the members below
  std::string task;                    ///< the key of the task that made them; empty in files of earlier versions
  std::optional<ShownEvaluation> initial;
  bool isOfInitialParameters = false;  ///< the initial one has the initial parameters; else it is the first that
                                       ///< succeeded
  std::optional<ShownEvaluation> best;
  std::vector<ShownSeries> series;
  std::optional<std::size_t> rowsWritten;  ///< as a file says; nothing in those of earlier versions
  bool endsInHead = false;                 ///< a file that ends above its rows

  std::size_t rowCount() const;
  /// What is left of a file that is cut off or damaged: "31 of its 365 rows can be read"; empty for a whole one.
  std::string remains() const;
  /// Whether it is of a run of that task, as far as the file says.
  bool isOf(std::string_view otherTask) const { return task.empty() || task == otherTask; }
};

/// The inverse of isoTime(); empty for any other text.
std::optional<std::int64_t> readIsoTime(std::string_view text);

/// The names of the measures with these 0-based indices in the table, made unique.
std::vector<std::string> seriesNames(std::span<const OutputMeasure> measures, std::span<const std::size_t> shown);

/// The table as text: `#` head lines, a header row, tab-separated rows. Numbers read back as the same 32 bits.
std::string seriesTableText(const SeriesTable& table);
/// Its beginning, down to the header row, of a table of so many rows whose series need not be there; and the rows of
/// one series.
std::string seriesTableHead(const SeriesTable& table, std::size_t rowCount);
void appendSeriesRows(std::string& text, const ShownSeries& series);

/// Reads the text of a table. Accepts any text: lines that are not rows are left out, and a text without a header row
/// has no series.
SeriesTable readSeriesTable(std::string_view text);

}  // namespace mirevo
