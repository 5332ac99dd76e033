#pragma once

#include <map>
#include <set>
#include <span>
#include <string>
#include <vector>

#include "run/results/failure_table.h"
#include "run/results/record_file.h"

namespace mirevo {

/// Where the failures of a run are kept.
struct FailedRunPaths {
  std::string forPeople;  ///< `calSimErr.dat`
  std::string table;      ///< `<setup>_Failures.dat`
};

/// What is needed to find out why model runs failed: `calSimErr.dat` for a person, `<setup>_Failures.dat` for programs.
/// They appear with the first failure, so that a run without failures leaves none.
class FailedRunFile final {
 public:
  /// `names` are those of the variable parameters; `setupName` says whose failures these are; `tableHead` stands over
  /// the table.
  FailedRunFile(FailedRunPaths paths, std::string setupName, std::vector<std::string> names,
                std::vector<std::string> tableHead);

  const FailedRunPaths& paths() const { return paths_; }

  /// Takes up the table that an interrupted run of the same setup has left: keeps the rows of the evaluations with
  /// those numbers and goes on behind them. `parameterValues`: theirs, by number, model scale. The file for people is
  /// made of the same. Returns why they failed, by number; nothing where there is no table. Throws FatalError when a
  /// file cannot be written.
  std::map<int, EvaluationFailure> takeUp(const std::map<int, std::vector<double>>& parameterValues);

  /// One failed evaluation; `parameterValues` on the model scale, one a name. Throws FatalError when it cannot be
  /// written.
  void add(std::span<const double> parameterValues, const EvaluationResult& result);

  /// Throws FatalError when what was added did not all arrive.
  void close();

 private:
  std::string headLine() const;
  std::string record(std::span<const double> parameterValues, const FailureRow& row) const;

  FailedRunPaths paths_;
  std::string setupName_;
  std::vector<std::string> names_;
  std::vector<std::string> tableHead_;
  RecordFile forPeople_;
  RecordFile table_;
};

/// Removes the folders of failed model runs that an earlier run has kept, but those of evaluations with `numbers`.
/// `prefix`: what their names begin with, up to the number. Returns a line for each that could not be removed.
std::vector<std::string> removeFailedRunFolders(const std::string& prefix, const std::set<int>& numbers);

}  // namespace mirevo
