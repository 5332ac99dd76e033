#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>

namespace mirevo {

/// A message between two processes of one job.
struct Message {
  int rank = 0;         ///< the sender's
  int tag = 0;          ///< kind of the message, as defined by the user of the job
  std::string content;  ///< bytes
};

/// The message of a FatalError about a job's communication; the detail says more.
constexpr const char* kCommunicationFailed = "Error: MPI communication failed";

/// The job that this process is part of: the processes that a job launcher started together for one run, and messages
/// among them. A plain run is a job of one process.
class Job {
 public:
  Job() = default;
  Job(const Job&) = delete;
  Job& operator=(const Job&) = delete;
  virtual ~Job() = default;

  /// The name of the means of communication for messages to the user, "MPI"; empty in a job of one process.
  virtual std::string_view means() const = 0;

  /// This process's number: 0 the master, above 0 a worker; -1 in a job of one process.
  virtual int rank() const = 0;

  /// Number of processes in the job; ranks count from 0.
  virtual int processCount() const = 0;
  bool hasWorkers() const { return processCount() > 1; }

  /// Sends without ever waiting for the receiver. Messages of one sender arrive in the order of sending. Throws
  /// FatalError when the job's communication is broken.
  virtual void send(int rank, int tag, std::string content) = 0;

  /// The next message from any process; empty when none has come within `seconds` (0: does not wait). Sleeps while it
  /// waits. Throws FatalError when the job's communication is broken.
  virtual std::optional<Message> receive(double seconds) = 0;

  /// Leaves the job when every process of the job has come to do so and all messages are received. False, and still in
  /// it, when `isEnough`, which is called many times a second, says that it has waited long enough. Throws FatalError
  /// when the job's communication is broken.
  virtual bool finalise(const std::function<bool()>& isEnough) = 0;

  /// Whether the others go on when a process of the job is lost, as the user has asked the launcher. Such a job is left
  /// by leaveWithout(), never by finalise(), which would wait for those that are lost.
  virtual bool outlivesLosses() const { return false; }

  /// Whether that process is known to have ended, which is so in a job that outlives losses, and only of processes on
  /// this machine that have sent a message or received one.
  virtual bool hasEnded(int rank) {
    static_cast<void>(rank);
    return false;
  }

  /// For such a job: those processes are ended where that can be done, and end() will leave without them. Messages can
  /// be sent until then. The others must come to leave, too.
  virtual void leaveWithout(const std::set<int>& lost) { static_cast<void>(lost); }

  /// Ends every process of the job at once, for when one of them does not answer. Does not return.
  virtual void abort(int exitCode) = 0;

  /// The last call before the process ends with that exit code: aborts a job that it could not leave, and sees to it
  /// that the exit code becomes the launcher's.
  virtual void end(int exitCode) = 0;
};

/// Joins the job that a launcher has started; without one this process is a job of its own. Throws FatalError when a
/// launcher has started several processes that cannot be connected, as all of them would make the same run. To be
/// called before signal handlers are installed, as MPI may install some of its own.
std::unique_ptr<Job> joinJob();

}  // namespace mirevo
