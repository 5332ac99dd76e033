#pragma once

#include "platform/jobs/job.h"

namespace mirevo {

/// The job of a plain run: this process alone.
class SingleProcess final : public Job {
 public:
  std::string_view means() const override { return {}; }
  int rank() const override { return -1; }
  int processCount() const override { return 1; }
  /// Never called: there is nobody to send to.
  void send(int rank, int tag, std::string content) override;
  std::optional<Message> receive(double seconds) override;
  bool finalise(const std::function<bool()>& isEnough) override;
  void abort(int exitCode) override;
  void end(int) override {}
};

}  // namespace mirevo
