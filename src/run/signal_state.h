#pragma once

#include <atomic>
#include <string_view>

namespace mirevo {

/// The little that a signal handler must reach: the program's only global state. Every member is lock-free.
struct SignalState {
  std::atomic<int> terminationLogUnit{0};  ///< a descriptor; nothing is written there while it is 0 or less
  std::atomic<int> runLogDescriptor{-1};
  /// Ends the model's processes, with async-signal-safe calls alone.
  std::atomic<void (*)()> haltProcesses{nullptr};
  std::atomic<bool> showsMessageBox{true};        ///< BUILDMODE is not "NIGHT"
  std::atomic<bool> writesStandardOutput{false};  ///< "NIGHT", and `G48` names no front end
};

static_assert(std::atomic<int>::is_always_lock_free && std::atomic<void (*)()>::is_always_lock_free);

inline SignalState signalState;

/// Writes `text` and a line end with write(2). Async-signal-safe; a failure is ignored.
void writeLineFromSignal(int descriptor, std::string_view text) noexcept;

}  // namespace mirevo
