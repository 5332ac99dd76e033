#include "evaluation/earlier_evaluations.h"

#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {

namespace {

class RecordsByNumber final : public EarlierRecords {
 public:
  explicit RecordsByNumber(std::map<int, EarlierRecord> records) : records_(std::move(records)) {}

  std::optional<EarlierRecord> take(int number) override {
    auto node = records_.extract(number);
    return node.empty() ? std::nullopt : std::optional(std::move(node.mapped()));
  }
  std::vector<double> measuresOf(int number) const override {
    const auto found = records_.find(number);
    return found == records_.end() ? std::vector<double>() : found->second.result.measureValues;
  }
  bool isRepeat(int number) const override {
    const auto found = records_.find(number);
    return found != records_.end() && found->second.isRepeat;
  }

 private:
  std::map<int, EarlierRecord> records_;
};

}  // namespace

EarlierEvaluations::EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator,
                                       std::unique_ptr<EarlierRecords> records)
    : space_(std::move(space)), aggregator_(aggregator), records_(std::move(records)) {}

EarlierEvaluations::EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator,
                                       std::map<int, Record> records)
    : EarlierEvaluations(std::move(space), aggregator, std::make_unique<RecordsByNumber>(std::move(records))) {}

std::optional<EvaluationResult> EarlierEvaluations::take(int number, std::span<const double> set) {
  auto record = records_->take(number);
  if (!record) return std::nullopt;
  requireSameValues(number, record->parameterValues, set);
  repeated_.erase(number);
  EvaluationResult result = std::move(record->result);
  result.number = number;
  // The transformation may have become known only after the evaluation was recorded, or may be determined again.
  result.aggregate = result.ok() ? aggregator_.aggregate(result.objectiveValues) : kFailedRunValue;
  return result;
}

void EarlierEvaluations::requireSameValues(int number, std::span<const double> earlier,
                                           std::span<const double> set) const {
  const auto other = findOtherValue(space_, set, earlier);
  if (!other) return;
  fatalError("Error: Unable to continue the earlier run",
             fmt::format("evaluation No. {} has {} = {} in the earlier results, and {} now, though the settings are "
                         "the same.\nEither the results were changed, or they were written by another version of the "
                         "program, or on a machine that rounds otherwise.\nRestart = 0 starts afresh and keeps them "
                         "under a numbered name.",
                         number, space_.names[*other], formatReal(earlier[*other]),
                         formatReal(toModelScale(space_, *other, set[*other]))));
}

}  // namespace mirevo
