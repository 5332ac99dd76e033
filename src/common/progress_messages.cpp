#include "common/progress_messages.h"

#include <fmt/format.h>

#include "common/clock.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo::progress {
namespace {

constexpr std::string_view kRunStarted = "Run started ";
constexpr std::string_view kOnHost = " on ";
constexpr std::string_view kProcess = ", process ";

constexpr std::string_view kEvaluation = "Evaluation of parameter set No. ";
constexpr std::string_view kInitiated = " initiated";
constexpr std::string_view kCompleted = " completed: ";
constexpr std::string_view kReplayed = " taken from the earlier run: ";

constexpr std::string_view kCounted = "Evaluations counted: ";
constexpr std::string_view kOfThemFailed = ", failed: ";

constexpr std::string_view kBest = "Best so far: ";
constexpr std::string_view kOfEvaluation = " (evaluation ";
constexpr std::string_view kFoundAt = ", ";

}  // namespace

std::string runStartedMessage(std::string_view startedAt, std::string_view host, std::int64_t process) {
  return fmt::format("{}{}{}{}{}{}", kRunStarted, startedAt, kOnHost, host, kProcess, process);
}

std::optional<RunOrigin> readRunStarted(std::string_view message) {
  if (!takeText(message, kRunStarted)) return std::nullopt;
  RunOrigin origin;
  origin.startedAt = takeDateAndTimeWithZone(message);
  const std::size_t hostEnd = message.rfind(kProcess);  // a host name may contain anything
  if (hostEnd == std::string_view::npos || !message.starts_with(kOnHost)) return origin;
  origin.host = message.substr(kOnHost.size(), hostEnd - kOnHost.size());
  message.remove_prefix(hostEnd + kProcess.size());
  origin.process = takeNumber(message).value_or(0);
  return origin;
}

std::string nameOfEvaluation(std::int64_t number) {
  return fmt::format("{}{}", kEvaluation, number);
}
std::string initiatedMessage(std::int64_t number) {
  return nameOfEvaluation(number).append(kInitiated);
}
std::string completedMessage(std::int64_t number, std::string_view outcome) {
  return nameOfEvaluation(number).append(kCompleted).append(outcome);
}
std::string repeatMessage(std::int64_t number, std::int64_t original) {
  return fmt::format("{} repeats No. {}: the model gets the same values, and is not run", nameOfEvaluation(number),
                     original);
}
std::string replayedMessage(std::int64_t number, bool ok) {
  return nameOfEvaluation(number).append(kReplayed).append(ok ? kOk : kFailed);
}

std::string countedMessage(std::int64_t done, std::int64_t failed) {
  return fmt::format("{}{}{}{}", kCounted, done, kOfThemFailed, failed);
}

std::optional<CountedEvaluations> readCounted(std::string_view message) {
  if (!takeText(message, kCounted)) return std::nullopt;
  const auto done = takeNumber(message);
  if (!done || !takeText(message, kOfThemFailed)) return std::nullopt;
  const auto failed = takeNumber(message);
  if (!failed || *failed > *done) return std::nullopt;
  return CountedEvaluations{*done, *failed};
}

std::optional<EvaluationNews> readEvaluationMessage(std::string_view message) {
  if (!takeText(message, kEvaluation) || !takeNumber(message)) return std::nullopt;
  if (!takeText(message, kCompleted) && !takeText(message, kReplayed)) return EvaluationNews::underWay;
  return message.starts_with(kFailed) ? EvaluationNews::failed : EvaluationNews::succeeded;
}

std::string bestMessage(double aggregate, std::int64_t evaluation, std::string_view foundAt) {
  return fmt::format("{}{}{}{}{}{})", kBest, formatReal(aggregate), kOfEvaluation, evaluation,
                     foundAt.empty() ? std::string_view{} : kFoundAt, foundAt);
}

std::optional<BestEvaluation> readBest(std::string_view message) {
  if (!takeText(message, kBest)) return std::nullopt;
  const std::size_t end = message.find(kOfEvaluation);
  if (end == std::string_view::npos) return std::nullopt;
  const auto aggregate = parseReal(message.substr(0, end));
  message.remove_prefix(end + kOfEvaluation.size());
  const auto evaluation = takeNumber(message);
  if (!aggregate || !evaluation) return std::nullopt;
  BestEvaluation best{*aggregate, *evaluation, std::nullopt};
  if (takeText(message, kFoundAt)) best.foundAt = takeDateAndTimeWithZone(message);
  return best;
}

}  // namespace mirevo::progress
