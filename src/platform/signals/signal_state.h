#pragma once

#include <array>
#include <atomic>
#include <csignal>
#include <string_view>

namespace mirevo {

/// The little that a signal handler must reach: the program's only global state. Every member is lock-free.
struct SignalState {
  std::atomic<int> terminationLogUnit{0};  ///< a descriptor; nothing is written there while it is 0 or less
  std::atomic<int> runLogDescriptor{-1};
  std::atomic<int> resultFileDescriptor{-1};   ///< while it takes rows; not yet at its closing lines
  std::atomic<int> runRecordDescriptor{-1};    ///< while the record of the run has no ending
  std::atomic<int> messageFileDescriptor{-1};  ///< of the progress records
  std::atomic<int> heldSteps{0};               ///< EndingSignalsHeld that exist
  std::atomic<bool> isEnding{false};           ///< a request to end the run was taken
  /// Ends the model's processes, with async-signal-safe calls alone.
  std::atomic<void (*)()> haltProcesses{nullptr};
  std::atomic<bool> showsMessageBox{true};        ///< BUILDMODE is not "NIGHT"
  std::atomic<bool> writesStandardOutput{false};  ///< "NIGHT", and `G48` names no front end
};

static_assert(std::atomic<int>::is_always_lock_free && std::atomic<void (*)()>::is_always_lock_free);

inline SignalState signalState;

/// Writes `prefix`, `text` and a line end with one write(2), of 512 bytes at most. Async-signal-safe; a failure is
/// ignored.
void writeLineFromSignal(int descriptor, std::string_view text, std::string_view prefix = {}) noexcept;

/// The signals that ask the run to end, rather than tell of its crash.
inline constexpr std::array kEndingRequests{SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGXCPU};

/// While one exists the requests to end the run wait, so that no file is left in the middle of a step. For the main
/// thread; they may be nested.
class EndingSignalsHeld final {
 public:
  EndingSignalsHeld();
  ~EndingSignalsHeld();
  EndingSignalsHeld(const EndingSignalsHeld&) = delete;
  EndingSignalsHeld& operator=(const EndingSignalsHeld&) = delete;

 private:
  sigset_t before_;
};

}  // namespace mirevo
