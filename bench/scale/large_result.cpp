#include "large_result.h"

#include <cmath>
#include <span>
#include <utility>
#include <vector>

#include "evaluation/evaluator.h"
#include "parameters/parameter_model.h"
#include "run/results/run_results.h"
#include "run/setup/setup_reader.h"

namespace mirevo::bench {
namespace {

/// Thrown where the run is to be cut off.
struct Cut {};

/// Writes a row for each set, as a run does.
class RowWriter final : public Evaluator {
 public:
  RowWriter(const SearchSpace& space, ResultFile& table, int most) : space_(space), table_(table), most_(most) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
    std::vector<EvaluationResult> results;
    for (const ParameterSet& set : sets) {
      if (number_ == most_) throw Cut();
      double value = 0.0;
      for (const double x : set) value += (x - 3.0) * (x - 3.0) + 1.0 - std::cos(5.0 * (x - 3.0));
      EvaluationResult& result = results.emplace_back();
      result.number = ++number_;
      result.measureValues = {value};
      result.objectiveValues = {value};
      result.aggregate = value;
      table_.addRow(resultRow(ToModelScale(space_, set), result));
    }
    return results;
  }

 private:
  const SearchSpace& space_;
  ResultFile& table_;
  int most_;
  int number_ = 0;
};

}  // namespace

void leaveInterruptedSearch(const std::string& setup, int evaluations) {
  RunLog log;
  const RunConfig config = readSetupFile(setup, log);
  const ParameterModel parameters(config.parameters, config.constraints);
  ObjectiveAggregator aggregator(config.objectives, config.aggregationMethod);
  const std::string prefix = setup.substr(0, setup.rfind('.'));
  RunResults results(config, parameters.searchSpace(), prefix);
  results.setSources(measureSources(config.measures, config.measureFile, config.baseFolder));
  results.open(config, {}, aggregator, log);
  RowWriter evaluator(parameters.searchSpace(), results.table(), evaluations);
  try {
    config.task->run({parameters.searchSpace(), config.parameters, config.measures, config.objectives, evaluator, log});
  } catch (const Cut&) {
  }
}

}  // namespace mirevo::bench
