#pragma once

#include <deque>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "evaluation/ranks/rank_messages.h"
#include "platform/jobs/job.h"

namespace mirevo {

/// The master's or a worker's part in a job whose other processes are not there: notes what is sent, and delivers what
/// the test has put into it.
class FakeJob final : public Job {
 public:
  /// What aborting the job throws, as it must not return.
  struct Aborted {
    int exitCode;
  };

  explicit FakeJob(int processCount, int rank = 0) : processCount_(processCount), rank_(rank) {}

  std::string_view means() const override { return "MPI"; }
  int rank() const override { return rank_; }
  int processCount() const override { return processCount_; }
  void send(int rank, int tag, std::string content) override {
    sent.push_back({rank, tag, std::move(content)});
    if (onSend) onSend(sent.back());
  }
  std::optional<Message> receive(double seconds) override {
    if (onReceive) onReceive(seconds);
    if (arriving.empty()) return std::nullopt;
    Message message = std::move(arriving.front());
    arriving.pop_front();
    return message;
  }
  bool finalise(const std::function<bool()>& isEnough) override {
    ++finalisations;
    while (!othersLeave && !isEnough()) receive(1.0);
    return othersLeave;
  }
  bool outlivesLosses() const override { return outlives; }
  bool hasEnded(int rank) override { return ended.contains(rank); }
  void leaveWithout(const std::set<int>& lost) override { leftWithout = lost; }
  void abort(int exitCode) override { throw Aborted{exitCode}; }
  void end(int) override {}

  void deliver(int rank, RankMessage tag, std::string content) {
    arriving.push_back({rank, static_cast<int>(tag), std::move(content)});
  }

  std::vector<Message> sent;  ///< the ranks are the receivers'
  std::deque<Message> arriving;
  std::function<void(const Message&)> onSend;
  std::function<void(double)> onReceive;
  bool othersLeave = true;
  bool outlives = false;
  std::set<int> ended;
  std::optional<std::set<int>> leftWithout;
  int finalisations = 0;

 private:
  int processCount_;
  int rank_;
};

}  // namespace mirevo
