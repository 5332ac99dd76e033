#pragma once

#include <array>
#include <atomic>
#include <csignal>
#include <string_view>

namespace mirevo {

/// The data that signal handlers need: the program's only global state. Every member is lock-free.
struct SignalState {
  std::atomic<int> terminationLogUnit{0};  ///< a descriptor; 0 or less: none
  std::atomic<int> runLogDescriptor{-1};
  std::atomic<int> resultFileDescriptor{-1};   ///< while rows are written; -1 from the closing lines on
  std::atomic<int> runRecordDescriptor{-1};    ///< until the end of the run is recorded
  std::atomic<int> messageFileDescriptor{-1};  ///< of the progress records
  std::atomic<int> liveLineDescriptor{-1};     ///< of a terminal whose last line is rewritten in place
  std::atomic<int> heldSteps{0};               ///< number of EndingSignalsHeld objects
  std::atomic<bool> isEnding{false};           ///< a handler has begun to end the run
  /// Ends the model processes; async-signal-safe.
  std::atomic<void (*)()> haltProcesses{nullptr};
  std::atomic<bool> showsMessageBox{true};        ///< BUILDMODE is not "NIGHT"
  std::atomic<bool> writesStandardOutput{false};  ///< "NIGHT", and `G48` names no front end
};

static_assert(std::atomic<int>::is_always_lock_free && std::atomic<void (*)()>::is_always_lock_free);

inline SignalState signalState;

/// Moves the cursor of a terminal to the beginning of its line, which it empties (ECMA-48).
inline constexpr std::string_view kClearLine = "\r\x1b[K";

/// Writes `prefix`, `text` and a line end, at most 512 bytes, with one write(2). Async-signal-safe; failures are
/// ignored.
void writeLineFromSignal(int descriptor, std::string_view text, std::string_view prefix = {}) noexcept;

/// The signals that request the end of the run; the other handled signals report a crash.
inline constexpr std::array kEndingRequests{SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGXCPU};

/// Holds back signals that request the end of the run while it exists, so that no step is interrupted half-way and no
/// file is left incomplete. For the main thread; objects may be nested.
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
