#pragma once

#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "run/record_file.h"

namespace mirevo {

/// `calSimErr.dat`: what a person needs to find out why model runs failed. It appears with the first failure, so that a
/// run without failures leaves none.
class FailedRunFile final {
 public:
  /// `names` are those of the variable parameters; `setupName` says whose failures these are.
  FailedRunFile(std::string path, std::string setupName, std::vector<std::string> names);

  /// One failed evaluation; `parameterValues` on the model scale, one a name. Throws FatalError when it cannot be
  /// written.
  void add(std::span<const double> parameterValues, const EvaluationResult& result);

 private:
  std::string path_;
  std::string setupName_;
  std::vector<std::string> names_;
  RecordFile file_;
};

}  // namespace mirevo
