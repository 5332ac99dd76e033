#include "report/report_searches.h"

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <span>
#include <string_view>
#include <system_error>
#include <vector>

#include <fmt/format.h>

#include "common/run_files.h"
#include "measures/period_series.h"
#include "report/report_analyses.h"
#include "report/report_front.h"
#include "report/report_repetitions.h"
#include "run/results/restart_settings.h"
#include "run/results/series_table.h"

namespace mirevo {
namespace {

constexpr std::string_view kByResiduals = "GLM";
constexpr std::string_view kBySeveralObjectives[] = {"NSGA-II", "PADDS"};

bool isThere(const std::string& filePrefix, const RunFile& file) {
  std::error_code ignored;
  return std::filesystem::exists(runFilePath(filePrefix, file), ignored);
}

bool hasSeveralObjectives(std::string_view algorithm) {
  return std::find(std::begin(kBySeveralObjectives), std::end(kBySeveralObjectives), algorithm) !=
         std::end(kBySeveralObjectives);
}

/// Of what is computed when the search ends, or is ended by the kill file or an error, and not by a signal.
std::string unwrittenText(std::string_view what, const std::string& filePrefix, const RunFile& file, RunStage stage) {
  const std::string name = fileNameOf(runFilePath(filePrefix, file));
  if (stage == RunStage::running)
    return fmt::format("There is no {} yet: {} is written when the search ends", what, name);
  return fmt::format(
      "No {} was written, as the run was not finished. Started again with the same setup and Restart = 1, it goes on "
      "and "
      "writes {}",
      what, name);
}

void addFront(const RunConfig& config, const std::string& filePrefix, std::size_t variableCount, ReportData& data,
              std::vector<std::string>& faults) {
  if (!isThere(filePrefix, run_files::kPareto)) {
    if (!hasSeveralObjectives(data.run.algorithm)) return;
    if (data.run.stage != RunStage::finished) {
      faults.push_back(unwrittenText("front", filePrefix, run_files::kPareto, data.run.stage));
      return;
    }
  }
  data.front = reportedFront(filePrefix, config.objectives.size(), variableCount, faults);
  const std::vector<std::size_t> pairs = measuresOfDistinctPairs(config.measures);
  if (!data.front || pairs.empty()) return;
  std::vector<std::string> shown;
  shown.reserve(pairs.size());
  for (const std::size_t i : pairs) shown.push_back(pairName(config.measures, i));
  std::string fault;
  data.front->series = reportedFrontSeries(filePrefix, *data.front, seriesNames(config.measures, pairs), shown, fault);
  if (!fault.empty()) faults.push_back(fault);
}

}  // namespace

void addSearchTables(const RunConfig& config, const std::string& filePrefix, std::span<const std::string> parameters,
                     ReportData& data) {
  if (data.run.task != "optimisation") return;
  const bool isFinished = data.run.stage == RunStage::finished;
  std::vector<std::string> faults;
  std::string fault;
  data.estimate = reportedCovariance(filePrefix + "_Optimisation", fault);
  if (!data.estimate && fault.empty() && isFinished && data.run.algorithm == kByResiduals) {
    fault = fileNameOf(runFilePath(filePrefix, run_files::kEstimateLimits)) + " is not there";
  }
  if (!fault.empty()) faults.push_back(fmt::format("The limits of the parameters are not shown: {}", fault));
  addFront(config, filePrefix, parameters.size(), data, faults);
  data.repetitions = reportedRepetitions(filePrefix, parameters, faults);
  if (data.repetitions) compareFronts(*data.repetitions, data.front);
  const bool isRepeated = searchRepetitions({{}, config.resultSettings, {}, {}}) > 1;
  if (isRepeated && !isFinished && !isThere(filePrefix, run_files::kRepetitions)) {
    faults.push_back(unwrittenText("table of the repetitions", filePrefix, run_files::kRepetitions, data.run.stage));
  }
  for (const std::string& text : faults) data.run.notes.push_back(text + ".");
}

}  // namespace mirevo
