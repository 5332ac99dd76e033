#pragma once

#include <optional>
#include <string>

namespace mirevo {

/// A message between two processes of one job.
struct Message {
  int rank = 0;         ///< the sender's
  int tag = 0;          ///< what it is; its meaning is the users' of the channel
  std::string content;  ///< bytes
};

/// Messages to and from the other processes of the job. Messages of one sender arrive in the order of sending.
class MessageChannel {
 public:
  MessageChannel() = default;
  MessageChannel(const MessageChannel&) = delete;
  MessageChannel& operator=(const MessageChannel&) = delete;
  virtual ~MessageChannel() = default;

  /// Number of processes in the job; their ranks count from 0.
  virtual int processCount() const = 0;

  /// Sends without ever waiting for the receiver. Throws FatalError when the job's communication is broken.
  virtual void send(int rank, int tag, std::string content) = 0;

  /// The next message from anyone; nothing when none has come within `seconds` (0: does not wait). Sleeps while it
  /// waits. Throws FatalError when the job's communication is broken.
  virtual std::optional<Message> receive(double seconds) = 0;
};

}  // namespace mirevo
