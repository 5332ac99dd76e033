#pragma once

#include <cstddef>
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
  std::string forPeople;  ///< `calSimErr.dat`, or a file of the setup's own while another run has that
  std::string table;      ///< `<setup>_Failures.dat` or, of the task, its like
};

/// What is needed to find out why model runs failed: a file for a person, a table for programs. They appear
/// with the first failure, so that a run without failures leaves none.
class FailedRunFile final {
 public:
  /// `names` are those of the variable parameters; `setupName` says whose failures these are; `tableHead` stands over
  /// the table.
  FailedRunFile(FailedRunPaths paths, std::string setupName, std::vector<std::string> names,
                std::vector<std::string> tableHead);

  const FailedRunPaths& paths() const { return paths_; }
  /// Before the first failure: writes another file and not `calSimErr.dat`.
  void describeIn(const std::string& pathForPeople) { paths_.forPeople = pathForPeople; }

  /// What an interrupted run has left of its failures.
  struct Earlier {
    std::vector<FailureRow> rows;  ///< one per failed evaluation
    std::size_t unknown = 0;       ///< those of which the table does not say why they failed; they are the last
  };

  /// Reads the table of an interrupted run for the evaluations with those numbers. Throws FatalError where one of
  /// the files cannot be read.
  Earlier readEarlier(const std::set<int>& numbers) const;

  /// Continues both files behind those failures. `parameterValues`: of each, by number, model scale. A file for people
  /// that holds anything else is kept under a numbered name, which is returned: it may be of another task, or of
  /// another setup in this folder. Throws FatalError.
  std::string continueBehind(std::span<const FailureRow> rows,
                             const std::map<int, std::vector<double>>& parameterValues);

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
