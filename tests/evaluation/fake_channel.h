#pragma once

#include <deque>
#include <functional>
#include <string>
#include <vector>

#include "evaluation/ranks/rank_messages.h"
#include "platform/jobs/message_channel.h"

namespace mirevo {

/// A channel to processes that are not there: notes what is sent, and delivers what the test has put into it.
class FakeChannel final : public MessageChannel {
 public:
  explicit FakeChannel(int processCount) : processCount_(processCount) {}

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

  void deliver(int rank, RankMessage tag, std::string content) {
    arriving.push_back({rank, static_cast<int>(tag), std::move(content)});
  }

  std::vector<Message> sent;  ///< the ranks are the receivers'
  std::deque<Message> arriving;
  std::function<void(const Message&)> onSend;
  std::function<void(double)> onReceive;

 private:
  int processCount_;
};

}  // namespace mirevo
