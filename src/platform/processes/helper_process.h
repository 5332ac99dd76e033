#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <sys/types.h>

namespace mirevo {

class ReadingWatch;

/// A child process of this program, forked as it is, for work that may hang, crash or take all memory. It has a socket
/// to the program and no other file of it, prints nothing, ignores the signals of the terminal, and ends with the
/// program, however that ends. It may have helpers of its own, and has none of those of the program.
class HelperProcess final {
 public:
  enum class Outcome { done, ended, over };

  HelperProcess() = default;
  ~HelperProcess() { end(); }
  HelperProcess(const HelperProcess&) = delete;
  HelperProcess& operator=(const HelperProcess&) = delete;

  /// Starts it: it runs `serve` with its end of the socket, and ends when that returns. False, with the system's
  /// reason, when that fails.
  bool start(const std::function<void(int socket)>& serve, std::string& reason);
  bool isRunning() const;
  /// Ends it (SIGKILL), whatever it does.
  void end();
  /// Closes the socket and forgets the process, which ends by itself once it has noticed that.
  void leave();
  /// After Outcome::ended, waits for its end: "was ended by signal 11 (Segmentation fault)".
  std::string endAndDescribe();
  /// After that: whether something else ended it with SIGKILL, which is no fault of its work. (A limit of its time ends
  /// it with SIGXCPU, one of its memory with an answer.)
  bool wasKilled() const { return wasKilled_; }

  /// Whether receive() has something to take at once, be it that the process has ended.
  bool hasAnswer() const;
  /// Both wait until all of the bytes are through, the process has ended, or the time of `watch` is over.
  Outcome send(const void* bytes, std::size_t size, ReadingWatch& watch);
  Outcome receive(void* bytes, std::size_t size, ReadingWatch& watch);
  /// Adds what has arrived, without a wait; Outcome::ended when no more can come.
  Outcome receiveArrived(std::string& bytes) const;
  /// Becomes readable when something arrives, or the process ends.
  int socket() const { return socket_; }

 private:
  Outcome transfer(char* bytes, std::size_t size, bool isSending, ReadingWatch& watch);
  bool isOwn() const;

  pid_t process_ = 0;
  pid_t owner_ = 0;  ///< the process that started it
  int socket_ = -1;
  bool wasKilled_ = false;
};

/// Whether this child of the program is such a process, which it ends and reaps itself.
bool isHelperProcess(pid_t process);

/// The same in the helper, with the program at the other end; false when that is gone.
bool sendFromHelper(int socket, const void* bytes, std::size_t size);
bool receiveInHelper(int socket, void* bytes, std::size_t size);

/// Whether limitOwnMemory() has an effect: not in a build with a sanitizer, which takes far more address space than
/// memory.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
inline constexpr bool kLimitsMemory = false;
#elif defined(__has_feature)
inline constexpr bool kLimitsMemory = !(__has_feature(address_sanitizer) || __has_feature(thread_sanitizer));
#else
inline constexpr bool kLimitsMemory = true;
#endif

/// From now on this process gets no more than so many bytes of memory beyond what it has.
void limitOwnMemory(std::uintmax_t bytes);
/// From now on this process may compute so many seconds; SIGXCPU then ends it.
void limitOwnTime(double seconds);

}  // namespace mirevo
