#include "evaluation/ranks/rank_evaluator.h"

#include <algorithm>
#include <cassert>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"

namespace mirevo {
namespace {

/// Longest time between two checks for cancellation; a message ends the wait.
constexpr double kMasterPollSeconds = 0.25;

void sendToWorkers(Job& job, RankMessage tag, const std::string& content, const std::set<int>& lost = {}) {
  for (int rank = 1; rank < job.processCount(); ++rank) {
    if (!lost.contains(rank)) job.send(rank, static_cast<int>(tag), content);
  }
}

}  // namespace

RankEvaluator::RankEvaluator(ModelRunner& runner, Job& job, WorkerWatch& watch, EvaluationObserver& observer,
                             FailedRunPolicy& failedRuns, EarlierEvaluations* earlier, SlotUse* slotUse)
    : runner_(runner),
      job_(job),
      watch_(watch),
      observer_(observer),
      ledger_(observer, failedRuns, earlier, runner.equalMeasures(), runner.output().runComparison(),
              runner.knownResults(), slotUse),
      workers_(static_cast<std::size_t>(job.processCount() - 1)) {}

std::vector<EvaluationResult> RankEvaluator::evaluateParameterSets(std::span<const ParameterSet> sets,
                                                                   DispatchMode mode) {
  ledger_.requireClosed();
  ledger_.open(sets, mode, workers_.size());
  startOnFreeWorkers();
  while (!ledger_.isComplete()) goOn();
  return ledger_.end();
}

void RankEvaluator::submit(std::span<const ParameterSet> sets) {
  ledger_.open(sets, DispatchMode::task);
  startOnFreeWorkers();
}

EvaluationResult RankEvaluator::awaitFirst() {
  assert(ledger_.isOpen());
  while (!ledger_.isFirstComplete()) goOn();
  return ledger_.takeFirst();
}

void RankEvaluator::goOn() {
  const auto message = job_.receive(kMasterPollSeconds);
  if (message) handle(*message);
  finishAnswered();  // before the loss of the worker that answered ends the run
  passOnLost();
  finishAnswered();
  stopIfCancelled();
  startOnFreeWorkers();
}

void RankEvaluator::startOnFreeWorkers() {
  for (auto rank = free_.begin(); rank != free_.end();) {
    if (!startNext(*rank++)) return;  // which has removed it
  }
}

void RankEvaluator::noteWhetherFree(int rank) {
  const Worker& each = worker(rank);
  if (each.place && !each.set && !each.isGivenUp && !watch_.heldBy(rank) && !watch_.isLost(rank)) {
    free_.insert(rank);
  } else {
    free_.erase(rank);
  }
}

bool RankEvaluator::startNext(int rank) {
  while (const auto place = ledger_.takeNext()) {
    stopIfCancelled();
    auto failure = runner_.findUnrunnable(ledger_.set(*place));
    if (!failure) {
      job_.send(rank, static_cast<int>(RankMessage::set),
                encode(SetMessage{ledger_.numberOf(*place), ledger_.set(*place), ledger_.standard(),
                                  ledger_.repeatedMeasures(*place), ledger_.isFinalRun()}));
      worker(rank).set = *place;
      watch_.handOut(rank, ledger_.numberOf(*place));
      noteWhetherFree(rank);
      ledger_.markInitiated(*place, runTimeClock());
      worker(rank).running = place;
      return true;
    }
    ledger_.finish(*place, runner_.failedResult(std::move(*failure)));
  }
  return false;
}

void RankEvaluator::handle(const Message& message) {
  if (watch_.hear(message.rank)) {
    observer_.message(fmt::format("W{} answers again", nameOf(message.rank).substr(1)));
    noteWhetherFree(message.rank);
  }
  switch (static_cast<RankMessage>(message.tag)) {
    case RankMessage::ready: {
      const ReadyMessage& place = worker(message.rank).place.emplace(decodeReady(message.content));
      observer_.message(
          fmt::format("Worker {} is ready on {}, process folder {}", message.rank, place.host, place.processFolder));
      noteWhetherFree(message.rank);
      for (const std::string& text : place.warnings) {  // other workers may say the same
        if (warningsOfFolders_.insert(text).second)
          observer_.warning(fmt::format("{}: {}", nameOf(message.rank), text));
      }
      return;
    }
    case RankMessage::result:
      return takeResult(message.rank, decodeResult(message.content));
    case RankMessage::givenUp:
      return giveUp(message.rank, decodeGivenUp(message.content));
    case RankMessage::alive:
      return;
    case RankMessage::failure:
      return takeFailure(message.rank, decodeFailure(message.content));
    default:
      fatalError(kCommunicationFailed,
                 fmt::format("the worker with rank {} sent a message of unknown kind {}", message.rank, message.tag));
  }
}

void RankEvaluator::takeResult(int rank, ResultMessage message) {
  const WorkerWatch::Held held = takeHeld(rank);
  noteEnd(rank, false);
  for (const std::string& text : std::exchange(message.warnings, {})) observer_.warning(text);
  const bool isOfAnother = worker(rank).isLate && worker(rank).set;
  if (isFirst(rank, message.result.ok() && message.result.unkeptFiles.empty())) {
    worker(rank).answer = std::move(message);
    answered_.insert(rank);
  } else {
    worker(rank).set.reset();
    observer_.message(fmt::format(
        "The result of evaluation No. {} from {} is dropped: {}", held.number, nameOf(rank),
        isOfAnother ? "the worker was taken for lost, and another makes the run" : "another worker had it first"));
  }
  noteWhetherFree(rank);
}

void RankEvaluator::noteEnd(int rank, bool isLost) {
  if (const auto place = std::exchange(worker(rank).running, std::nullopt)) {
    ledger_.markEnded(*place, runTimeClock(), isLost);
  }
}

bool RankEvaluator::isFirst(int rank, bool isWhole) {
  Worker& answering = worker(rank);
  if (!std::exchange(answering.isLate, false)) return answering.set.has_value();
  late_.erase(rank);
  // A failure, or files that were not kept, may be for the loss: whoever has the set now decides.
  if (!answering.set || !isWhole) return false;
  if (ledger_.takeAgain(*answering.set)) return true;
  for (int other = 1; other < job_.processCount(); ++other) {
    if (other == rank || worker(other).set != answering.set || worker(other).isLate) continue;
    if (worker(other).answer) return false;
    worker(other).set.reset();
  }
  return true;
}

void RankEvaluator::takeFailure(int rank, const FailureMessage& failure) {
  Worker& failed = worker(rank);
  const bool hasNothing = failed.isLate || (watch_.heldBy(rank) && !failed.set);
  if (!hasNothing) failWith(rank, failure);
  watch_.takeBack(rank);
  noteEnd(rank, true);
  late_.erase(rank);
  failed.isLate = false;
  failed.set.reset();
  failed.isGivenUp = true;
  noteWhetherFree(rank);
  observer_.warning(
      fmt::format("W{} runs no model any more: {}\n{}", nameOf(rank).substr(1), failure.message, failure.detail));
  if (!isAnyLeft()) failWith(rank, failure);
}

void RankEvaluator::passOnLost() {
  const std::vector<int> found = watch_.findLost();
  for (const int rank : found) loseWorker(rank);
  if (!found.empty() && !isAnyLeft()) failWithoutWorkers();
}

bool RankEvaluator::isAnyLeft() const {
  for (int rank = 1; rank < job_.processCount(); ++rank) {
    if (!workers_.at(static_cast<std::size_t>(rank - 1)).isGivenUp && !watch_.isLost(rank)) return true;
  }
  return false;
}

void RankEvaluator::loseWorker(int rank) {
  Worker& lost = worker(rank);
  const auto& held = watch_.heldBy(rank);
  noteEnd(rank, true);
  noteWhetherFree(rank);
  const std::string who = fmt::format("W{}", nameOf(rank).substr(1));
  const std::string why = watch_.hasEnded(rank)
                              ? std::string("its process has ended")
                              : fmt::format("it has given no sign of life for {:g} s", watch_.silenceLimit());
  if (!lost.set || !held || lost.isLate) return observer_.warning(fmt::format("{} is lost: {}", who, why));
  ledger_.putBack(*lost.set);
  lost.isLate = true;
  late_.insert(rank);
  observer_.runLost(
      fmt::format("{} is lost: {}. Evaluation No. {}, which it had for {:.1f} s, is made by another worker", who, why,
                  held->number, watch_.secondsSince(held->since)));
}

void RankEvaluator::failWithoutWorkers() const {
  std::string detail;
  for (int rank = 1; rank < job_.processCount(); ++rank) {
    const char* why = watch_.hasEnded(rank) ? "its process has ended"
                      : watch_.isLost(rank) ? "it gives no sign of life"
                                            : "its process folder cannot be used";
    detail += fmt::format("{}: {}\n", nameOf(rank), why);
  }
  fatalError("Error: All workers of the job are lost", detail + "Restart = 1 goes on with what has been evaluated");
}

void RankEvaluator::finishAnswered() {
  for (auto rank = answered_.begin(); rank != answered_.end();) {
    Worker& answered = worker(*rank);
    if (ledger_.judge(*answered.set, answered.answer->result)) {
      finish(answered, *rank);
      rank = answered_.begin();  // others may have waited for this one
    } else {
      ++rank;
    }
  }
  freeOneThatWaits();
}

void RankEvaluator::finish(Worker& worker, int rank) {
  const std::size_t place = *std::exchange(worker.set, std::nullopt);
  ResultMessage message = *std::exchange(worker.answer, std::nullopt);
  answered_.erase(rank);
  noteWhetherFree(rank);
  for (const int late : late_) {
    if (this->worker(late).set == place) this->worker(late).set.reset();
  }
  EvaluationResult& result = message.result;
  // Only the master knows the transformation determined from the initial sample.
  if (result.ok()) result.aggregate = runner_.aggregator().aggregate(result.objectiveValues);
  if (ledger_.isFolderWanted(place, result) && !watch_.isLost(rank)) {
    job_.send(rank, static_cast<int>(RankMessage::keepFolder), encode(KeepFolderMessage{ledger_.numberOf(place)}));
  }
  ledger_.finish(place, std::move(result), message.leftBehind);
}

WorkerWatch::Held RankEvaluator::takeHeld(int rank) {
  if (const auto held = watch_.takeBack(rank)) return *held;
  fatalError(kCommunicationFailed, fmt::format("the worker with rank {} sent a result that nobody asked for", rank));
}

void RankEvaluator::giveUp(int rank, const GivenUpMessage& message) {
  takeHeld(rank);
  noteEnd(rank, true);
  Worker& givenUp = worker(rank);
  const auto set = std::exchange(givenUp.set, std::nullopt);
  late_.erase(rank);
  if (!std::exchange(givenUp.isLate, false) && set) ledger_.putBack(*set);
  givenUp.isGivenUp = true;
  noteWhetherFree(rank);
  for (const std::string& text : message.warnings) observer_.warning(text);
  const FolderDamage damage{message.what, fmt::format("{}; reported by {}", message.why, nameOf(rank)),
                            message.isFinal};
  if (std::all_of(workers_.begin(), workers_.end(), [](const Worker& each) { return each.isGivenUp; })) {
    failWithoutSlots(damage);
  }
  observer_.warning(givenUpWarning(fmt::format("Worker {}", rank), damage));
  if (!isAnyLeft()) failWithoutWorkers();
}

void RankEvaluator::freeOneThatWaits() {
  if (answered_.empty()) return;
  int waiting = 0;
  for (int rank = 1; rank < job_.processCount(); ++rank) {
    const Worker& each = worker(rank);
    if (watch_.isLost(rank) || each.isGivenUp) continue;
    if (!each.answer) return;
    if (waiting == 0) waiting = rank;
  }
  if (waiting == 0) return;
  answered_.erase(waiting);
  worker(waiting).answer.reset();
  ledger_.putBack(*std::exchange(worker(waiting).set, std::nullopt));
  noteWhetherFree(waiting);
}

std::string RankEvaluator::nameOf(int rank) const {
  const auto& place = workers_.at(static_cast<std::size_t>(rank - 1)).place;
  return fmt::format("worker {}{}", rank, place ? " on " + place->host : "");
}

void RankEvaluator::failWith(int rank, const FailureMessage& failure) const {
  std::string detail = failure.detail;
  if (!detail.empty()) detail += '\n';
  detail += "reported by " + nameOf(rank);
  fatalError(failure.message, detail);
}

void RankEvaluator::stopIfCancelled() {
  constexpr const char* kCancelled = "EM: Simulation cancelled";
  if (!observer_.isCancelled()) return;
  observer_.message(kCancelled);
  throw RunCancelled(kCancelled);
}

void RankEvaluator::settleAggregates(std::span<EvaluationResult> sample) {
  mirevo::settleAggregates(runner_.aggregator(), sample, observer_);
}

void beginWorkers(Job& job, const BeginMessage& message) {
  sendToWorkers(job, RankMessage::begin, encode(message));
}

void stopWorkers(Job& job, const std::set<int>& lost) {
  sendToWorkers(job, RankMessage::stop, {}, lost);
}

std::set<int> awaitFarewells(Job& job, const std::set<int>& lost, const std::function<bool()>& isEnough,
                             const std::function<void(const std::string&)>& warn) {
  std::set<int> missing;
  for (int rank = 1; rank < job.processCount(); ++rank) missing.insert(rank);
  const auto isAwaited = [&](int rank) { return !lost.contains(rank) && !job.hasEnded(rank); };
  while (std::any_of(missing.begin(), missing.end(), isAwaited)) {
    const auto message = job.receive(kMasterPollSeconds);
    if (!message) {
      if (isEnough()) return missing;
      continue;
    }
    if (message->tag == static_cast<int>(RankMessage::farewell)) missing.erase(message->rank);
    if (message->tag == static_cast<int>(RankMessage::failure)) {
      const FailureMessage failure = decodeFailure(message->content);
      warn(fmt::format("Worker {} met an error that no evaluation depended on: {}{}{}", message->rank, failure.message,
                       failure.detail.empty() ? "" : "\n", failure.detail));
    }
  }
  return missing;
}

void dismissWorkers(Job& job, const std::set<int>& missing) {
  sendToWorkers(job, RankMessage::leave, {}, missing);
}

}  // namespace mirevo
