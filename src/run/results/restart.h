#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/clock.h"
#include "evaluation/earlier_evaluations.h"
#include "run/results/pairs_file.h"
#include "run/results/result_table.h"
#include "run/results/run_record.h"
#include "run/results/simulated_values_file.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The files of a run that are needed to continue it.
struct RestartFiles {
  std::string results;
  std::string settings;         ///< what the results depend on
  std::string simulatedValues;  ///< if the task uses them
  std::string record;
  std::string failures;
  std::string pairs;
  std::string checksums;  ///< of the rows of the results
  std::string unkept;
};

/// The paths of these files; `filePrefix` is folder and name of the setup.
RestartFiles restartFiles(const std::string& filePrefix, const ResultFileNames& names);

/// Throws FatalError: the earlier run cannot be continued, for this reason.
[[noreturn]] void refuseToGoOn(std::string_view detail);

/// An earlier run that is to be continued.
struct EarlierRun {
  ResultRows rows;  ///< in the order of their numbers
  std::string started;
  std::vector<std::string> restarted;
  /// DDS: the searches that this one continues.
  std::vector<EarlierSearch> searches;
  std::vector<std::string> notes;  ///< for the log, one line each
};

/// The earlier run whose results are on disk, to be continued as the setup asks; empty if there is none. Rows that are
/// cut off, or that a raised budget makes obsolete, are left out. Throws FatalError, naming what has changed, if the
/// setup is not that of the earlier run, and, naming the lines, if rows were changed or do not hold. `record` is that
/// of the earlier run; early versions of the program wrote none.
std::optional<EarlierRun> findEarlierRun(const RestartFiles& files, const RunConfig& config,
                                         const ResultColumns& columns, std::optional<RunRecord> record);

/// What the files beside the rows have of their evaluations.
struct BesideRows {
  std::map<int, EvaluationFailure> failures;  ///< the reasons of the failed ones
  PairsByNumber pairs;                        ///< of the first successful run and of runs that have others
  std::map<int, KeptValues> keptValues;       ///< of the successful ones, if the task uses any
};

/// The evaluations of an earlier run.
std::unique_ptr<EarlierRecords> earlierRecords(ResultRows rows, BesideRows beside);

/// The number of the first successful evaluation in `rows`, which are in the order of their numbers, if `pairs` has not
/// `count` of it, and of none before it; otherwise 0.
int firstWithoutPairs(const ResultRows& rows, const PairsByNumber& pairs, std::size_t count);

/// The settings of a run on disk. Without them its rows cannot be taken up, so they are there as long as it goes on.
class RestartSettingsFile final {
 public:
  using Clock = std::function<double()>;
  explicit RestartSettingsFile(std::string path, Clock clock = runTimeClock)
      : path_(std::move(path)), clock_(std::move(clock)) {}

  /// Throws FatalError.
  void write(const RunConfig& config);
  /// To be called now and then: writes the file again if something has removed or emptied it, which is looked for once
  /// a second. Returns a warning, once, where that fails or another program has replaced or changed the file.
  std::string keep();
  /// The same at once, for the end of a run. False, with the system's reason, when that fails.
  bool putBack(std::string& reason);

  const std::string& path() const { return path_; }

 private:
  bool writeText(std::string& reason);
  bool isAnother() const;

  std::string path_;
  Clock clock_;
  std::string text_;
  double nextLook_ = 0.0;
  std::uint64_t inode_ = 0;  ///< of the file as written; 0: not known
  bool hasWarned_ = false;
};

}  // namespace mirevo
