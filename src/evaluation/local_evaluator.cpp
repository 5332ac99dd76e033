#include "evaluation/local_evaluator.h"

#include <algorithm>
#include <cassert>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"

namespace mirevo {

LocalEvaluator::LocalEvaluator(ModelRunner& runner, EvaluationObserver& observer, FailedRunPolicy& failedRuns,
                               int slotCount, EarlierEvaluations* earlier, SlotUse* slotUse)
    : runner_(runner),
      observer_(observer),
      ledger_(observer, failedRuns, earlier, runner.equalMeasures(), runner.output().runComparison(),
              runner.knownResults(), slotUse),
      slots_(static_cast<std::size_t>(slotCount)) {
  assert(slotCount > 0);
}

std::vector<EvaluationResult> LocalEvaluator::evaluateParameterSets(std::span<const ParameterSet> sets,
                                                                    DispatchMode mode) {
  ledger_.requireClosed();
  ledger_.open(sets, mode, slots_.size());
  startInFreeSlots();
  while (!ledger_.isComplete()) goOn();
  return ledger_.end();
}

void LocalEvaluator::submit(std::span<const ParameterSet> sets) {
  ledger_.open(sets, DispatchMode::task);
  startInFreeSlots();
}

EvaluationResult LocalEvaluator::awaitFirst() {
  assert(ledger_.isOpen());
  while (!ledger_.isFirstComplete()) goOn();
  return ledger_.takeFirst();
}

UnfinishedBatch LocalEvaluator::takeUnfinished() {
  runner_.endReading();
  for (Slot& slot : slots_) slot.running.reset();
  return ledger_.takeUnfinished();
}

void LocalEvaluator::goOn() {
  if (!takeFinished()) runner_.launcher().waitForChange(kPollSeconds, runner_.readingSockets());
  stopIfCancelled();
  startInFreeSlots();
}

void LocalEvaluator::startInFreeSlots() {
  for (int slot = 1; slot <= static_cast<int>(slots_.size()); ++slot) {
    const Slot& state = slots_[static_cast<std::size_t>(slot - 1)];
    if (!state.running && !state.isGivenUp) startNext(slot);
  }
}

void LocalEvaluator::startNext(int slot) {
  while (const auto place = ledger_.takeNext()) {
    stopIfCancelled();
    if (!isUsable(slot)) return ledger_.putBack(*place);
    runner_.setStandard(ledger_.standard());
    auto failure = runner_.prepareModelRun(ledger_.set(*place), slot, ledger_.numberOf(*place), ledger_.isFinalRun());
    if (!failure) {
      ledger_.markInitiated(*place, runTimeClock());
      Running running;
      running.place = *place;
      slots_[static_cast<std::size_t>(slot - 1)].running = std::move(running);
      return;
    }
    ledger_.finish(*place, runner_.failedResult(std::move(*failure)));
  }
}

bool LocalEvaluator::isUsable(int slot) {
  std::vector<std::string> warnings;
  const auto damage = runner_.renewIfDamaged(slot, warnings, [this] { stopIfCancelled(); });
  for (const std::string& text : warnings) observer_.warning(text);
  if (!damage) return true;
  slots_[static_cast<std::size_t>(slot - 1)].isGivenUp = true;
  const bool isLast = std::all_of(slots_.begin(), slots_.end(), [](const Slot& state) { return state.isGivenUp; });
  if (isLast) failWithoutSlots(*damage);
  observer_.warning(givenUpWarning(fmt::format("Slot {}", slot), *damage));
  return false;
}

bool LocalEvaluator::takeFinished() {
  bool any = false;
  for (int slot = 1; slot <= static_cast<int>(slots_.size()); ++slot) {
    auto& running = slots_[static_cast<std::size_t>(slot - 1)].running;
    if (!running) continue;
    const std::size_t place = running->place;
    if (!running->ended) {
      if (!isRead(slot, *running)) continue;
      any = true;  // others may have waited to be read
    }
    // The slot waits, too, as the folder of a failed run may be kept.
    if (!ledger_.judge(place, *running->ended)) continue;
    any = true;
    EvaluationResult result = std::move(*running->ended);
    running.reset();
    if (ledger_.isFolderWanted(place, result)) runner_.keepFailedFolder(slot, ledger_.numberOf(place), result.warnings);
    ledger_.finish(place, std::move(result), runner_.launcher().leftBehind(slot));
    startNext(slot);
  }
  return any;
}

bool LocalEvaluator::isRead(int slot, Running& running) {
  if (!running.hasEnded) {
    std::int32_t executing = 0;
    std::int32_t status = 0;
    runner_.launcher().isExecuting(slot, executing, status);
    if (executing != 0) return false;
    ledger_.markEnded(running.place, runTimeClock());
    running.hasEnded = true;
  }
  const auto look = [this] { stopIfCancelled(); };
  const bool isBeside = runner_.isBeingRead(slot) || !isOnlyOne(slot);
  running.ended = isBeside ? runner_.collectBeside(slot, look) : runner_.collect(slot, look);
  if (!running.ended) return false;
  runner_.keepOutputFiles(slot, ledger_.numberOf(running.place), *running.ended,
                          ledger_.repeatedMeasures(running.place));
  return true;
}

/// Then there is nothing to be done while its results are read.
bool LocalEvaluator::isOnlyOne(int slot) const {
  for (int other = 1; other <= static_cast<int>(slots_.size()); ++other) {
    const auto& running = slots_[static_cast<std::size_t>(other - 1)].running;
    if (other != slot && running && !running->ended) return false;
  }
  return true;
}

void LocalEvaluator::stopIfCancelled() {
  if (!observer_.isCancelled()) return;
  observer_.message("Simulation cancelled");
  runner_.endReading();
  runner_.launcher().haltProcesses();
  throw RunCancelled();
}

void LocalEvaluator::settleAggregates(std::span<EvaluationResult> sample) {
  mirevo::settleAggregates(runner_.aggregator(), sample, observer_);
}

}  // namespace mirevo
