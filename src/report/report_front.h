#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "report/json_writer.h"
#include "run/results/scenario_series.h"

namespace mirevo {

/// The hypervolume of the front as the search went on, one entry per check.
struct ReportedFrontCourse {
  std::vector<double> evaluations;
  std::vector<double> sizes;  ///< sets on the front
  std::vector<double> hypervolumes;
};

/// The sets that a search by several objectives ends with: the front, which are those of rank 1, and the rest of its
/// last population. One entry per set in each vector, in the order of the table: by rank, then by the first objective.
struct ReportedFront {
  std::vector<std::string> objectives;
  std::vector<std::string> parameters;
  std::vector<int> numbers;  ///< of the evaluations
  std::vector<int> ranks;
  std::vector<double> violations;                    ///< of the internal constraints; 0: feasible
  std::vector<double> distances;                     ///< from the ideal point, objectives scaled over the front
  std::optional<std::size_t> suggested;              ///< place of the suggested compromise
  std::vector<std::vector<double>> values;           ///< one column per objective function
  std::vector<std::vector<double>> parameterValues;  ///< one column per variable parameter, model scale
  std::optional<ReportedFrontCourse> course;
  std::vector<ScenarioSeries> series;  ///< simulated, of some sets of the front; their `measure` is that of the report
};

/// Reads what a search by several objectives has written; empty, with the reason in `faults`, if there is no front that
/// can be read. `faults` has a text on each part that is damaged or not there, too. The counts are those of the setup.
std::optional<ReportedFront> reportedFront(const std::string& filePrefix, std::size_t objectiveCount,
                                           std::size_t parameterCount, std::vector<std::string>& faults);

/// The simulated series of the sets of a front; `names` are those of the pairs of series in the file, `shown` those in
/// the report. None if the search kept none, or if the file is damaged, with the reason in `fault`.
std::vector<ScenarioSeries> reportedFrontSeries(const std::string& filePrefix, const ReportedFront& front,
                                                const std::vector<std::string>& names,
                                                const std::vector<std::string>& shown, std::string& fault);

/// As a member of the report's data.
void writeFront(JsonWriter& json, const ReportedFront& front);

}  // namespace mirevo
