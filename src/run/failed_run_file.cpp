#include "run/failed_run_file.h"

#include <utility>

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {

FailedRunFile::FailedRunFile(std::string path, std::string setupName, std::vector<std::string> names)
    : path_(std::move(path)), setupName_(std::move(setupName)), names_(std::move(names)) {}

void FailedRunFile::add(std::span<const double> parameterValues, const EvaluationResult& result) {
  std::string record;
  if (!file_.isOpen()) {
    file_.open(path_);
    record = fmt::format("# Failed evaluations of {}\n", setupName_);
  }
  record += fmt::format("\nEvaluation No. {}\n   {}\n", result.number, result.failure->reason);
  for (std::size_t i = 0; i < names_.size(); ++i) {
    record += fmt::format("   {} = {}\n", names_[i], formatReal(parameterValues[i]));
  }
  if (!result.failure->lastOutput.empty()) {
    record += "   Last output:\n";
    for (const std::string& line : result.failure->lastOutput) record += fmt::format("   | {}\n", line);
  }
  file_.append(record);
}

}  // namespace mirevo
