#pragma once

#include <memory>
#include <string>

#include "platform/jobs/message_channel.h"

namespace mirevo {

/// The program's part in an MPI job. MPI is touched only when a job launcher has started this process together with
/// others, so that a plain run pays nothing for it.
class MpiSession final : public MessageChannel {
 public:
  MpiSession();
  ~MpiSession() override;

  /// Joins the job that a launcher has started. Without one, or where the job has a single process, nothing happens.
  /// Throws FatalError when the launcher started several processes and MPI cannot bring them together: they would all
  /// do the same run. Call it before signal handlers are installed, as MPI installs some of its own.
  void start();

  bool inUse() const { return processCount_ > 1; }
  /// -1 without MPI.
  int rank() const { return inUse() ? rank_ : -1; }
  int processCount() const override { return processCount_; }

  void send(int rank, int tag, std::string content) override;
  std::optional<Message> receive(double seconds) override;

  /// Leaves the job; every process of it must do so. Nothing happens when MPI is not in use. Throws FatalError when
  /// what was sent last is not taken within `seconds`.
  void finalise(double seconds);

  /// Ends every process of the job at once: the way out when one of them does not answer.
  [[noreturn]] void abort(int exitCode) const;

 private:
  struct Traffic;
  int rank_ = -1;
  int processCount_ = 1;
  std::unique_ptr<Traffic> traffic_;
};

/// This process's number as the job launcher gave it to its environment, known without MPI; -1 without a launcher.
int launcherRank();

}  // namespace mirevo
