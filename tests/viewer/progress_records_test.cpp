#include "viewer/progress_records.h"

#include <fmt/format.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

constexpr std::string_view kRun =
    "STATUSInitialisation\n"
    "MESSAGRun started 2026-11-21 05:12:14 +0130 on vm, the big one, process 6670\n"
    "PROGRE0.0\n"
    "MESSAGTitle: Small test basin\n"
    "STATUSParameter optimisation: Dynamically Dimensioned Search\n"
    "STALBLModel evaluation\n"
    "MESLBL of 60\n"
    "MESSAGEvaluation of parameter set No. 1 taken from the earlier run: OK\n"
    "MESSAGBest so far: 1.25 (evaluation 1)\n"
    "COMSPD52.3\nTIMLFT1\nPROGRE1.7\n"
    "MESSAGEvaluation of parameter set No. 2 completed: FAILED - model run error\n"
    "MESSAGEvaluation of parameter set No. 3 repeats No. 1: the model gets the same values, and is not run\n"
    "MESSAGEvaluation of parameter set No. 3 completed: OK\n"
    "MESSAGBest so far: -2e-05 (evaluation 3, 2026-11-21 05:12:16 +0130)\n"
    "COMSPD2.5\nTIMLFT23\nPROGRE5.0\n"
    "MESSAGEvaluation of parameter set No. 4 initiated\n";

void expectState(const ProgressState& state) {
  EXPECT_EQ(state.title, "Small test basin");
  EXPECT_EQ(state.task, "Parameter optimisation: Dynamically Dimensioned Search");
  EXPECT_EQ(state.ending, "");
  EXPECT_EQ(state.origin.host, "vm, the big one");
  EXPECT_EQ(state.origin.process, 6670);
  EXPECT_EQ(state.origin.startedAt, 1795232534.0);  // 2026-11-21 03:42:14 UTC
  EXPECT_EQ(state.planned, 60);
  EXPECT_EQ(state.done, 3);
  EXPECT_EQ(state.failed, 1);
  EXPECT_EQ(state.percent, 5.0);
  EXPECT_EQ(state.perSecond, 2.5);
  EXPECT_EQ(state.secondsLeft, 23.0);
  ASSERT_TRUE(state.best);
  EXPECT_EQ(state.best->aggregate, -2e-05);
  EXPECT_EQ(state.best->evaluation, 3);
  EXPECT_EQ(state.best->foundAt, 1795232536.0);
  ASSERT_EQ(state.course.size(), 2U);
  EXPECT_EQ(state.course[0].evaluations, 1);
  EXPECT_EQ(state.course[1].evaluations, 3);
  ASSERT_EQ(state.notices.size(), 1U);
  EXPECT_EQ(state.notices[0], "Evaluation of parameter set No. 2 completed: FAILED - model run error");
  EXPECT_EQ(state.latestMessage, "Evaluation of parameter set No. 4 initiated");
}

TEST(ProgressRecords, ARunIsTakenUpWhateverPiecesItsBytesComeIn) {
  for (const std::size_t piece : {std::size_t{1}, std::size_t{7}, std::size_t{4096}}) {
    ProgressRecords records;
    for (std::size_t i = 0; i < kRun.size(); i += piece) records.feed(kRun.substr(i, piece), 5.0);
    SCOPED_TRACE(piece);
    expectState(records.state());
  }
}

TEST(ProgressRecords, WhatIsNoWholeRecordIsPassedOver) {
  const std::string longLine = "MESSAG" + std::string(1'000'000, 'x') + "\n";
  const std::vector<std::string> garbage{
      "\n", "STAT\n", "status lower case\n", std::string("\0\0\0\n", 4), "\xff\xfe\x80\n", "COMSPDfast\n", "COMSPD-1\n",
      "COMSPD1e999\n", "TIMLFTnan\n", "PROGRE\n", "PROGRE-5\n", "MESLBLmany\n", "Evaluation of parameter set No. 9\n",
      // cut off, as the last line of a run that is being written
      "COMSPD9", "PROGRE99"};
  ProgressRecords records;
  records.feed(kRun, 5.0);
  for (const std::string& line : garbage) records.feed(line.ends_with('\n') ? line : line + "\r" + "x\n", 5.0);
  expectState(records.state());
  records.feed("PROGRE9", 5.0);
  EXPECT_EQ(records.state().percent, 5.0);
  records.feed("0.5\r\n", 5.0);
  EXPECT_EQ(records.state().percent, 90.5);
  records.feed("PROGRE250\n", 5.0);
  EXPECT_EQ(records.state().percent, 100.0);
  for (int i = 0; i < 300; ++i) records.feed(longLine, 5.0);
  EXPECT_EQ(records.state().notices.size(), 200U);
  EXPECT_LE(records.state().notices.back().size(), 4096U);
}

TEST(ProgressRecords, MessagesOfUnknownFormAreNoticesAndCountNothing) {
  for (const std::string text :
       {"Best so far: ", "Best so far: low (evaluation 3)", "Best so far: 1.5", "Best so far: 1.5 (evaluation x)",
        "Evaluation of parameter set No. x completed: OK", "Evaluation of parameter set No. "}) {
    ProgressRecords records;
    records.feed("MESSAG" + text + "\n", 5.0);
    EXPECT_FALSE(records.state().best) << text;
    EXPECT_EQ(records.state().done, 0) << text;
    EXPECT_EQ(records.state().notices.size(), 1U) << text;
  }
  for (const std::string text :
       {"Run started", "Run started 2026-13-01 00:00:00 +0000 on x, process 1", "Run started "}) {
    ProgressRecords records;
    records.feed("MESSAG" + text + "\n", 5.0);
    EXPECT_FALSE(records.state().origin.startedAt) << text;
  }
}

TEST(ProgressRecords, AnotherRunInTheSameFileBeginsFromNothing) {
  ProgressRecords records;
  records.feed(std::string(kRun) + "STATUSEnded: Error: the end\nPROGRE100.0\n", 5.0);
  EXPECT_EQ(records.state().ending, "Error: the end");
  EXPECT_EQ(records.state().task, "Parameter optimisation: Dynamically Dimensioned Search");
  records.feed("STATUSInitialisation\n", 6.0);
  EXPECT_EQ(records.state().ending, "");
  EXPECT_EQ(records.state().done, 0);
  EXPECT_FALSE(records.state().best);
  records.feed(kRun, 7.0);
  expectState(records.state());
}

TEST(ProgressRecords, ALongCourseIsThinnedAndKeepsItsShape) {
  ProgressRecords records;
  records.feed("STALBLModel evaluation\n", 5.0);
  constexpr int kCount = 100'000;
  for (int i = 1; i <= kCount; ++i) {
    records.feed(fmt::format("MESSAGEvaluation of parameter set No. {0} completed: OK\n"
                             "MESSAGBest so far: {1} (evaluation {0})\n",
                             i, kCount - i),
                 5.0);
  }
  const auto& course = records.state().course;
  EXPECT_LT(course.size(), 4096U);
  EXPECT_EQ(course.front().evaluations, 1);
  EXPECT_GT(course.back().evaluations, kCount - 200);
  for (const auto& point : course) EXPECT_EQ(point.aggregate, static_cast<double>(kCount - point.evaluations));
}

TEST(ProgressRecords, MessagesAreHandedOnWhereTheyAreWanted) {
  ProgressRecords records;
  std::vector<std::string> messages;
  records.feed("MESSAGone\nPROGRE5\nMESSAGtw", 5.0, &messages);
  records.feed("o\n", 5.0, &messages);
  EXPECT_EQ(messages, (std::vector<std::string>{"one", "two"}));
}

}  // namespace
}  // namespace mirevo
