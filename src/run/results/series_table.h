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
  double aggregate = 0.0;  ///< NaN while the run does not know it
  bool operator==(const ShownEvaluation&) const = default;
};

/// An output measure's observed and simulated values over the evaluation period; one entry a time each, NaN where
/// there is none.
struct ShownSeries {
  std::string measure;
  std::vector<std::int64_t> seconds;  ///< secondNumber() of each time, ascending
  std::vector<float> observed;
  std::vector<float> initial;
  std::vector<float> best;
};

/// The content of `<setup>_Series.dat`: the simulated series of a run's initial and its best evaluation beside the
/// observed ones.
struct SeriesTable {
  std::vector<std::string> headLines;  ///< without "# "; those that name the evaluations are made from what follows
  std::optional<ShownEvaluation> initial;
  bool isOfInitialParameters = false;  ///< the initial one has the setup's values; else it is the first that succeeded
  std::optional<ShownEvaluation> best;
  std::vector<ShownSeries> series;
};

/// The names by which the table calls the measures of those 0-based numbers, no two the same.
std::vector<std::string> seriesNames(std::span<const OutputMeasure> measures, std::span<const std::size_t> shown);

/// As text: `#` head lines, a header row, tab-separated rows. Numbers read back as the same 32 bits.
std::string seriesTableText(const SeriesTable& table);

/// Reads that text. Any text is taken: rows that are none are left out, and a text without header row has no series.
SeriesTable readSeriesTable(std::string_view text);

}  // namespace mirevo
