#include "evaluation/rank_messages.h"

#include <cstdint>
#include <cstring>
#include <type_traits>
#include <vector>

#include "common/fatal_error.h"

namespace mirevo {
namespace {

class Writer final {
 public:
  template <class Number>
  Writer& number(Number value) {
    static_assert(std::is_trivially_copyable_v<Number>);
    content_.append(reinterpret_cast<const char*>(&value), sizeof value);
    return *this;
  }
  Writer& text(std::string_view value) {
    number(static_cast<std::uint64_t>(value.size()));
    content_.append(value);
    return *this;
  }
  Writer& reals(const std::vector<double>& values) {
    number(static_cast<std::uint64_t>(values.size()));
    content_.append(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(double));
    return *this;
  }
  Writer& texts(const std::vector<std::string>& values) {
    number(static_cast<std::uint64_t>(values.size()));
    for (const std::string& value : values) text(value);
    return *this;
  }
  std::string take() { return std::move(content_); }

 private:
  std::string content_;
};

class Reader final {
 public:
  explicit Reader(std::string_view content) : rest_(content) {}

  template <class Number>
  Number number() {
    Number value{};
    std::memcpy(&value, bytes(sizeof value).data(), sizeof value);
    return value;
  }
  std::string text() { return std::string(bytes(number<std::uint64_t>())); }
  std::vector<double> reals() {
    const auto count = number<std::uint64_t>();
    if (count > rest_.size() / sizeof(double)) refuse();
    std::vector<double> values(count);
    if (count > 0) std::memcpy(values.data(), bytes(count * sizeof(double)).data(), count * sizeof(double));
    return values;
  }
  std::vector<std::string> texts() {
    std::vector<std::string> values;
    for (auto left = number<std::uint64_t>(); left > 0; --left) values.push_back(text());
    return values;
  }
  void expectEnd() const {
    if (!rest_.empty()) refuse();
  }

 private:
  std::string_view bytes(std::uint64_t count) {
    if (count > rest_.size()) refuse();
    const std::string_view taken = rest_.substr(0, count);
    rest_.remove_prefix(count);
    return taken;
  }
  [[noreturn]] static void refuse() {
    fatalError("Error: MPI communication failed",
               "a message has another form than expected: do all processes of the job run the same Mirevo?");
  }

  std::string_view rest_;
};

}  // namespace

std::string encode(const BeginMessage& message) {
  return Writer().text(message.setupFile).text(message.text).take();
}

BeginMessage decodeBegin(std::string_view content) {
  Reader reader(content);
  BeginMessage message;
  message.setupFile = reader.text();
  message.text = reader.text();
  reader.expectEnd();
  return message;
}

std::string encode(const SetMessage& message) {
  return Writer().number(message.number).reals(message.set).take();
}

SetMessage decodeSet(std::string_view content) {
  Reader reader(content);
  SetMessage message;
  message.number = reader.number<int>();
  message.set = reader.reals();
  reader.expectEnd();
  return message;
}

std::string encode(const ReadyMessage& message) {
  return Writer().text(message.host).text(message.processFolder).take();
}

ReadyMessage decodeReady(std::string_view content) {
  Reader reader(content);
  ReadyMessage message;
  message.host = reader.text();
  message.processFolder = reader.text();
  reader.expectEnd();
  return message;
}

std::string encode(const ResultMessage& message) {
  const EvaluationResult& result = message.result;
  Writer writer;
  writer.reals(result.measureValues).reals(result.objectiveValues).number(result.aggregate);
  writer.reals(result.simulatedValues);
  writer.number(static_cast<std::uint8_t>(result.ok() ? 0 : 1));
  if (!result.ok()) {
    writer.number(static_cast<std::int32_t>(result.failure->kind));
    writer.text(result.failure->reason).texts(result.failure->lastOutput);
  }
  return writer.texts(result.warnings).text(message.leftBehind).take();
}

ResultMessage decodeResult(std::string_view content) {
  Reader reader(content);
  ResultMessage message;
  EvaluationResult& result = message.result;
  result.measureValues = reader.reals();
  result.objectiveValues = reader.reals();
  result.aggregate = reader.number<double>();
  result.simulatedValues = reader.reals();
  if (reader.number<std::uint8_t>() != 0) {
    EvaluationFailure& failure = result.failure.emplace();
    failure.kind = static_cast<EvaluationFailure::Kind>(reader.number<std::int32_t>());
    failure.reason = reader.text();
    failure.lastOutput = reader.texts();
  }
  result.warnings = reader.texts();
  message.leftBehind = reader.text();
  reader.expectEnd();
  return message;
}

std::string encode(const FailureMessage& message) {
  return Writer().text(message.message).text(message.detail).take();
}

FailureMessage decodeFailure(std::string_view content) {
  Reader reader(content);
  FailureMessage message;
  message.message = reader.text();
  message.detail = reader.text();
  reader.expectEnd();
  return message;
}

}  // namespace mirevo
