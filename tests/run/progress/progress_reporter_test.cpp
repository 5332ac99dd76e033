#include "run/progress/progress_reporter.h"

#include <algorithm>
#include <array>
#include <csignal>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include <fmt/format.h>
#include <gtest/gtest.h>

#include "common/progress_messages.h"
#include "temporary_folder.h"
#include "viewer/message_file.h"

namespace mirevo {
namespace {

class ProgressReporterTest : public ::testing::Test {
 protected:
  std::string init(ProgressReporter& reporter, const std::string& destination = "") {
    return reporter.progressInit((folder_ / "basin.log"), destination);
  }

  TemporaryFolder folder_;
  double now_ = 1000.0;
  ProgressReporter reporter_{[this] { return now_; }};
};

TEST_F(ProgressReporterTest, AMessageFileHoldsOneRecordALineKindFirst) {
  folder_.write("basin._spi_", "left from an earlier and longer run, which must not show through\n");
  EXPECT_EQ(init(reporter_), "");
  reporter_.progressStart("2026-11-21 04:10:09 +0100", "host", 7);
  reporter_.progressEvaluationLabel(4);
  reporter_.writeMessage("two\nlines");
  now_ += 2.0;
  reporter_.progressStep();
  now_ += 2.0;
  reporter_.progressStep();
  reporter_.progressBest(2, 0.1, "2026-11-21 04:12:09 +0100");
  reporter_.progressEnd("Normal termination");
  reporter_.writeMessage("after the end");
  EXPECT_EQ(folder_.read("basin._spi_"),
            "STATUSInitialisation\nMESSAGRun started 2026-11-21 04:10:09 +0100 on host, process "
            "7\nPROGRE0.0\nSTALBLModel evaluation\nMESLBL of 4\nMESSAGtwo lines\n"
            "COMSPD0.5\nTIMLFT6\nPROGRE25.0\nCOMSPD0.5\nTIMLFT4\nPROGRE50.0\n"
            "MESSAGBest so far: 0.1 (evaluation 2, 2026-11-21 04:12:09 +0100)\n"
            "STATUSEnded: Normal termination\nPROGRE100.0\n");
}

TEST_F(ProgressReporterTest, StandardOutputTakesMessagesAloneAndNoneTakesNothing) {
  for (const std::string destination : {"STDOUT", "NONE"}) {
    ProgressReporter reporter([this] { return now_; });
    EXPECT_EQ(init(reporter, destination), "");
    ::testing::internal::CaptureStdout();
    reporter.progressStart("2026-11-21 04:10:09 +0100", "host", 7);
    reporter.progressEvaluationLabel(2);
    reporter.writeMessage("Evaluation of parameter set No. 1 initiated");
    reporter.progressStep();
    reporter.progressEnd("Normal termination");
    EXPECT_EQ(::testing::internal::GetCapturedStdout(), destination == "STDOUT"
                                                            ? " Run started 2026-11-21 04:10:09 +0100 on host, process "
                                                              "7\n Evaluation of parameter set No. 1 initiated\n"
                                                            : "");
    EXPECT_FALSE(folder_.exists("basin._spi_"));
  }
}

/// A viewer that looks now and then must know as much as one that has seen every record.
TEST_F(ProgressReporterTest, AMessageFileThatIsBegunAnewTellsAViewerTheSame) {
  constexpr std::uintmax_t kMostBytes = 200'000;  // a whole file would have twice as much
  ProgressReporter reporter([this] { return now_; }, kMostBytes);
  init(reporter);
  ProgressRecords all;
  reporter.passRecordsTo([&all](std::string_view record) { all.feed(record, 0.0); });
  MessageFile file(folder_ / "basin._spi_");
  ProgressRecords seen;
  reporter.progressStart("2026-11-21 04:10:09 +0100", "host", 7);
  reporter.writeMessage("Title: T");
  reporter.writeStatus("Parameter optimisation");
  reporter.progressEvaluationLabel(4000);
  std::uintmax_t longest = 0;
  for (int number = 1; number <= 3000; ++number) {
    const bool isReplayed = number <= 1000;
    if (isReplayed) {
      reporter.progressReplayed(number, number % 200 != 0);
    } else {
      reporter.writeMessage(progress::completedMessage(number, number % 200 == 0 ? "FAILED - x" : "OK"));
    }
    if (number % 3 == 0) reporter.progressBest(number, 1.0 / number, "");
    if (number % 500 == 0) reporter.writeMessage(fmt::format("Warning: {}", number));
    now_ += 1.0;
    if (!isReplayed) reporter.progressStep();
    longest = std::max(longest, std::filesystem::file_size(folder_ / "basin._spi_"));
    while (number % 70 == 0 && file.readPiece(seen)) {
    }
  }
  reporter.progressEnd("Normal termination");
  EXPECT_LT(longest, kMostBytes + 5000);
  MessageFile late(folder_ / "basin._spi_");
  ProgressRecords latest;
  while (file.readPiece(seen) || late.readPiece(latest)) {
  }
  for (const ProgressRecords* const viewer : {&seen, &latest}) {
    const ProgressState& state = viewer->state();
    EXPECT_EQ(state.done, 3000);
    EXPECT_EQ(state.failed, 15);
    EXPECT_EQ(state.title, "T");
    EXPECT_EQ(state.ending, "Normal termination");
    EXPECT_EQ(state.origin.process, 7);
    EXPECT_EQ(state.planned, 4000);
    EXPECT_EQ(state.perSecond, all.state().perSecond);
    EXPECT_EQ(state.best->evaluation, 3000);
    EXPECT_EQ(state.best->aggregate, all.state().best->aggregate);
    EXPECT_EQ(state.notices.size(), all.state().notices.size());
    EXPECT_EQ(state.notices.back(), all.state().notices.back());
    for (const ProgressState::CoursePoint& point : state.course) {
      EXPECT_EQ(point.aggregate, 1.0 / static_cast<double>(point.evaluations));
    }
    EXPECT_GT(state.course.size(), 100U);
    EXPECT_EQ(state.course.front().evaluations, 3);
  }
}

TEST_F(ProgressReporterTest, SpeedFollowsTheLatestEvaluationsAndProgressStopsAtAHundred) {
  init(reporter_);
  reporter_.progressEvaluationLabel(320);
  for (int i = 0; i < 200; ++i) reporter_.progressStep();  // no time passes: no speed can be told
  EXPECT_EQ(folder_.read("basin._spi_").find("COMSPD"), std::string::npos);
  for (int i = 0; i < 150; ++i) {
    now_ += 10.0;
    reporter_.progressStep();
  }
  const std::string records = folder_.read("basin._spi_");
  EXPECT_TRUE(records.ends_with("COMSPD0.1\nTIMLFT0\nPROGRE100.0\n")) << records.substr(records.size() - 60);
  EXPECT_NE(records.find("COMSPD0.1\nTIMLFT10\nPROGRE99.7\n"), std::string::npos);
}

TEST_F(ProgressReporterTest, OnlyAKillFileOfThisRunCancelsItAndForGood) {
  folder_.write("basin._kill_", "");
  init(reporter_);
  EXPECT_FALSE(folder_.exists("basin._kill_"));
  EXPECT_FALSE(reporter_.isCancelled());
  folder_.write("basin._kill_", "");
  now_ += 0.002;
  reporter_.progressStep();
  std::filesystem::remove((folder_ / "basin._kill_"));
  EXPECT_TRUE(reporter_.isCancelled());
}

TEST_F(ProgressReporterTest, AMessageFileThatCannotBeOpenedIsReportedAndTheRunGoesOn) {
  std::filesystem::create_directories((folder_ / "basin._spi_"));
  EXPECT_TRUE(init(reporter_).starts_with("Unable to open TqQmon2 message file: " + (folder_ / "basin._spi_")));
  reporter_.progressStart("2026-11-21 04:10:09 +0100", "host", 7);
  reporter_.progressStep();
  EXPECT_FALSE(reporter_.isCancelled());
}

TEST_F(ProgressReporterTest, AReaderThatStopsReadingLosesRecordsAndHoldsUpNothing) {
  const std::string pipe = (folder_ / "basin._spi_");
  ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
  EXPECT_NE(init(reporter_), "");  // nobody reads it
  const int reader = ::open(pipe.c_str(), O_RDONLY | O_NONBLOCK);
  EXPECT_EQ(init(reporter_), "");
  const std::string text(200, 'x');
  for (int i = 0; i < 1000; ++i) reporter_.writeMessage(text);  // more than a pipe holds
  std::string records;
  const auto readAll = [&] {
    std::array<char, 4096> piece{};
    for (ssize_t count = 1; count > 0;) {
      count = ::read(reader, piece.data(), piece.size());
      if (count > 0) records.append(piece.data(), static_cast<std::size_t>(count));
    }
  };
  readAll();
  reporter_.writeMessage("taken again");
  readAll();
  EXPECT_LT(std::count(records.begin(), records.end(), '\n'), 1000);
  EXPECT_TRUE(records.ends_with("xxx\nMESSAGtaken again\n"));
  EXPECT_EQ(records.find("xMESSAG"), std::string::npos);
  ::signal(SIGPIPE, SIG_IGN);
  ::close(reader);
  reporter_.writeMessage("nobody reads it any more");
}

TEST_F(ProgressReporterTest, TheBaseNameLosesOnlyAKnownEnding) {
  for (const auto& [file, messages] :
       {std::pair{"a.log", "a._spi_"}, {"b.inp", "b._spi_"}, {"c.inp.log", "c.inp._spi_"}, {"d.txt", "d.txt._spi_"}}) {
    ProgressReporter reporter([this] { return now_; });
    reporter.progressInit((folder_ / file), "");
    EXPECT_TRUE(folder_.exists(messages)) << file;
  }
}

}  // namespace
}  // namespace mirevo
