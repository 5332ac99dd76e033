#include "run/setup/run_keywords.h"

#include <fmt/format.h>

#include "algorithms/searches/search_methods.h"
#include "run/setup/model_keywords.h"
#include "run/setup/validation.h"
#include "run/tasks/tasks.h"

namespace mirevo {
namespace {

constexpr CodeName kRestartNames[] = {{0, "no"}, {1, "continue"}, {2, "continue and repeat failed runs"}};

/// Sections that are accepted and not used.
const SectionRow& reservedSection() {
  static const SectionRow section{
      "TMEMPARAM",
      "never",
      "Accepted and not used.",
      {unused({.name = "TmemOption", .defaultValue = "0", .meaning = "Not used."}, KeywordType::integer),
       unused({.name = "TmemClient", .defaultValue = "0", .meaning = "Not used."}, KeywordType::integer),
       unused({.name = "MaxSimTime", .defaultValue = "0.0", .meaning = "Not used; `MaxSimulationTime` is."},
              KeywordType::real)}};
  return section;
}

}  // namespace

const SettingSection<RunConfig>& simulationOptionSection() {
  static const SettingSection<RunConfig> section{
      {"MIREVO_SIMULATION_OPTION",
       "always",
       "The task of the run and the model that it runs.",
       {choice<RunConfig>([](RunConfig& config, const SetupValue& value) { config.task = tasks().make(value); },
                          {.name = "Option",
                           .codes = tasks().names(),
                           .meaning = fmt::format("The task: {}. Any other number runs nothing and ends normally.",
                                                  tasks().meanings())}),
        setting<&RunConfig::title>({.name = "Title",
                                    .defaultValue = "''",
                                    .meaning = "Title of the run, in the log and the result files.",
                                    .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::baseFolder>(
            {.name = "Base_Folder",
             .type = KeywordType::fileName,
             .defaultValue = "''",
             .meaning = "Folder with all files of the model, which each model run gets a copy of: for batch files in "
                        "folders beside one another. Blank: the folder of the first batch file.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::restart>(
            {.name = "Restart",
             .defaultValue = "0",
             .range = between(0, 2),
             .codes = kRestartNames,
             .refusal = "Error: Invalid restart option",
             .meaning =
                 "1: an interrupted run continues where it was cut off. 2: the same, and failed model runs at its "
                 "end are repeated. 0: earlier results are kept under a numbered name and the run starts afresh.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::reuseResults>(
            {.name = "Reuse_Results",
             .defaultValue = "1",
             .meaning =
                 "1: a set for which the model would get the same values as in an earlier successful evaluation of the "
                 "run has that result, and the model is not run; such rows are marked in the column `Repeats`. "
                 "Scenario runs, and runs with `SAVE_OUTPUT_FILES`, run the model for every set. 0: the model is "
                 "always run, as one that draws random numbers needs it.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::failedRunFolders>(
            {.name = "FailedRunFolders",
             .defaultValue = "3",
             .range = kNonNegative,
             .refusal = "Error: Invalid No. of folders of failed model runs",
             .unit = "model runs",
             .meaning = "Number of failed model runs, counted from the first, whose process folder is kept as "
                        "`<setup>_Failed<evaluation number>`.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::writesReport>(
            {.name = "Report",
             .defaultValue = "1",
             .meaning = "1: a report for the browser is written at the end of the run, as `<setup>_Report.html`. 0: "
                        "none, and no series are kept for one.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::improvementCommand>(
            {.name = "Improvement_Command",
             .defaultValue = "''",
             .meaning =
                 "A command that `/bin/sh` runs in the setup's folder, beside the run, whenever an evaluation is "
                 "the best so far, and at the end of the run, with the values in its environment. Blank: none.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::improvementCommandTime>(
            {.name = "Improvement_Command_Time",
             .defaultValue = "60.0",
             .range = kPositive,
             .refusal = "Error: Invalid time of the improvement command",
             .unit = "s",
             .meaning = "Longest time of each run of `Improvement_Command`; one that takes longer is ended.",
             .bearsOnResults = kNotOfResults})}}};
  return section;
}

const SettingSection<RunConfig>& slotsSection() {
  static const SettingSection<RunConfig> section{
      {"SimultaneousSimulations",
       "always",
       "How many model runs are made at once.",
       {checked<RunConfig>(
            setting<&RunConfig::simultaneousSimulations>(
                {.name = kSlotsKeyword,
                 .defaultValue = "1",
                 .range = from(1),
                 .refusal = "Error: Invalid No. of processes",
                 .unit = "model runs",
                 .meaning = fmt::format(
                     "Model runs at once, each in a process folder of its own; no more than the run has evaluations. "
                     "In an optimisation more than 1 needs {}. In an MPI job: 1 on each worker.",
                     searchesWith(&SearchFacts::runsInParallel, "or")),
                 .bearsOnResults = kNotOfResults}),
            [](const RunConfig& config) { return validateProcessCount(config); }),
        setting<&RunConfig::useSingleThread>({.name = "UseSingleThread",
                                              .defaultValue = "0",
                                              .meaning = "1: tells each model run to use one thread.",
                                              .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::processFolder>({.name = "ProcessFolder",
                                            .type = KeywordType::fileName,
                                            .defaultValue = "''",
                                            .meaning =
                                                "Folder in which the process folders are made, such as a disk of "
                                                "the computing node; blank: beside the setup.",
                                            .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::linksReadOnlyFiles>(
            {.name = "Link_Read_Only_Files",
             .defaultValue = "0",
             .meaning = "1: files that nobody may write are hard links in the process folders, not copies. A model run "
                        "that writes to one all the same, as root can, changes the model itself.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::maxSimulationTime>(
            {.name = "MaxSimulationTime",
             .defaultValue = "0.0",
             .range = kNonNegative,
             .refusal = "Error: Invalid maximum simulation time",
             .unit = "s",
             .meaning = "Longest time of a model run, with the reading of its results; one that takes longer is ended "
                        "and has failed. 0: no limit.",
             .bearsOnResults = kNotOfResults}),
        setting<&RunConfig::maxWorkerSilence>(
            {.name = "MaxWorkerSilence",
             .defaultValue = "600.0",
             .range = kNonNegative,
             .refusal = "Error: Invalid maximum silence of a worker",
             .unit = "s",
             .meaning =
                 "In an MPI job: a worker that has a parameter set gives signs of life; after so long without one "
                 "its set goes to another worker. 0: never.",
             .bearsOnResults = kNotOfResults})}}};
  return section;
}

const SetupSchema& setupSchema() {
  static const SetupSchema schema = [] {
    std::vector<const SectionRow*> rows{&simulationOptionSection().row,
                                        &listSection("MIREVO_SIMULATION_OPTION/SIMBATCH"),
                                        &batchItemSection().row,
                                        &listSection("MIREVO_SIMULATION_OPTION/SIMPARAM"),
                                        &parameterFileSection().row,
                                        &listSection("MODEL_PARAMETERS"),
                                        &keyLinesSection().row,
                                        &parameterSection().row,
                                        &listSection("MODEL_PARAMETERS/INTERNAL_CONSTRAINTS"),
                                        &constraintSection().row,
                                        &judgementSection().row,
                                        &listSection("ObjectiveFunctions/VALIDATION_PERIODS"),
                                        &validationPeriodSection().row,
                                        &listSection("ObjectiveFunctions/OUTPUT_MEASURES"),
                                        &measureSection().row,
                                        &simulationFileSection().row,
                                        &observationFileSection().row,
                                        &shownAboveSection().row,
                                        &listSection("ObjectiveFunctions/OBJECTIVE_FUNCTIONS"),
                                        &objectiveSection().row,
                                        &listSection("SAVE_OUTPUT_FILES"),
                                        &savedFileSection().row};
    for (const auto& task : tasks().all()) {
      const auto sections = task->sections();
      rows.insert(rows.end(), sections.begin(), sections.end());
      for (const auto& form : furtherTaskForms()) {
        if (form->facts().name.name != task->facts().name.name) continue;
        const auto further = form->sections();
        rows.insert(rows.end(), further.begin(), further.end());
      }
    }
    rows.insert(rows.end(), {&slotsSection().row, &measureFileSection().row,
                             &listSection("ObjectiveFunctions/OUTPUT_MEASURES/FURTHER_FILES"),
                             &furtherMeasureFileSection().row, &reservedSection()});
    return SetupSchema(std::move(rows));
  }();
  return schema;
}

}  // namespace mirevo
