#pragma once

#include <memory>
#include <string>

#include "evaluation/local_evaluator.h"
#include "platform/processes/posix_process_launcher.h"

namespace mirevo::bench {

/// A calibration of the test model (365 values, two parameters) in a folder of its own, which can be run in three ways.
class Calibration final {
 public:
  /// `fixedParameters` are further lines of the model's parameter file.
  Calibration(std::string folder, int slotCount, const std::string& fixedParameters);
  ~Calibration();
  Calibration(const Calibration&) = delete;
  Calibration& operator=(const Calibration&) = delete;

  /// Seconds for `count` runs of the batch by posix_spawn and wait alone.
  double runBare(int count);
  /// Seconds for `count` evaluations by a LocalEvaluator in this process, in one batch.
  double evaluate(int count);
  /// Seconds per evaluation of the built program, including its start and end: a search by DDS (with its final run) in
  /// one slot, an uncertainty analysis in several.
  double runProgram(int count);

 private:
  void writeModel(const std::string& fixedParameters) const;
  ModelDescription describe() const;

  std::string folder_;
  int slotCount_;
  PosixProcessLauncher launcher_;
  std::unique_ptr<EvaluationObserver> observer_;
  FailedRunPolicy failedRuns_{10};
  std::unique_ptr<ParameterModel> parameters_;
  std::unique_ptr<ObjectiveAggregator> aggregator_;
  std::unique_ptr<ModelRunner> runner_;
  std::unique_ptr<LocalEvaluator> evaluator_;
};

}  // namespace mirevo::bench
