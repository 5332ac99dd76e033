// Any bytes as a message between the ranks of a job: refused with a FatalError, or the same message when sent on.

#include <cstdint>
#include <string_view>

#include "common/fatal_error.h"
#include "evaluation/ranks/rank_messages.h"
#include "require.h"

namespace {

template <class Message>
void tryMessage(Message (*decode)(std::string_view), std::string_view content) {
  const std::string sent = mirevo::encode(decode(content));
  require(sent.size() == content.size() && mirevo::encode(decode(sent)) == sent);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size == 0) return 0;
  const std::string_view content(reinterpret_cast<const char*>(data) + 1, size - 1);
  try {
    switch (data[0] % 7) {
      case 0:
        tryMessage(mirevo::decodeBegin, content);
        break;
      case 1:
        tryMessage(mirevo::decodeSet, content);
        break;
      case 2:
        tryMessage(mirevo::decodeReady, content);
        break;
      case 3:
        tryMessage(mirevo::decodeResult, content);
        if (const auto failure = mirevo::decodeResult(content).result.failure) failureKindName(failure->kind);
        break;
      case 4:
        tryMessage(mirevo::decodeKeepFolder, content);
        break;
      case 5:
        tryMessage(mirevo::decodeGivenUp, content);
        break;
      default:
        tryMessage(mirevo::decodeFailure, content);
    }
  } catch (const mirevo::FatalError&) {
  }
  return 0;
}
