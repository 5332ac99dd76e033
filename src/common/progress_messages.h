#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

/// The texts by which a run tells a viewer how it is going, with the functions that write and read them.
/// docs/progress-format.md describes them.
namespace mirevo::progress {

/// Kinds of records: what each line begins with.
inline constexpr std::string_view kStatus = "STATUS";
inline constexpr std::string_view kStatusLabel = "STALBL";
inline constexpr std::string_view kMessageLabel = "MESLBL";
inline constexpr std::string_view kMessage = "MESSAG";
inline constexpr std::string_view kSpeed = "COMSPD";
inline constexpr std::string_view kTimeLeft = "TIMLFT";
inline constexpr std::string_view kPercentage = "PROGRE";

/// The first status of a run, and the beginning of its last one, followed by how it ended.
inline constexpr std::string_view kInitialisation = "Initialisation";
inline constexpr std::string_view kEnded = "Ended: ";
inline constexpr std::string_view kNormalTermination = "Normal termination";
/// For the last two records of a run; signal handlers need them whole.
inline constexpr std::string_view kComplete = "100.0";
inline constexpr std::string_view kEndedRecord = "STATUSEnded: ";
inline constexpr std::string_view kCompleteRecord = "PROGRE100.0";
static_assert(kEndedRecord.starts_with(kStatus) && kEndedRecord.ends_with(kEnded));
static_assert(kCompleteRecord.starts_with(kPercentage) && kCompleteRecord.ends_with(kComplete));

/// The label of what is counted, and the text before the planned number.
inline constexpr std::string_view kCountLabel = "Model evaluation";
inline constexpr std::string_view kOfPlanned = " of ";

/// Followed by the title of the setup.
inline constexpr std::string_view kTitle = "Title: ";

/// Who runs, where and since when.
struct RunOrigin {
  std::optional<double> startedAt;  ///< seconds since 1970-01-01 UTC
  std::string host;
  std::int64_t process = 0;  ///< 0: not known
};
/// `startedAt` is in the form of dateAndTimeWithZone().
std::string runStartedMessage(std::string_view startedAt, std::string_view host, std::int64_t process);
/// Empty for other messages; what the message does not say stays unknown.
std::optional<RunOrigin> readRunStarted(std::string_view message);

/// How an evaluation ended.
inline constexpr std::string_view kOk = "OK";
inline constexpr std::string_view kFailed = "FAILED";
inline constexpr std::string_view kConstraintsViolated = "FAILED - parameter constraints violated";
inline constexpr std::string_view kModelRunError = "FAILED - model run error";

/// "Evaluation of parameter set No. 87": the beginning of all messages about it.
std::string nameOfEvaluation(std::int64_t number);
std::string initiatedMessage(std::int64_t number);
std::string completedMessage(std::int64_t number, std::string_view outcome);
/// For an evaluation that has the result of another one of its run; completedMessage() follows.
std::string repeatMessage(std::int64_t number, std::int64_t original);
/// For an evaluation whose result was taken from an earlier run.
std::string replayedMessage(std::int64_t number, bool ok);

/// What a message file that was begun anew says of the evaluations in the records that were left out.
struct CountedEvaluations {
  std::int64_t done = 0;  ///< including failed ones
  std::int64_t failed = 0;
};
std::string countedMessage(std::int64_t done, std::int64_t failed);
/// Empty for other messages.
std::optional<CountedEvaluations> readCounted(std::string_view message);
/// Before a message on an evaluation that is counted already.
inline constexpr std::string_view kEarlier = "Earlier: ";

enum class EvaluationNews { underWay, succeeded, failed };
/// Empty for a message that is not about an evaluation.
std::optional<EvaluationNews> readEvaluationMessage(std::string_view message);

struct BestEvaluation {
  double aggregate = 0.0;
  std::int64_t evaluation = 0;
  std::optional<double> foundAt;  ///< seconds since 1970-01-01 UTC
};
/// `foundAt` is in the form of dateAndTimeWithZone(), or empty for an evaluation of an earlier run.
std::string bestMessage(double aggregate, std::int64_t evaluation, std::string_view foundAt);
/// Empty for other messages.
std::optional<BestEvaluation> readBest(std::string_view message);

}  // namespace mirevo::progress
