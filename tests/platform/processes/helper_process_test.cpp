#include "platform/processes/helper_process.h"

#include <csignal>
#include <memory>
#include <new>
#include <poll.h>
#include <string>
#include <tuple>
#include <unistd.h>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/reading_watch.h"
#include "matchers.h"

namespace mirevo {
namespace {

using Outcome = HelperProcess::Outcome;

void sendBack(int socket) {
  std::vector<char> bytes(3'000'000);
  while (receiveInHelper(socket, bytes.data(), bytes.size())) sendFromHelper(socket, bytes.data(), bytes.size());
}
void crash(int) {
  std::raise(SIGSEGV);
}
void hang(int) {
  while (true) ::pause();
}
void leave(int) {}
/// Answers with 1 if it does not get its memory.
void takeMemory(int socket) {
  limitOwnMemory(64'000'000);
  char isRefused = 0;
  try {
    const std::vector<char> much(200'000'000, 'x');
    isRefused = much.back() == 'x' ? 0 : 2;
  } catch (const std::bad_alloc&) {
    isRefused = 1;
  }
  sendFromHelper(socket, &isRefused, 1);
}

TEST(HelperProcess, WhatBecomesOfItIsToldAndLimited) {
  // what it does, how receiving its answer ends, what is said of its end
  const std::tuple<void (*)(int), Outcome, std::string> cases[] = {
      {crash, Outcome::ended, "was ended by signal 11 (Segmentation fault)"},
      {leave, Outcome::ended, "has ended"},
      {hang, Outcome::over, ""}};
  HelperProcess helper;
  std::string reason;
  for (const auto& [serve, outcome, end] : cases) {
    ASSERT_TRUE(helper.start(serve, reason)) << reason;
    ReadingWatch watch;
    watch.begin(outcome == Outcome::over ? 0.05 : 60.0, "0.05 seconds");
    char answer = 0;
    EXPECT_EQ(helper.receive(&answer, 1, watch), outcome) << end;
    EXPECT_EQ(helper.isRunning(), outcome == Outcome::over) << end;
    if (outcome == Outcome::ended) {
      EXPECT_EQ(helper.endAndDescribe(), end);
    }
  }
  // Whoever waits for it may be called away.
  struct Called {};
  ReadingWatch watch;
  watch.begin(60.0, "", [] { throw Called(); });
  char answer = 0;
  EXPECT_THROW(helper.receive(&answer, 1, watch), Called);
  helper.end();
  EXPECT_FALSE(helper.isRunning());
}

TEST(HelperProcess, ManyBytesPassBothWays) {
  HelperProcess helper;
  std::string reason;
  ASSERT_TRUE(helper.start(sendBack, reason)) << reason;
  std::vector<char> sent(3'000'000);
  for (std::size_t i = 0; i < sent.size(); ++i) sent[i] = static_cast<char>(i / 7);
  std::vector<char> received(sent.size());
  ReadingWatch watch;
  EXPECT_EQ(helper.send(sent.data(), sent.size(), watch), Outcome::done);
  EXPECT_EQ(helper.receive(received.data(), received.size(), watch), Outcome::done);
  EXPECT_EQ(received, sent);
}

TEST(HelperProcess, AnotherOneHasItsOwnAlone) {
  HelperProcess first;
  HelperProcess second;
  std::string reason;
  ASSERT_TRUE(first.start(sendBack, reason)) << reason;
  const auto useFirst = [&](int socket) {
    std::string answer = first.isRunning() ? "inherited" : "none";
    first.end();
    if (first.start(hang, reason) && first.isRunning()) answer += ", own";
    first.end();
    if (!first.isRunning()) answer += ", ended";
    sendFromHelper(socket, answer.data(), answer.size());
  };
  ASSERT_TRUE(second.start(useFirst, reason)) << reason;
  std::string answer;
  while (second.receiveArrived(answer) == Outcome::done) {
    pollfd poll{second.socket(), POLLIN, 0};
    ::poll(&poll, 1, 1000);
  }
  EXPECT_EQ(answer, "none, own, ended");
  ASSERT_TRUE(first.isRunning());
  ReadingWatch watch;
  std::vector<char> bytes(3'000'000);
  EXPECT_EQ(first.send(bytes.data(), bytes.size(), watch), Outcome::done);
  EXPECT_EQ(first.receive(bytes.data(), bytes.size(), watch), Outcome::done);
}

TEST(HelperProcess, ItsMemoryIsLimited) {
  if constexpr (!kLimitsMemory) GTEST_SKIP() << "a sanitizer takes far more address space than memory";
  HelperProcess helper;
  std::string reason;
  ASSERT_TRUE(helper.start(takeMemory, reason)) << reason;
  ReadingWatch watch;
  char isRefused = 0;
  EXPECT_EQ(helper.receive(&isRefused, 1, watch), Outcome::done);
  EXPECT_EQ(isRefused, 1);
}

}  // namespace
}  // namespace mirevo
