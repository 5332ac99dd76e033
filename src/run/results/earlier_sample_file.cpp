#include "run/results/earlier_sample_file.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "measures/kept_steps.h"
#include "run/results/earlier_sample_doubts.h"
#include "run/results/restart_settings.h"
#include "run/results/result_table.h"
#include "run/results/row_check.h"
#include "run/results/row_checksums.h"
#include "run/results/run_record.h"
#include "run/results/simulated_values_file.h"

namespace mirevo {
namespace {

constexpr std::string_view kRefusal = "Error: Earlier result file invalid";
constexpr std::size_t kMostShown = 10;

[[noreturn]] void refuse(const std::string& file, std::string_view detail) {
  fatalError(std::string(kRefusal), fmt::format("{}: {}", file, detail));
}

/// A file beside the results of the earlier run: `basin_Optimisation` and `_Restart.dat`.
std::string pathBesideResults(const std::string& resultFile, const RunFile& file) {
  const std::size_t ending = resultFile.rfind('.');
  return runFilePath(resultFile.substr(0, ending), file);
}

/// Those settings, and files, for which the condition is true; it gets section and keyword.
template <class Condition>
RestartSettings only(const RestartSettings& all, Condition isWanted) {
  RestartSettings some;
  some.program = all.program;
  std::ranges::copy_if(all.settings, std::back_inserter(some.settings),
                       [&](const ResultSetting& one) { return isWanted(one.section, one.keyword); });
  std::ranges::copy_if(all.files, std::back_inserter(some.files),
                       [&](const FileMark& one) { return isWanted(one.section, one.keyword); });
  return some;
}

bool isOfJudgement(std::string_view section, std::string_view /*keyword*/) {
  return section.starts_with("ObjectiveFunctions");
}

/// What decides on the simulated values, and not on which sets there are.
bool isOfModel(std::string_view section, std::string_view keyword) {
  if (section.starts_with("MODEL_PARAMETERS")) {
    return keyword == "Parameter_Type" || keyword == "Parameter_Equation" || keyword == "Parameter_IDValue";
  }
  return section.starts_with("MIREVO_SIMULATION_OPTION/");
}

std::string listOf(std::span<const std::string> lines) {
  std::string text;
  for (std::size_t i = 0; i < std::min(lines.size(), kMostShown); ++i) text += "\n   " + lines[i];
  if (lines.size() > kMostShown) text += fmt::format("\n   and {} more", lines.size() - kMostShown);
  return text;
}

std::string settingsPathOf(const std::string& resultFile) {
  return pathBesideResults(resultFile, run_files::restartFile("_Restart"));
}

bool isOfScenarios(const RestartSettings& then) {
  return std::ranges::any_of(
      then.settings, [](const ResultSetting& setting) { return setting.keyword == "Option" && setting.value == "0"; });
}

/// Of an earlier run, whether its sets are no sample of a distribution, and why.
std::string notSampled(const RestartSettings& then) {
  if (isOfScenarios(then)) return "scenario run, which somebody chose,";
  for (const ResultSetting& setting : then.settings) {
    if (setting.keyword == "Option" && setting.value == "1") {
      return "sensitivity analysis, which change one parameter or few,";
    }
    if (setting.keyword == "Option" && setting.value == "2") return "search, which went where the fit is better,";
    if (setting.keyword == "Uncertainty_Type" && setting.value.find("DREAM") != std::string::npos) {
      return "DREAM run, the proposals of its chains with those that were rejected (the posterior is in its "
             "_Chains.dat),";
    }
  }
  return "";
}

/// What the settings of the earlier run, if they are there, say of its evaluations.
void compareSettings(const std::string& resultFile, const std::optional<RestartSettings>& then, const RunConfig& config,
                     EarlierSample& found) {
  if (!then) {
    found.warnings.push_back(
        fmt::format("{} is not there or damaged: whether the evaluations are of the same observations, "
                    "measures and model is not known",
                    settingsPathOf(resultFile)));
    return;
  }
  const RestartSettings now = restartSettings(config);
  const std::vector<std::string> judged = changedSettings(only(*then, isOfJudgement), only(now, isOfJudgement));
  if (!judged.empty()) {
    refuse(resultFile, fmt::format("its evaluations are judged otherwise than this setup would judge them:{}\nGive the "
                                   "setup the measures, objective functions and observations of that run",
                                   listOf(judged)));
  }
  const std::vector<std::string> model = changedSettings(only(*then, isOfModel), only(now, isOfModel));
  if (!model.empty()) {
    found.warnings.push_back(
        fmt::format("The evaluations in {} are of other settings of the model:{}", resultFile, listOf(model)));
  }
  found.areCorrelated = std::ranges::any_of(then->settings, [](const ResultSetting& setting) {
    return setting.section.ends_with("CORRELATIONS") || setting.section.find("CORRELATIONS/") != std::string::npos;
  });
  if (const std::string kind = notSampled(*then); !kind.empty()) {
    found.isOfDistributions = false;
    found.warnings.push_back(fmt::format(
        "The sets in {} are those of a {} and no sample of a distribution: quantiles and bands say how those sets are "
        "distributed, and not how uncertain the parameters are",
        resultFile, kind));
  }
}

ResultRows readRows(const std::string& file, const std::string& text, const RunConfig& config,
                    const ResultColumns& columns, bool countsRepeats, EarlierSample& found) {
  ResultRows rows;
  const ResultTable table = readResultTable(text, columns, rows);
  if (!table.hasHeader)
    refuse(file, "expected a result file, with a header row that begins with Evaluation, found none");
  if (!table.hasExpectedColumns) {
    refuse(file, fmt::format("expected the variable parameters, output measures and objective functions of this setup, "
                             "whose header row is\n   {}",
                             resultHeader(columns)));
  }
  const std::string checksumFile = pathBesideResults(file, run_files::kPlain.checksums);
  const RowChecksums checksums = readRowChecksums(readFileIfThere(checksumFile).value_or(""));
  std::vector<std::string> faults;
  for (const RowFault& fault : checkRows(rows, checksums, config, RowOrigin::perhapsOther).faults) {
    if (checksums.has(fault.number)) faults.push_back(rowFaultText(fault));
  }
  if (!faults.empty()) {
    refuse(file, fmt::format("it has rows that do not hold:{}\nRestore these lines from a copy, or delete them: their "
                             "evaluations are then left out. If the rows are right and {} is not, remove that file",
                             listOf(faults), checksumFile));
  }
  if (table.unusableLines > 0) {
    found.warnings.push_back(
        fmt::format("Lines of {} that are cut off or damaged are passed over: {}", file, table.unusableLines));
  }
  rows.putInOrder();
  std::ptrdiff_t missing = 0;
  for (int last = 0; const RowChecksum& one : checksums) {  // an evaluation may have several
    if (one.number != last && one.number >= 1 && !rows.has(one.number)) ++missing;
    last = one.number;
  }
  if (missing > 0) {
    found.warnings.push_back(fmt::format(
        "{} of {} evaluations are missing in {}, though {} has their checksums: it was cut off or lines were deleted. "
        "What is said of the sample is said of the {} that are there",
        missing, missing + std::ssize(rows), file, fileNameOf(checksumFile), std::ssize(rows)));
  }
  // A sample draws a likely set more than once, and its weight is as often counted; so is that of a set that somebody
  // gave more than once. A search has a set again where it
  // has converged, which says nothing of the set.
  if (!countsRepeats) rows.keepIf([&](std::size_t i) { return rows.repeats(i).value_or(0) == 0; });
  return rows;
}

void addRows(const ResultRows& rows, EvaluatedSample& sample) {
  for (const ResultRow& row : rows) {
    EvaluationResult result;
    result.number = row.number;
    result.measureValues = row.measures;
    result.objectiveValues = row.objectives;
    result.validationValues = row.validation;
    if (!row.ok) result.failure.emplace();
    sample.add(row.parameters, result);
  }
}

/// Makes its simulated values readable, if they are of the observations and steps of this run.
void openValues(const std::string& resultFile, const ResultRows& rows, const RunConfig& config,
                std::span<const ObservedSeries> observed, EarlierSample& found) {
  const std::string path = pathBesideResults(resultFile, run_files::kPlain.simulatedValues);
  std::error_code ignored;
  if (!std::filesystem::exists(path, ignored)) {
    found.warnings.push_back(fmt::format(
        "There are no bands: {} is not there. Uncertainty, Sobol' and local sensitivity analyses keep the simulated "
        "values in it",
        path));
    return;
  }
  const auto times = config.task->keptSteps() ? std::optional(checksumOfTimes(observed)) : std::nullopt;
  std::shared_ptr<SimulatedValuesFile> values;
  std::optional<std::size_t> count;
  auto precision = SeriesPrecision::single;
  // Which task it was, and so what it has of each evaluation, is known by the file alone.
  for (const SeriesPrecision kept : {SeriesPrecision::single, SeriesPrecision::exact}) {
    for (const std::size_t measureCount : {std::size_t{0}, config.measures.size()}) {
      if (count) break;
      precision = kept;
      values = std::make_shared<SimulatedValuesFile>(path, simulatedValueCount(observed, kept), kept, measureCount,
                                                     true, times);
      count = values->openToRead(rows);
    }
  }
  if (!count) {
    found.warnings.push_back(fmt::format(
        "There are no bands: {} has the simulated values at other times than this setup asks for (Band_Times, "
        "Band_End_Date, the observations)",
        path));
    return;
  }
  const auto succeeded = static_cast<std::size_t>(std::ranges::count(found.sample.ok, true));
  if (*count < succeeded) {
    found.warnings.push_back(fmt::format("There are no bands: {} lacks the simulated values of {} of {} evaluations",
                                         path, succeeded - *count, succeeded));
    return;
  }
  std::vector<std::size_t> ends;  // of the series; in exact files units follow the values of each
  for (const ObservedSeries& series : observed) {
    ends.push_back(series.values.size() + (ends.empty() ? 0 : ends.back()));
  }
  if (precision == SeriesPrecision::single) ends.clear();
  found.simulatedColumns = [values, ends](std::span<const int> numbers, std::size_t first, std::size_t length) {
    const auto after = std::ranges::upper_bound(ends, first);
    return values->columns(numbers, first + (after == ends.begin() ? 0 : *(after - 1)), length);
  };
}

}  // namespace

EarlierSample readEarlierSample(const std::string& resultFile, const RunConfig& config, const SearchSpace& space,
                                const Feasibility& feasibility, std::span<const ObservedSeries> observed) {
  EarlierSample found;
  std::string reason;
  auto text = readTextFile(resultFile, reason);
  if (!text) refuse(resultFile, reason);
  const auto then = parseRestartSettings(readFileIfThere(settingsPathOf(resultFile)).value_or(""));
  const bool countsRepeats = !then || isOfScenarios(*then) || notSampled(*then).empty();
  const ResultRows rows = readRows(resultFile, *text, config, resultColumns(config, space), countsRepeats, found);
  text.reset();
  addRows(rows, found.sample);
  const auto succeeded = std::ranges::count(found.sample.ok, true);
  if (succeeded == 0) refuse(resultFile, "it has no successful evaluation");
  found.notes.push_back(fmt::format("{} evaluations are taken from {}, {} of them failed", found.sample.size(),
                                    resultFile, std::ssize(found.sample.ok) - succeeded));
  compareSettings(resultFile, then, config, found);
  const auto add = [&found](std::string warning) {
    if (!warning.empty()) found.warnings.push_back(std::move(warning));
  };
  add(otherBoundsText(resultFile, then, config, found));
  for (std::string& doubt : otherSetsTexts(resultFile, config, feasibility, found.sample)) add(std::move(doubt));
  const std::string recordFile = pathBesideResults(resultFile, run_files::kPlain.record);
  for (std::string& doubt :
       unfinishedRunTexts(resultFile, readRunRecord(readFileIfThere(recordFile).value_or("")), found.sample)) {
    add(std::move(doubt));
  }
  openValues(resultFile, rows, config, observed, found);
  return found;
}

}  // namespace mirevo
