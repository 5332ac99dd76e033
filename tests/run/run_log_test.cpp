#include "run/run_log.h"

#include <filesystem>
#include <unistd.h>

#include <gtest/gtest.h>

#include "common/files.h"

namespace mirevo {
namespace {

class RunLogTest : public testing::Test {
 protected:
  void SetUp() override {
    path_ = testing::TempDir() + "run_log_test_" + std::to_string(::getpid()) + ".log";
    std::filesystem::remove(path_);
  }
  void TearDown() override { std::filesystem::remove(path_); }
  std::string content() const { return readTextFile(path_, reason_).value_or("(unreadable)"); }

  std::string path_;
  mutable std::string reason_;
};

TEST_F(RunLogTest, LinesBeforeOpeningComeFirstAndAnOlderFileIsReplaced) {
  std::string reason;
  ASSERT_TRUE(writeByUnlinkAndCreate(path_, "an older run\n", 0644, reason)) << reason;
  RunLog log;
  log.line("before");
  log.warning("early");
  ASSERT_TRUE(log.open(path_, reason)) << reason;
  EXPECT_EQ(content(), "before\nWarning: early\n");
  log.line("two\nlines");
  EXPECT_EQ(content(), "before\nWarning: early\ntwo\nlines\n") << "a record is on disk when the call returns";
}

TEST_F(RunLogTest, RecordsOfAnotherWriterAreNotOverwritten) {
  std::string reason;
  RunLog log;
  ASSERT_TRUE(log.open(path_, reason)) << reason;
  log.line("first");
  const int copy = ::dup(log.descriptor());
  ASSERT_EQ(::write(copy, "handler\n", 8), 8);
  log.line("last");
  EXPECT_EQ(content(), "first\nhandler\nlast\n");
  log.close();
  EXPECT_EQ(log.descriptor(), -1);
  ::close(copy);
}

TEST_F(RunLogTest, FailuresOfTheSystemAreReported) {
  std::string reason;
  RunLog log;
  EXPECT_FALSE(log.open(path_ + "/no/such/folder.log", reason));
  EXPECT_EQ(reason, "No such file or directory");
  ASSERT_TRUE(log.open("/dev/full", reason)) << reason;
  EXPECT_EQ(log.writeError(), "");
  log.line("does not fit");
  EXPECT_EQ(log.writeError(), "No space left on device");
}

}  // namespace
}  // namespace mirevo
