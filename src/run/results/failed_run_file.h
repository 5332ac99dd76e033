#pragma once

#include <map>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "run/results/record_file.h"

namespace mirevo {

/// Beside the setup file, whatever that is called.
inline constexpr std::string_view kFailedRunFileName = "calSimErr.dat";

/// `calSimErr.dat`: what a person needs to find out why model runs failed. It appears with the first failure, so that a
/// run without failures leaves none.
class FailedRunFile final {
 public:
  /// `names` are those of the variable parameters; `setupName` says whose failures these are.
  FailedRunFile(std::string path, std::string setupName, std::vector<std::string> names);

  const std::string& path() const { return path_; }

  /// Takes up the file that an interrupted run of the same setup has left: keeps the records of the evaluations with
  /// those numbers and goes on behind them. Returns why they failed, by number; nothing where the file is not there or
  /// another setup's. Throws FatalError when it cannot be written.
  std::map<int, EvaluationFailure> takeUp(const std::set<int>& numbers);

  /// One failed evaluation; `parameterValues` on the model scale, one a name. Throws FatalError when it cannot be
  /// written.
  void add(std::span<const double> parameterValues, const EvaluationResult& result);

  /// Throws FatalError when what was added did not all arrive.
  void close() { file_.close(); }

 private:
  std::string headLine() const;

  std::string path_;
  std::string setupName_;
  std::vector<std::string> names_;
  RecordFile file_;
};

/// Removes the folders of failed model runs that an earlier run has kept, but those of evaluations with `numbers`.
/// `prefix`: what their names begin with, up to the number. Returns a line for each that could not be removed.
std::vector<std::string> removeFailedRunFolders(const std::string& prefix, const std::set<int>& numbers);

}  // namespace mirevo
