#include "run/progress/run_log.h"

#include <csignal>
#include <sys/resource.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "temporary_folder.h"

namespace mirevo {
namespace {

class RunLogTest : public testing::Test {
 protected:
  std::string content() const { return folder_.read("run.log"); }

  TemporaryFolder folder_;
  std::string path_ = folder_ / "run.log";
  std::string reason_;
  RunLog log_;
};

TEST_F(RunLogTest, LinesBeforeOpeningComeFirstAndAnOlderFileIsReplaced) {
  folder_.write("run.log", "an older run\n");
  log_.line("before");
  log_.warning("early");
  ASSERT_TRUE(log_.open(path_, reason_)) << reason_;
  EXPECT_EQ(content(), "before\nWarning: early\n");
  log_.line("two\nlines");
  log_.line("gr\xFCn");
  EXPECT_EQ(content(), "before\nWarning: early\ntwo\nlines\ngr\xEF\xBF\xBDn\n")
      << "a record is on disk when the call returns";
}

TEST_F(RunLogTest, WarningsAreCountedKeptAndPassedOn) {
  std::vector<std::string> heard;
  log_.warning("early");
  log_.passWarningsTo([&heard](std::string_view text) { heard.emplace_back(text); });
  for (std::size_t i = 1; i <= RunLog::kMostWarningsKept; ++i) log_.warning(std::to_string(i));
  EXPECT_EQ(log_.warningCount(), 21);
  EXPECT_EQ(log_.warnings().size(), 20U);
  EXPECT_EQ(log_.warnings().front(), "early");
  EXPECT_EQ(heard.size(), 20U);
  EXPECT_EQ(heard.front(), "Warning: 1");
}

TEST_F(RunLogTest, AHeadThatTheDiskHadNoRoomForComesLater) {
  ASSERT_TRUE(log_.open(path_, reason_)) << reason_;
  const auto before = std::signal(SIGXFSZ, SIG_IGN);
  rlimit limit{};
  ::getrlimit(RLIMIT_FSIZE, &limit);
  const rlimit none{0, limit.rlim_max};
  ::setrlimit(RLIMIT_FSIZE, &none);
  log_.line("Mirevo 1.2");
  log_.line("lost");
  ::setrlimit(RLIMIT_FSIZE, &limit);
  std::signal(SIGXFSZ, before);
  for (const char* text : {"Error", "end"}) log_.line(text);
  EXPECT_EQ(content(), "Mirevo 1.2\nError\nend\n");
  EXPECT_EQ(log_.writeError(), "File too large");
}

TEST_F(RunLogTest, OneThatIsEmptiedUnderWayHasItsHeadAgain) {
  ASSERT_TRUE(log_.open(path_, reason_)) << reason_;
  for (const char* text : {"Mirevo 1.2", "lost"}) log_.line(text);
  std::filesystem::resize_file(path_, 0);
  for (const char* text : {"next", "last"}) log_.line(text);
  EXPECT_EQ(content(), "Mirevo 1.2\nnext\nlast\n");
}

TEST_F(RunLogTest, RecordsOfAnotherWriterAreNotOverwritten) {
  ASSERT_TRUE(log_.open(path_, reason_)) << reason_;
  log_.line("first");
  const int copy = ::dup(log_.descriptor());
  ASSERT_EQ(::write(copy, "handler\n", 8), 8);
  log_.line("last");
  EXPECT_EQ(content(), "first\nhandler\nlast\n");
  log_.close();
  EXPECT_EQ(log_.descriptor(), -1);
  ::close(copy);
}

TEST_F(RunLogTest, WhatComesAfterItsEndIsPassedOnAndNotCounted) {
  std::vector<std::string> heard;
  ASSERT_TRUE(log_.open(path_, reason_)) << reason_;
  log_.passWarningsTo([&heard](std::string_view text) { heard.emplace_back(text); });
  for (const char* text : {"once closed", "twice closed"}) {
    log_.close();
    log_.warning(text);
  }
  EXPECT_EQ(heard, (std::vector<std::string>{"Warning: once closed", "Warning: twice closed"}));
  EXPECT_EQ(log_.warningCount(), 0);
  EXPECT_EQ(content(), "");
}

TEST_F(RunLogTest, AFileThatIsRemovedUnderWayComesBackWithAllThatWasInIt) {
  ASSERT_TRUE(log_.open(path_, reason_)) << reason_;
  log_.line("first");
  const int descriptor = log_.descriptor();  // a signal handler may have it already
  for (const char* text : {"second", "third"}) {
    std::filesystem::remove(path_);
    log_.line(text);
  }
  EXPECT_EQ(content(), "first\nsecond\nthird\n");
  EXPECT_EQ(log_.descriptor(), descriptor);
  EXPECT_EQ(log_.writeError(), "");
}

TEST_F(RunLogTest, FailuresOfTheSystemAreReported) {
  EXPECT_FALSE(log_.open(path_ + "/no/such/folder.log", reason_));
  EXPECT_EQ(reason_, "No such file or directory");
  ASSERT_TRUE(log_.open("/dev/full", reason_)) << reason_;
  EXPECT_EQ(log_.writeError(), "");
  log_.line("does not fit");
  EXPECT_EQ(log_.writeError(), "No space left on device");
}

}  // namespace
}  // namespace mirevo
