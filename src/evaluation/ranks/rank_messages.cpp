#include "evaluation/ranks/rank_messages.h"

#include <cstdint>
#include <cstring>
#include <optional>
#include <type_traits>
#include <vector>

#include "common/fatal_error.h"
#include "platform/jobs/job.h"

namespace mirevo {
namespace {

/// The fields of a struct, named once for both directions: `archive` is a Writer or a Reader.
template <class Struct>
struct Layout;

template <>
struct Layout<BeginMessage> {
  static void of(auto& archive, auto& message) { archive(message.setupFile, message.text); }
};
template <>
struct Layout<SetMessage> {
  static void of(auto& archive, auto& message) {
    archive(message.number, message.set, message.standard, message.repeatedMeasures);
  }
};
template <>
struct Layout<ReadyMessage> {
  static void of(auto& archive, auto& message) { archive(message.host, message.processFolder, message.warnings); }
};
template <>
struct Layout<ResultMessage> {
  static void of(auto& archive, auto& message) { archive(message.result, message.leftBehind, message.warnings); }
};
template <>
struct Layout<KeepFolderMessage> {
  static void of(auto& archive, auto& message) { archive(message.number); }
};
template <>
struct Layout<GivenUpMessage> {
  static void of(auto& archive, auto& message) {
    archive(message.what, message.why, message.warnings, message.isFinal);
  }
};
template <>
struct Layout<FailureMessage> {
  static void of(auto& archive, auto& message) { archive(message.message, message.detail); }
};
/// Without the evaluation number, which the master knows.
template <>
struct Layout<EvaluationResult> {
  static void of(auto& archive, auto& result) {
    archive(result.measureValues, result.objectiveValues, result.aggregate, result.validationValues,
            result.validationPairs, result.exactMeasures, result.simulatedValues, result.failure,
            result.unusedObservations, result.pairs, result.lastOutput, result.warnings, result.unkeptFiles,
            result.absentFiles, result.shownSeries);
  }
};
template <>
struct Layout<UnkeptFile> {
  static void of(auto& archive, auto& file) { archive(file.name, file.reason); }
};
template <>
struct Layout<RunStandard> {
  static void of(auto& archive, auto& standard) {
    archive(standard.anyHasSucceeded, standard.firstNumber, standard.firstCounts, standard.withoutLineEnds);
  }
};
template <>
struct Layout<ValidationPairs> {
  static void of(auto& archive, auto& pairs) { archive(pairs.count, pairs.missingCount); }
};
template <>
struct Layout<MeasurePairs> {
  static void of(auto& archive, auto& pairs) {
    archive(pairs.measure, pairs.count, pairs.missingCount, pairs.first, pairs.last, pairs.observed, pairs.simulated,
            pairs.file);
  }
};
template <>
struct Layout<FileForm> {
  static void of(auto& archive, auto& file) {
    archive(file.endsLine, file.numberCount, file.stepCount, file.firstStep, file.lastStep, file.gapStart, file.gapEnd);
  }
};
template <>
struct Layout<ValueSummary> {
  static void of(auto& archive, auto& values) { archive(values.least, values.mean, values.largest); }
};
template <>
struct Layout<PeriodSeries> {
  static void of(auto& archive, auto& series) { archive(series.seconds, series.values); }
};
template <>
struct Layout<EvaluationFailure> {
  static void of(auto& archive, auto& failure) { archive(failure.kind, failure.reason, failure.lastOutput); }
};
template <>
struct Layout<UnusedObservations> {
  static void of(auto& archive, auto& unused) { archive(unused.measure, unused.usedCount, unused.text); }
};

template <class Value>
constexpr bool kIsPlain = std::is_arithmetic_v<Value> || std::is_enum_v<Value>;

/// Turns a message into bytes, field by field.
class Writer final {
 public:
  template <class... Fields>
  void operator()(const Fields&... fields) {
    (put(fields), ...);
  }
  std::string take() { return std::move(content_); }

 private:
  template <class Value>
  void put(const Value& value) {
    if constexpr (kIsPlain<Value>) {
      content_.append(reinterpret_cast<const char*>(&value), sizeof value);
    } else {
      Layout<Value>::of(*this, value);
    }
  }
  void put(const std::string& text) {
    put(static_cast<std::uint64_t>(text.size()));
    content_.append(text);
  }
  template <class Item>
  void put(const std::vector<Item>& items) {
    put(static_cast<std::uint64_t>(items.size()));
    for (const Item& item : items) put(item);
  }
  void put(const std::vector<double>& values) {
    put(static_cast<std::uint64_t>(values.size()));
    content_.append(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(double));
  }
  template <class Value>
  void put(const std::optional<Value>& value) {
    put(value.has_value());
    if (value) put(*value);
  }

  std::string content_;
};

/// Restores a message from the bytes of a Writer.
class Reader final {
 public:
  explicit Reader(std::string_view content) : rest_(content) {}
  [[noreturn]] static void refuse() {
    fatalError(kCommunicationFailed,
               "a message has another form than expected: do all processes of the job run the same Mirevo?");
  }

  template <class... Fields>
  void operator()(Fields&... fields) {
    (get(fields), ...);
  }
  void expectEnd() const {
    if (!rest_.empty()) refuse();
  }

 private:
  template <class Value>
  void get(Value& value) {
    if constexpr (kIsPlain<Value>) {
      std::memcpy(&value, bytes(sizeof value).data(), sizeof value);
    } else {
      Layout<Value>::of(*this, value);
    }
  }
  void get(bool& value) { value = bytes(1).front() != '\0'; }
  void get(std::string& text) { text = bytes(count()); }
  template <class Item>
  void get(std::vector<Item>& items) {
    items.clear();
    for (auto left = count(); left > 0; --left) get(items.emplace_back());  // ends with the content, whatever the count
  }
  void get(std::vector<double>& values) {
    const auto size = count();
    if (size > rest_.size() / sizeof(double)) refuse();
    values.resize(size);
    if (size > 0) std::memcpy(values.data(), bytes(size * sizeof(double)).data(), size * sizeof(double));
  }
  template <class Value>
  void get(std::optional<Value>& value) {
    bool hasValue = false;
    get(hasValue);
    value.reset();
    if (hasValue) get(value.emplace());
  }

  std::uint64_t count() {
    std::uint64_t value = 0;
    get(value);
    return value;
  }
  std::string_view bytes(std::uint64_t count) {
    if (count > rest_.size()) refuse();
    const std::string_view taken = rest_.substr(0, count);
    rest_.remove_prefix(count);
    return taken;
  }

  std::string_view rest_;
};

template <class Message>
std::string written(const Message& message) {
  Writer writer;
  Layout<Message>::of(writer, message);
  return writer.take();
}

template <class Message>
Message read(std::string_view content) {
  Reader reader(content);
  Message message;
  Layout<Message>::of(reader, message);
  reader.expectEnd();
  return message;
}

}  // namespace

std::string encode(const BeginMessage& message) {
  return written(message);
}

BeginMessage decodeBegin(std::string_view content) {
  return read<BeginMessage>(content);
}

std::string encode(const SetMessage& message) {
  return written(message);
}

SetMessage decodeSet(std::string_view content) {
  return read<SetMessage>(content);
}

std::string encode(const ReadyMessage& message) {
  return written(message);
}

ReadyMessage decodeReady(std::string_view content) {
  return read<ReadyMessage>(content);
}

std::string encode(const ResultMessage& message) {
  return written(message);
}

ResultMessage decodeResult(std::string_view content) {
  auto message = read<ResultMessage>(content);
  const auto& failure = message.result.failure;
  if (failure && failure->kind > EvaluationFailure::Kind::notKnown) Reader::refuse();
  if (failure && failure->kind < EvaluationFailure::Kind{}) Reader::refuse();
  return message;
}

std::string encode(const KeepFolderMessage& message) {
  return written(message);
}

KeepFolderMessage decodeKeepFolder(std::string_view content) {
  return read<KeepFolderMessage>(content);
}

std::string encode(const GivenUpMessage& message) {
  return written(message);
}

GivenUpMessage decodeGivenUp(std::string_view content) {
  return read<GivenUpMessage>(content);
}

std::string encode(const FailureMessage& message) {
  return written(message);
}

FailureMessage decodeFailure(std::string_view content) {
  return read<FailureMessage>(content);
}

}  // namespace mirevo
