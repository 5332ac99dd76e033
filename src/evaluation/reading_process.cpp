#include "evaluation/reading_process.h"

#include <cstdint>
#include <cstring>
#include <utility>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "evaluation/message_bytes.h"
#include "evaluation/result_layout.h"

namespace mirevo {
namespace {

struct Fault {
  std::string message;
  std::string detail;
};

/// Either of them. Its length precedes it.
struct Answer {
  std::optional<RunReading> reading;
  std::optional<Fault> fault;
};

}  // namespace

template <>
struct Layout<Fault> {
  static void of(auto& archive, auto& fault) { archive(fault.message, fault.detail); }
};
template <>
struct Layout<RunReading> {
  static void of(auto& archive, auto& reading) { archive(reading.result, reading.mayBeCutOff, reading.seconds); }
};
template <>
struct Layout<Answer> {
  static void of(auto& archive, auto& answer) {
    archive(answer.reading, answer.fault);
    archive.require(answer.reading.has_value() != answer.fault.has_value());
  }
};

namespace {

/// Anything else that is thrown ends the process without an answer.
void answer(int socket, const std::function<RunReading()>& read) {
  Answer answer;
  try {
    answer.reading = read();
  } catch (const FatalError& error) {
    answer.fault = Fault{error.message(), error.detail()};
  }
  const std::string bytes = bytesOf(answer);
  const std::uint64_t size = bytes.size();
  if (sendFromHelper(socket, &size, sizeof size)) sendFromHelper(socket, bytes.data(), bytes.size());
}

}  // namespace

bool ReadingProcess::start(const std::function<RunReading()>& read, double seconds) {
  std::string ignored;
  arrived_.clear();
  deadline_ = runTimeClock() + seconds;
  return helper_.start([&read](int socket) { answer(socket, read); }, ignored);
}

ReadingProcess::State ReadingProcess::look() {
  const bool hasEnded = helper_.receiveArrived(arrived_) == HelperProcess::Outcome::ended;
  std::uint64_t size = 0;
  if (arrived_.size() >= sizeof size) {
    std::memcpy(&size, arrived_.data(), sizeof size);
    if (arrived_.size() - sizeof size == size) return State::done;
  }
  return hasEnded || runTimeClock() > deadline_ ? State::lost : State::reading;
}

RunReading ReadingProcess::take() {
  helper_.end();
  auto answer = messageOf<Answer>(std::string_view(arrived_).substr(sizeof(std::uint64_t)));
  if (answer.fault) fatalError(answer.fault->message, answer.fault->detail);
  return std::move(*answer.reading);
}

}  // namespace mirevo
