#include "common/descriptor_output.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <poll.h>
#include <unistd.h>

namespace mirevo {
namespace {

bool takesOutput(int descriptor, int patienceMilliseconds) {
  pollfd ready{descriptor, POLLOUT, 0};
  int count = 0;
  do {
    count = ::poll(&ready, 1, patienceMilliseconds);
  } while (count < 0 && errno == EINTR);
  return count != 0;  // after an error write(2) tells which
}

}  // namespace

OutputResult writeWhole(int descriptor, std::string_view text, int patienceMilliseconds) {
  // A pipe that accepts anything accepts this much without waiting, and in one piece.
  constexpr std::size_t kMostAtOnce = PIPE_BUF;
  const bool asksFirst = patienceMilliseconds != kAsLongAsItTakes;
  OutputResult result;
  while (result.taken < text.size()) {
    if (asksFirst && !takesOutput(descriptor, patienceMilliseconds)) return {result.taken, EAGAIN};
    const std::size_t rest = text.size() - result.taken;
    const ssize_t written =
        ::write(descriptor, text.data() + result.taken, asksFirst ? std::min(rest, kMostAtOnce) : rest);
    if (written >= 0) {
      result.taken += static_cast<std::size_t>(written);
    } else if (errno == EAGAIN && !asksFirst) {
      takesOutput(descriptor, kAsLongAsItTakes);
    } else if (errno != EINTR) {
      return {result.taken, errno};
    }
  }
  return result;
}

}  // namespace mirevo
