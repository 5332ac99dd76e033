#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "measures/period_series.h"

namespace mirevo {

/// One simulated series of one scenario, at its own times.
struct ScenarioSeries {
  int number = 0;  ///< of the evaluation
  std::string measure;
  PeriodSeries series;
};

/// Reads the text of `<setup>_ScenarioSeries.dat`. Accepts any text: of an evaluation that does not end in it nothing
/// is taken, nor are lines that are not rows.
std::vector<ScenarioSeries> readScenarioSeries(std::string_view text);

/// Writes `<setup>_ScenarioSeries.dat`: the simulated series of the first scenarios, as these finish.
class ScenarioSeriesFile final {
 public:
  struct Settings {
    std::string path;
    std::vector<std::string> headLines;
    std::vector<std::string> measures;  ///< names in the file, one per series of a result
    std::int64_t periodFirst = 0;       ///< secondNumber() of the ends of the period
    std::int64_t periodLast = 0;
    int mostRuns = 0;  ///< evaluations with larger numbers are left out
  };

  /// `warn` is called once with the reason if the file cannot be written.
  ScenarioSeriesFile(Settings settings, std::function<void(std::string_view)> warn);

  /// Begins the file, with what the earlier run has left there if this one `goesOn`.
  void begin(bool goesOn);
  /// Appends the series of a successful evaluation; nothing if it has none, or is in the file already.
  void add(int number, const std::vector<PeriodSeries>& series);

 private:
  void append(const std::string& text);

  Settings settings_;
  std::function<void(std::string_view)> warn_;
  std::vector<int> written_;  ///< the evaluations in the file
  bool hasFailed_ = false;
};

}  // namespace mirevo
