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
  std::string_view stem;
  std::string_view extension;
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
  RunFile pairs;                    ///< how many observations the initial run and runs with fewer meet
  std::span<const RunFile> tables;  ///< in which the task gives what it found
};

/// The names of all that a run makes. Nothing else builds such a name.
namespace run_files {

inline constexpr RunFile kLog{"", ".log", false, true, "Mirevo "};
inline constexpr RunFile kTerminationLog{"_Termination", ".log", false, false, ""};
inline constexpr RunFile kMessages{"", "._spi_", false, false, ""};
inline constexpr RunFile kKill{"", "._kill_", false, false, ""};
inline constexpr RunFile kSeries{"_Series", ".dat"};
inline constexpr RunFile kReport{"_Report", ".html", false, false, "content=\"default-src 'none'; script-src"};
inline constexpr RunFile kBand{"_Band_", ".csv", true, false, "# Band of "};
inline constexpr RunFile kSavedFolder{"_Saved", ""};
/// These two stand beside the setup, or in the folder that it names for them.
inline constexpr RunFile kFailedFolder{"_Failed", "", true};
inline constexpr RunFile kProcessFolder{"_Process", "", true};

/// What keeps a second run away (common/file_lock): from the files with the setup's name, and from the process folders,
/// beside which it lies; the runs of a job share that.
inline constexpr RunFile kRunLock{"", "._lock_", false, false, ""};
inline constexpr RunFile kProcessLock{"_Process", "._lock_", false, false, ""};

/// Tables of analyses.
inline constexpr RunFile kCovariance{"_Covariance", ".dat", false, true};
inline constexpr RunFile kCorrelation{"_Correlation", ".dat", false, true};
inline constexpr RunFile kParameterLimits{"_ParameterLimits", ".dat", false, true};
inline constexpr RunFile kJacobian{"_Jacobian", ".dat", false, true};
inline constexpr RunFile kSensitivities{"_Sensitivities", ".dat", false, true};
inline constexpr RunFile kQuantiles{"_Quantiles", ".dat", false, true};
inline constexpr RunFile kSampleCorrelation{"_SampleCorrelation", ".dat", false, true};
inline constexpr std::array kUncertaintyTables{kQuantiles, kSampleCorrelation};
inline constexpr std::array kSensitivityTables{kCovariance, kCorrelation, kParameterLimits, kJacobian, kSensitivities};

inline constexpr std::string_view kRestartMark = "# What the results beside this file depend on";
inline constexpr std::string_view kSimulatedMark = "v0veriM";  ///< its number's bytes, without the version

/// Scenario runs and the uncertainty analysis.
inline constexpr ResultFileNames kPlain{{"", ".dat", false, true},
                                        {"_Restart", ".dat", false, false, kRestartMark},
                                        {"_Simulated", ".bin", false, false, kSimulatedMark},
                                        {"_Run", ".dat", false, true},
                                        {"_Failures", ".dat", false, true},
                                        {"_Pairs", ".dat", false, true},
                                        kUncertaintyTables};
inline constexpr ResultFileNames kSensitivity{{"_Sensitivity", ".dat"},
                                              {"_Sensitivity_Restart", ".dat", false, false, kRestartMark},
                                              {"_Sensitivity_Simulated", ".bin", false, false, kSimulatedMark},
                                              {"_Sensitivity_Run", ".dat"},
                                              {"_Sensitivity_Failures", ".dat"},
                                              {"_Sensitivity_Pairs", ".dat"},
                                              kSensitivityTables};
inline constexpr ResultFileNames kOptimisation{{"_Optimisation", ".dat"},
                                               {"_Optimisation_Restart", ".dat", false, false, kRestartMark},
                                               {"_Optimisation_Simulated", ".bin", false, false, kSimulatedMark},
                                               {"_Optimisation_Run", ".dat"},
                                               {"_Optimisation_Failures", ".dat"},
                                               {"_Optimisation_Pairs", ".dat"},
                                               {}};

/// Stands beside the setup without its name, for the run that was the first of those going on in the folder; another
/// has a file of its own.
inline constexpr RunFile kFailedRuns{"calSimErr", ".dat", false, false, "# Failed evaluations of "};
inline constexpr RunFile kFailedRunsLock{"calSimErr", "._lock_", false, false, ""};
inline constexpr RunFile kOwnFailedRuns{"_calSimErr", ".dat", false, false, "# Failed evaluations of "};

/// An empty file by which a process folder, or a copy of one, is known. A model that removes its logs leaves it.
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
/// Whether the first lines of the file are those of a run's.
bool carriesMark(const std::string& path, const RunFile& file);
/// Why a run must not rename, replace or remove what is at `path`, as a sentence with the remedy. Empty where it may:
/// there is nothing, a device, a file that carries the mark or has no more than a part of the head; for the folders of
/// runs, one that is empty or holds what only theirs do, hidden files aside.
std::string whyNotReplaceable(const std::string& path, const RunFile& file);
/// Throws FatalError, with `path` and that sentence, unless it may be replaced.
void requireReplaceable(const std::string& path, const RunFile& file);

/// The file's name without a folder, for messages: `calSimErr.dat`, `basin_Failures.dat`.
std::string fileNameOf(std::string_view path);

}  // namespace mirevo
