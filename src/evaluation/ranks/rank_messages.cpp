#include "evaluation/ranks/rank_messages.h"

#include "common/fatal_error.h"
#include "evaluation/result_layout.h"
#include "platform/jobs/job.h"

namespace mirevo {

template <>
struct Layout<BeginMessage> {
  static void of(auto& archive, auto& message) { archive(message.setupFile, message.text); }
};
template <>
struct Layout<SetMessage> {
  static void of(auto& archive, auto& message) {
    archive(message.number, message.set, message.standard, message.repeatedMeasures, message.isFinal);
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
template <>
struct Layout<RunStandard> {
  static void of(auto& archive, auto& standard) {
    archive(standard.anyHasSucceeded, standard.firstNumber, standard.firstCounts, standard.withoutLineEnds);
  }
};

namespace {

template <class Message>
Message read(std::string_view content) {
  try {
    return messageOf<Message>(content);
  } catch (const BadMessage& bad) {
    fatalError(kCommunicationFailed, std::string(bad.what()) + ": do all processes of the job run the same Mirevo?");
  }
}

}  // namespace

std::string encode(const BeginMessage& message) {
  return bytesOf(message);
}

BeginMessage decodeBegin(std::string_view content) {
  return read<BeginMessage>(content);
}

std::string encode(const SetMessage& message) {
  return bytesOf(message);
}

SetMessage decodeSet(std::string_view content) {
  return read<SetMessage>(content);
}

std::string encode(const ReadyMessage& message) {
  return bytesOf(message);
}

ReadyMessage decodeReady(std::string_view content) {
  return read<ReadyMessage>(content);
}

std::string encode(const ResultMessage& message) {
  return bytesOf(message);
}

ResultMessage decodeResult(std::string_view content) {
  return read<ResultMessage>(content);
}

std::string encode(const KeepFolderMessage& message) {
  return bytesOf(message);
}

KeepFolderMessage decodeKeepFolder(std::string_view content) {
  return read<KeepFolderMessage>(content);
}

std::string encode(const GivenUpMessage& message) {
  return bytesOf(message);
}

GivenUpMessage decodeGivenUp(std::string_view content) {
  return read<GivenUpMessage>(content);
}

std::string encode(const FailureMessage& message) {
  return bytesOf(message);
}

FailureMessage decodeFailure(std::string_view content) {
  return read<FailureMessage>(content);
}

}  // namespace mirevo
