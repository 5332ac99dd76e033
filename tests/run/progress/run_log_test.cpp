#include "run/progress/run_log.h"

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
};

TEST_F(RunLogTest, LinesBeforeOpeningComeFirstAndAnOlderFileIsReplaced) {
  std::string reason;
  folder_.write("run.log", "an older run\n");
  RunLog log;
  log.line("before");
  log.warning("early");
  ASSERT_TRUE(log.open(path_, reason)) << reason;
  EXPECT_EQ(content(), "before\nWarning: early\n");
  log.line("two\nlines");
  EXPECT_EQ(content(), "before\nWarning: early\ntwo\nlines\n") << "a record is on disk when the call returns";
}

TEST_F(RunLogTest, WarningsAreCountedKeptAndPassedOn) {
  RunLog log;
  std::vector<std::string> heard;
  log.warning("early");
  log.passWarningsTo([&heard](std::string_view text) { heard.emplace_back(text); });
  for (std::size_t i = 1; i <= RunLog::kMostWarningsKept; ++i) log.warning(std::to_string(i));
  EXPECT_EQ(log.warningCount(), 21);
  EXPECT_EQ(log.warnings().size(), 20U);
  EXPECT_EQ(log.warnings().front(), "early");
  EXPECT_EQ(heard.size(), 20U);
  EXPECT_EQ(heard.front(), "Warning: 1");
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

TEST_F(RunLogTest, AFileThatIsRemovedUnderWayComesBackWithAllThatWasInIt) {
  std::string reason;
  RunLog log;
  ASSERT_TRUE(log.open(path_, reason)) << reason;
  log.line("first");
  const int descriptor = log.descriptor();  // a signal handler may have it already
  for (const char* text : {"second", "third"}) {
    std::filesystem::remove(path_);
    log.line(text);
  }
  EXPECT_EQ(content(), "first\nsecond\nthird\n");
  EXPECT_EQ(log.descriptor(), descriptor);
  EXPECT_EQ(log.writeError(), "");
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
