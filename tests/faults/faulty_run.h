#pragma once

#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "integration/model_folder.h"

namespace mirevo::testing {

/// What a fault must be answered with.
struct Expectation {
  std::vector<std::string> names = {};  ///< the message names one of these files; none: it need not name one
  std::string reason = {};              ///< the system's, "No space left on device"; empty: any
  std::string otherReason = {};         ///< that of the call which follows and tells of it instead
  bool mayPassSilently = false;         ///< a run that ends well need not mention it
  bool mayFailEvaluation = false;       ///< it makes a model run fail, and is told of where such are
  bool logMayLackMessage = false;       ///< the log is what fails, or is not open yet
  bool mayBeToldInReport = false;       ///< what only the report lacks, the report says
  bool mayBeToldBehindLog = false;      ///< it happens when the log is closed, and standard error tells of it
  std::optional<int> exitCode = {};     ///< none: 0 or 1
  bool resultFileFails = false;         ///< rows that the log tells of may be missing from the result file
};

/// A folder with a setup on which faults are tried: the files of its undisturbed run are what every other is held
/// against.
class FaultyRun {
 public:
  using Environment = RunningProgram::Environment;

  /// The model's script with `script` before the model proper.
  explicit FaultyRun(const RunSettings& settings, const std::string& script = {});

  const std::string& path() const { return folder_.path(); }
  const ModelFolder& folder() const { return folder_; }
  std::string setup() const { return folder_ / "basin.kdx"; }
  const std::string& resultFileName() const { return resultFileName_; }
  std::string checksumFileName() const {
    return resultFileName_.substr(0, resultFileName_.rfind('.')) + "_Checksums.dat";
  }

  /// The environment in which a run of the setup takes the faults that `more` describes: see fault_injector.cpp.
  Environment injection(Environment more) const;

  /// Removes what runs left and puts the outputs of an "earlier run" there, which must survive all that comes; or what
  /// was there at startFromHere().
  void reset() const;
  /// From now on runs start from the folder as it is.
  void startFromHere();
  /// Runs the setup undisturbed from a fresh folder and keeps its outputs as the reference; false when it fails.
  bool makeReference(const Environment& environment = {});
  /// Runs the program once, in the marked environment by which its processes are found.
  ProgramResult run(const Environment& environment, const std::vector<std::string>& prefix = {}) const {
    return start(environment, prefix).wait();
  }
  /// The same by way of another program, `prefix`, which takes the command to run as its further arguments.
  RunningProgram start(const Environment& environment, const std::vector<std::string>& prefix = {}) const;
  /// The program as a job of that many processes; the faults of `environment` are those of one rank. One process: no
  /// job.
  ProgramResult runJob(int processes, int rank, Environment environment) const;

  /// What is wrong with a run that met a fault, besides what `program` says: whole rows, nothing lost, none left.
  std::vector<std::string> check(const ProgramResult& program, const Expectation& expected) const;
  /// What is wrong with running the setup once more, now undisturbed. A restart must take up every row that stands,
  /// also that of an evaluation that the fault made fail.
  std::vector<std::string> checkNextRun() const;
  /// What is wrong with the rows of the result file as it stands.
  std::vector<std::string> checkRows(const Expectation& expected) const;
  std::vector<std::string> checkProcesses() const;
  std::vector<std::string> checkOutputs() const;

 private:
  std::map<std::string, std::string> outputs() const;
  std::set<int> rowNumbers(const TemporaryFolder& folder) const;
  void checkMessage(const ProgramResult& program, const Expectation& expected,
                    std::vector<std::string>& problems) const;
  std::vector<std::string> checkEarlierFiles() const;
  bool hasFailedEvaluation() const;

  ModelFolder folder_;
  std::set<std::string> inputs_;  ///< the names in the folder before any run
  bool restarts_;
  std::unique_ptr<TemporaryFolder> start_;  ///< what reset() brings back
  std::string resultFileName_;
  std::string marker_;
  std::map<std::string, std::string> reference_;
};

}  // namespace mirevo::testing
