#pragma once

#include <array>
#include <span>
#include <string>
#include <string_view>

namespace mirevo {

/// How something that a run makes is named: `stem`, a number where it is one of several, `extension`, behind the name
/// of the setup. What an earlier run made is kept with a number before the extension: `basin_Saved.2`,
/// `basin_Optimisation.1.dat`.
struct RunFile {
  std::string_view stem = {};
  std::string_view extension = {};
  bool isNumbered = false;   ///< a number follows the stem
  bool mayBeModels = false;  ///< so plain a name that only the content tells it from a file of the model
  /// What the first lines of every such file contain, in every version of the program. Empty: nothing, and the name is
  /// so peculiar that it is taken for a run's.
  std::string_view mark = "# Mirevo ";

  bool operator==(const RunFile&) const = default;
};

/// What a run of one task leaves, so that a run of another task does not touch it.
struct ResultFileNames {
  RunFile results;                  ///< the table of evaluations
  RunFile restart;                  ///< the settings that they depend on
  RunFile simulatedValues;          ///< of each evaluation, where the task works with them
  RunFile record;                   ///< the account of the run
  RunFile failures;                 ///< why evaluations failed
  RunFile pairs;                    ///< what the first successful run, and runs that differ from it, are judged by
  RunFile checksums;                ///< of the rows of the table of evaluations
  RunFile unkept;                   ///< output files that could not be kept
  std::span<const RunFile> tables;  ///< in which the task gives what it found
};

/// The names of all that a run makes. Nothing else builds such a name.
namespace run_files {

inline constexpr RunFile kLog{.extension = ".log", .mayBeModels = true, .mark = "Mirevo "};
inline constexpr RunFile kTerminationLog{.stem = "_Termination", .extension = ".log", .mark = ""};
inline constexpr RunFile kMessages{.extension = "._spi_", .mark = ""};
inline constexpr RunFile kKill{.extension = "._kill_", .mark = ""};
inline constexpr RunFile kSeries{"_Series", ".dat"};
inline constexpr RunFile kScenarioSeries{"_ScenarioSeries", ".dat"};
inline constexpr RunFile kReport{
    .stem = "_Report", .extension = ".html", .mark = "content=\"default-src 'none'; script-src"};
inline constexpr RunFile kBand{.stem = "_Band_", .extension = ".csv", .isNumbered = true, .mark = "# Band of "};
inline constexpr RunFile kSobolSeries{
    .stem = "_SobolSeries_", .extension = ".csv", .isNumbered = true, .mark = "# Sobol' indices of "};
/// Beside a band of the simulated values: that of what would be observed, with the errors.
inline constexpr RunFile kTotalBand{
    .stem = "_TotalBand_", .extension = ".csv", .isNumbered = true, .mark = "# Band of "};
inline constexpr RunFile kSavedFolder{"_Saved", ""};
/// These two stand beside the setup, or in the folder that it names for them.
inline constexpr RunFile kFailedFolder{"_Failed", "", true};
inline constexpr RunFile kProcessFolder{"_Process", "", true};
/// That of a check of the setup, which may be made while a run of it is going on.
inline constexpr RunFile kCheckFolder{"_Check_Process", "", true};

/// What keeps a second run away (common/file_lock): from the files with the setup's name, and from the process folders,
/// beside which it lies; the runs of a job share that.
inline constexpr RunFile kRunLock{.extension = "._lock_", .mark = ""};
inline constexpr RunFile kProcessLock{.stem = "_Process", .extension = "._lock_", .mark = ""};

/// Tables of analyses.
inline constexpr RunFile kCovariance{"_Covariance", ".dat", false, true};
inline constexpr RunFile kCorrelation{"_Correlation", ".dat", false, true};
inline constexpr RunFile kParameterLimits{"_ParameterLimits", ".dat", false, true};
inline constexpr RunFile kJacobian{"_Jacobian", ".dat", false, true};
inline constexpr RunFile kSensitivities{"_Sensitivities", ".dat", false, true};
inline constexpr RunFile kMorris{"_Morris", ".dat", false, true};
inline constexpr RunFile kQuantiles{"_Quantiles", ".dat", false, true};
inline constexpr RunFile kSampleCorrelation{"_SampleCorrelation", ".dat", false, true};
inline constexpr RunFile kChains{"_Chains", ".dat", false, true};
inline constexpr RunFile kPosterior{"_Posterior", ".dat", false, true};
inline constexpr RunFile kMarginals{"_Marginals", ".dat", false, true};
inline constexpr RunFile kConvergence{"_Convergence", ".dat", false, true};
inline constexpr RunFile kSampleSensitivities{"_SampleSensitivities", ".dat", false, true};
inline constexpr RunFile kGlue{"_Glue", ".dat", false, true};
inline constexpr std::array kUncertaintyTables{kQuantiles, kSampleCorrelation, kSampleSensitivities, kGlue,
                                               kChains,    kPosterior,         kMarginals,           kConvergence};
inline constexpr RunFile kSobol{"_Sobol", ".dat", false, true};
inline constexpr RunFile kSobolConvergence{"_SobolConvergence", ".dat", false, true};
inline constexpr std::array kSensitivityTables{kCovariance,    kCorrelation, kParameterLimits, kJacobian,
                                               kSensitivities, kMorris,      kSobol,           kSobolConvergence};

/// Those of a search by residuals.
inline constexpr RunFile kEstimateCovariance{"_Optimisation_Covariance", ".dat", false, true};
inline constexpr RunFile kEstimateCorrelation{"_Optimisation_Correlation", ".dat", false, true};
inline constexpr RunFile kEstimateLimits{"_Optimisation_ParameterLimits", ".dat", false, true};
inline constexpr RunFile kEstimateJacobian{"_Optimisation_Jacobian", ".dat", false, true};
/// Those of a search that is repeated.
inline constexpr RunFile kRepetitions{"_Optimisation_Repetitions", ".dat"};
inline constexpr RunFile kRepetitionRows{"_Optimisation_RepetitionRows", ".dat"};

/// Those of a search that finds a front; the last one is no table of common/data_table alone, but in the form of
/// kScenarioSeries.
inline constexpr RunFile kPareto{"_Pareto", ".dat", false, true};
inline constexpr RunFile kParetoCourse{"_ParetoCourse", ".dat", false, true};
inline constexpr RunFile kParetoSeries{"_ParetoSeries", ".dat", false, true};
inline constexpr std::array kSearchTables{kEstimateCovariance, kEstimateCorrelation, kEstimateLimits, kEstimateJacobian,
                                          kRepetitions,        kRepetitionRows,      kPareto,         kParetoCourse,
                                          kParetoSeries};

/// What all tasks call alike behind their own stem.
constexpr RunFile restartFile(std::string_view stem) {
  return {.stem = stem, .extension = ".dat", .mark = "# What the results beside this file depend on"};
}
constexpr RunFile simulatedFile(std::string_view stem) {
  return {.stem = stem, .extension = ".bin", .mark = "v0veriM"};  // the bytes of its first number but for the version
}

/// Scenario runs and the uncertainty analysis.
inline constexpr ResultFileNames kPlain{{"", ".dat", false, true},
                                        restartFile("_Restart"),
                                        simulatedFile("_Simulated"),
                                        {"_Run", ".dat", false, true},
                                        {"_Failures", ".dat", false, true},
                                        {"_Pairs", ".dat", false, true},
                                        {"_Checksums", ".dat", false, true},
                                        {"_NotKept", ".dat", false, true},
                                        kUncertaintyTables};
inline constexpr ResultFileNames kSensitivity{
    {"_Sensitivity", ".dat"},           restartFile("_Sensitivity_Restart"), simulatedFile("_Sensitivity_Simulated"),
    {"_Sensitivity_Run", ".dat"},       {"_Sensitivity_Failures", ".dat"},   {"_Sensitivity_Pairs", ".dat"},
    {"_Sensitivity_Checksums", ".dat"}, {"_Sensitivity_NotKept", ".dat"},    kSensitivityTables};
inline constexpr ResultFileNames kOptimisation{
    {"_Optimisation", ".dat"},           restartFile("_Optimisation_Restart"), simulatedFile("_Optimisation_Simulated"),
    {"_Optimisation_Run", ".dat"},       {"_Optimisation_Failures", ".dat"},   {"_Optimisation_Pairs", ".dat"},
    {"_Optimisation_Checksums", ".dat"}, {"_Optimisation_NotKept", ".dat"},    kSearchTables};

inline constexpr std::string_view kFailuresMark = "# Failed evaluations of ";
/// Stands beside the setup without its name, for the run that was the first of those going on in the folder; another
/// has a file of its own.
inline constexpr RunFile kFailedRuns{.stem = "calSimErr", .extension = ".dat", .mark = kFailuresMark};
inline constexpr RunFile kFailedRunsLock{.stem = "calSimErr", .extension = "._lock_", .mark = ""};
inline constexpr RunFile kOwnFailedRuns{.stem = "_calSimErr", .extension = ".dat", .mark = kFailuresMark};

/// The file by which a process folder, or a copy of one, is known; a model that removes its logs leaves it. It is empty
/// or says what the files of the folder are copies of (processes/kept_files).
inline constexpr char kFolderMark[] = ".mirevo_process";
/// The file in a process folder that receives the output of its batch.
inline constexpr char kBatchLog[] = "mirevo_batch.log";

}  // namespace run_files

/// All of them whose names begin with the setup's.
std::span<const RunFile> runFilesOfSetup();

/// The path of a run's file; `prefix` is folder and name of the setup. Of a numbered one what stands before the number.
std::string runFilePath(std::string_view prefix, const RunFile& file);
/// That of a numbered one.
std::string runFilePath(std::string_view prefix, const RunFile& file, int number);
/// That of a file beside the setup without its name, `calSimErr.dat`.
std::string pathBeside(std::string_view prefix, const RunFile& file);
/// The file's name without a folder, for messages: `calSimErr.dat`, `basin_Failures.dat`.
std::string fileNameOf(std::string_view path);

}  // namespace mirevo
