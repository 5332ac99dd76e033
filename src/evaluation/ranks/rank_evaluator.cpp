#include "evaluation/ranks/rank_evaluator.h"

#include <algorithm>
#include <cassert>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"

namespace mirevo {
namespace {

/// Longest time between two checks for cancellation; a message ends the wait.
constexpr double kMasterPollSeconds = 0.25;

void sendToWorkers(Job& job, RankMessage tag, const std::string& content) {
  for (int rank = 1; rank < job.processCount(); ++rank) job.send(rank, static_cast<int>(tag), content);
}

}  // namespace

RankEvaluator::RankEvaluator(ModelRunner& runner, Job& job, EvaluationObserver& observer, FailedRunPolicy& failedRuns,
                             EarlierEvaluations* earlier)
    : runner_(runner),
      job_(job),
      observer_(observer),
      ledger_(observer, failedRuns, earlier, runner.equalMeasures(), runner.output().runComparison()),
      workers_(static_cast<std::size_t>(job.processCount() - 1)) {}

std::vector<EvaluationResult> RankEvaluator::evaluateParameterSets(std::span<const ParameterSet> sets,
                                                                   DispatchMode mode) {
  assert(!ledger_.isOpen());
  ledger_.open(sets, mode);
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
  finishAnswered();
  stopIfCancelled();
  startOnFreeWorkers();
}

void RankEvaluator::startOnFreeWorkers() {
  for (int rank = 1; rank < job_.processCount(); ++rank) {
    if (worker(rank).place && !worker(rank).set && !worker(rank).isGivenUp) startNext(rank);
  }
}

void RankEvaluator::startNext(int rank) {
  while (const auto place = ledger_.takeNext()) {
    stopIfCancelled();
    auto failure = runner_.findUnrunnable(ledger_.set(*place));
    if (!failure) {
      job_.send(rank, static_cast<int>(RankMessage::set),
                encode(SetMessage{ledger_.numberOf(*place), ledger_.set(*place), ledger_.standard(),
                                  ledger_.repeatedMeasures(*place)}));
      worker(rank).set = *place;
      ledger_.markInitiated(*place);
      return;
    }
    ledger_.finish(*place, runner_.failedResult(std::move(*failure)));
  }
}

void RankEvaluator::handle(const Message& message) {
  switch (static_cast<RankMessage>(message.tag)) {
    case RankMessage::ready: {
      const ReadyMessage& place = worker(message.rank).place.emplace(decodeReady(message.content));
      observer_.message(
          fmt::format("Worker {} is ready on {}, process folder {}", message.rank, place.host, place.processFolder));
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
    case RankMessage::failure:
      failWith(message.rank, decodeFailure(message.content));
    default:
      fatalError(kCommunicationFailed,
                 fmt::format("the worker with rank {} sent a message of unknown kind {}", message.rank, message.tag));
  }
}

void RankEvaluator::takeResult(int rank, ResultMessage message) {
  requireSet(rank);
  for (const std::string& text : std::exchange(message.warnings, {})) observer_.warning(text);
  worker(rank).answer = std::move(message);
}

void RankEvaluator::finishAnswered() {
  int rank = 1;
  while (rank < job_.processCount()) {
    Worker& answered = worker(rank);
    if (answered.answer && ledger_.judge(*answered.set, answered.answer->result)) {
      finish(answered, rank);
      rank = 1;  // others may have waited for this one
    } else {
      ++rank;
    }
  }
  freeOneThatWaits();
}

void RankEvaluator::finish(Worker& worker, int rank) {
  const std::size_t place = *std::exchange(worker.set, std::nullopt);
  ResultMessage message = *std::exchange(worker.answer, std::nullopt);
  EvaluationResult& result = message.result;
  // Only the master knows the transformation determined from the initial sample.
  if (result.ok()) result.aggregate = runner_.aggregator().aggregate(result.objectiveValues);
  if (ledger_.isFolderWanted(place, result)) {
    job_.send(rank, static_cast<int>(RankMessage::keepFolder), encode(KeepFolderMessage{ledger_.numberOf(place)}));
  }
  ledger_.finish(place, std::move(result), message.leftBehind);
}

void RankEvaluator::requireSet(int rank) {
  if (worker(rank).set && !worker(rank).answer) return;
  fatalError(kCommunicationFailed, fmt::format("the worker with rank {} sent a result that nobody asked for", rank));
}

void RankEvaluator::giveUp(int rank, const GivenUpMessage& message) {
  requireSet(rank);
  ledger_.putBack(*std::exchange(worker(rank).set, std::nullopt));
  worker(rank).isGivenUp = true;
  for (const std::string& text : message.warnings) observer_.warning(text);
  const FolderDamage damage{message.what, fmt::format("{}; reported by {}", message.why, nameOf(rank)),
                            message.isFinal};
  if (std::all_of(workers_.begin(), workers_.end(), [](const Worker& each) { return each.isGivenUp; })) {
    failWithoutSlots(damage);
  }
  observer_.warning(givenUpWarning(fmt::format("Worker {}", rank), damage));
}

void RankEvaluator::freeOneThatWaits() {
  const auto isBound = [](const Worker& each) { return each.isGivenUp || each.answer; };
  if (!std::all_of(workers_.begin(), workers_.end(), isBound)) return;
  const auto waiting = std::find_if(workers_.begin(), workers_.end(), [](const Worker& each) { return each.answer; });
  if (waiting == workers_.end()) return;
  waiting->answer.reset();
  ledger_.putBack(*std::exchange(waiting->set, std::nullopt));
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

void stopWorkers(Job& job) {
  sendToWorkers(job, RankMessage::stop, {});
}

std::set<int> awaitFarewells(Job& job, const std::function<bool()>& isEnough,
                             const std::function<void(const std::string&)>& warn) {
  std::set<int> silent;
  for (int rank = 1; rank < job.processCount(); ++rank) silent.insert(rank);
  while (!silent.empty()) {
    const auto message = job.receive(kMasterPollSeconds);
    if (!message) {
      if (isEnough()) return silent;
      continue;
    }
    if (message->tag == static_cast<int>(RankMessage::farewell)) silent.erase(message->rank);
    if (message->tag == static_cast<int>(RankMessage::failure)) {
      const FailureMessage failure = decodeFailure(message->content);
      warn(fmt::format("Worker {} met an error that no evaluation depended on: {}{}{}", message->rank, failure.message,
                       failure.detail.empty() ? "" : "\n", failure.detail));
    }
  }
  return silent;
}

}  // namespace mirevo
