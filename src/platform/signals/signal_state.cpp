#include "platform/signals/signal_state.h"

#include <array>
#include <cerrno>
#include <unistd.h>

namespace mirevo {

void writeLineFromSignal(int descriptor, std::string_view text, std::string_view prefix) noexcept {
  const int savedError = errno;
  std::array<char, 512> line;
  std::size_t length = 0;
  for (const std::string_view part : {prefix, text})
    length += part.copy(line.data() + length, line.size() - 1 - length);
  line[length++] = '\n';
  std::string_view rest(line.data(), length);
  while (!rest.empty()) {
    const ssize_t written = ::write(descriptor, rest.data(), rest.size());
    if (written < 0 && errno != EINTR) break;
    if (written > 0) rest.remove_prefix(static_cast<std::size_t>(written));
  }
  errno = savedError;
}

EndingSignalsHeld::EndingSignalsHeld() {
  sigset_t held;
  ::sigemptyset(&held);
  for (const int signalNumber : kEndingRequests) ::sigaddset(&held, signalNumber);
  ::sigprocmask(SIG_BLOCK, &held, &before_);
  if (signalState.heldSteps++ > 0 || !signalState.isEnding) return;
  // Another thread ends the run, or has just passed that on to this one: no further step may begin.
  --signalState.heldSteps;
  ::sigprocmask(SIG_SETMASK, &before_, nullptr);
  for (;;) ::pause();
}

EndingSignalsHeld::~EndingSignalsHeld() {
  --signalState.heldSteps;
  ::sigprocmask(SIG_SETMASK, &before_, nullptr);
}

}  // namespace mirevo
