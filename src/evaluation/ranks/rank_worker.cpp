#include "evaluation/ranks/rank_worker.h"

#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/progress_messages.h"

namespace mirevo {
namespace {

constexpr int kMaster = 0;
constexpr int kSlot = 1;
/// Without a model run there is no reason to end a wait early.
constexpr double kIdleSeconds = 3600.0;
/// Longest time between two checks for the stop message while the model runs; the end of the model ends the wait.
constexpr double kBusyPollSeconds = 0.1;

void sendToMaster(Job& job, RankMessage tag, std::string content) {
  job.send(kMaster, static_cast<int>(tag), std::move(content));
}

/// Without it the job would wait for its end for ever.
void requireMaster(Job& job) {
  if (!job.hasEnded(kMaster)) return;
  fatalError(kCommunicationFailed, "the process of the master has ended; Restart = 1 goes on with what it has written");
}

Message await(Job& job, MasterWatch* watch) {
  const bool looks = watch != nullptr || job.outlivesLosses();
  while (true) {
    if (auto message = job.receive(looks ? MasterWatch::kLookSeconds : kIdleSeconds)) {
      return std::move(*message);
    }
    requireMaster(job);
    if (watch != nullptr) watch->requireAnswerWithin(MasterWatch::kAnswerSeconds);
  }
}

[[noreturn]] void refuse(const Message& message) {
  fatalError(kCommunicationFailed,
             fmt::format("rank {} sent a message of kind {} out of turn", message.rank, message.tag));
}

bool isExecuting(ModelRunner& runner) {
  std::int32_t executing = 0;
  std::int32_t status = 0;
  runner.launcher().isExecuting(kSlot, executing, status);
  return executing != 0;
}

bool isStopped(Job& job, MasterWatch& watch) {
  const auto arrived = job.receive(0.0);
  if (!arrived) requireMaster(job);
  if (!arrived) watch.requireAnswerWithin(MasterWatch::kAnswerSeconds);
  if (arrived && arrived->tag != static_cast<int>(RankMessage::stop)) refuse(*arrived);
  return arrived.has_value();
}

/// Runs the model with one set; empty when the master sends stop in the meantime.
std::optional<ResultMessage> runModel(Job& job, ModelRunner& runner, const SetMessage& message, MasterWatch& watch,
                                      LifeSigns& signs) {
  signs.begin();
  runner.setStandard(message.standard);
  if (auto failure = runner.prepareModelRun(message.set, kSlot, message.number, message.isFinal))
    return ResultMessage{runner.failedResult(*failure), {}, {}};
  while (isExecuting(runner)) {
    runner.launcher().waitForChange(kBusyPollSeconds);
    // An item that ended while this process was stopped has kept the next one waiting.
    if (const double gap = signs.look(); gap >= LifeSigns::kLongGap) runner.launcher().excludeTime(gap);
    if (!isStopped(job, watch)) continue;
    runner.launcher().haltProcesses();
    return std::nullopt;
  }
  try {
    const auto look = [&job, &watch, &signs] {
      signs.look();
      if (isStopped(job, watch)) throw RunCancelled();
    };
    return ResultMessage{runner.collect(kSlot, look), runner.launcher().leftBehind(kSlot), {}};
  } catch (const RunCancelled&) {
    runner.launcher().haltProcesses();
    return std::nullopt;
  }
}

/// A worker that was itself stopped, or kept waiting, may have found that the time of the run was over, which is no
/// fault of the run: it is made once more.
std::optional<ResultMessage> runUndisturbed(Job& job, ModelRunner& runner, const SetMessage& message,
                                            MasterWatch& watch, LifeSigns& signs, std::vector<std::string>& warnings) {
  auto answer = runModel(job, runner, message, watch, signs);
  if (answer && !answer->result.ok() && signs.wasInterrupted() && !runner.renewIfDamaged(kSlot, warnings)) {
    answer = runModel(job, runner, message, watch, signs);
  }
  if (!answer) return answer;
  if (signs.mayBeTakenForLost()) {
    // Another worker may have kept those of its own run of this set.
    runner.noteUnkeptFiles(answer->result, "the process was stopped or kept waiting");
  } else {
    runner.keepOutputFiles(kSlot, message.number, answer->result, message.repeatedMeasures);
  }
  return answer;
}

}  // namespace

void runWorkerLoop(Job& job, ModelRunner& runner, MasterWatch& watch, LifeSigns& signs,
                   std::vector<std::string> warnings) {
  sendToMaster(
      job, RankMessage::ready,
      encode(ReadyMessage{hostName(), runner.launcher().getProcessFolder(kSlot), std::exchange(warnings, {})}));
  // From now on warnings are on folders kept since the last result; sent with the next one
  while (true) {
    const Message message = await(job, &watch);
    if (message.tag == static_cast<int>(RankMessage::stop)) return;
    if (message.tag == static_cast<int>(RankMessage::keepFolder)) {
      std::vector<std::string> problems;
      const int number = decodeKeepFolder(message.content).number;
      runner.keepFailedFolder(kSlot, number, problems);
      for (const std::string& text : problems) warnings.push_back(progress::nameOfEvaluation(number) + ": " + text);
      continue;
    }
    if (message.tag != static_cast<int>(RankMessage::set)) refuse(message);
    if (auto damage = runner.renewIfDamaged(kSlot, warnings)) {
      sendToMaster(job, RankMessage::givenUp,
                   encode(GivenUpMessage{std::move(damage->what), std::move(damage->why), std::exchange(warnings, {}),
                                         damage->isFinal}));
      continue;
    }
    auto result = runUndisturbed(job, runner, decodeSet(message.content), watch, signs, warnings);
    if (!result) return;
    result->warnings = std::exchange(warnings, {});
    sendToMaster(job, RankMessage::result, encode(*result));
  }
}

std::optional<BeginMessage> awaitBegin(Job& job) {
  const Message message = await(job, nullptr);
  if (message.tag == static_cast<int>(RankMessage::begin)) return decodeBegin(message.content);
  if (message.tag != static_cast<int>(RankMessage::stop)) refuse(message);
  return std::nullopt;
}

void sayFarewell(Job& job, MasterWatch* watch) {
  sendToMaster(job, RankMessage::farewell, {});
  if (job.outlivesLosses()) {
    while (await(job, watch).tag != static_cast<int>(RankMessage::leave)) {
    }
    return job.leaveWithout({});
  }
  job.finalise([watch] {
    if (watch != nullptr) watch->requireAnswerWithin(MasterWatch::kClosingSeconds);
    return false;
  });
}

void reportFailure(Job& job, const FailureMessage& failure, MasterWatch* watch) {
  sendToMaster(job, RankMessage::failure, encode(failure));
  while (true) {
    const Message message = await(job, watch);
    if (message.tag == static_cast<int>(RankMessage::stop)) return;
  }
}

}  // namespace mirevo
