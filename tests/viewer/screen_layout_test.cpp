#include "viewer/screen_layout.h"

#include <cmath>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "viewer/course_plot.h"
#include "viewer/progress_records.h"

namespace mirevo {
namespace {

std::string textOf(const std::vector<ScreenLine>& lines) {
  std::string text;
  for (const ScreenLine& line : lines) text += line.text + "\n";
  return text;
}

ProgressState stateOf(std::string_view furtherRecords = "") {
  ProgressRecords records;
  records.feed(
      "STATUSInitialisation\nMESSAGRun started 2026-11-21 00:00:00 +0000 on vm, process 77\nMESSAGTitle: Größe\n"
      "STATUSParameter optimisation: Dynamically Dimensioned Search\nSTALBLModel evaluation\nMESLBL of 40\n"
      "MESSAGEvaluation of parameter set No. 1 completed: OK\nMESSAGBest so far: 8 (evaluation 1)\n"
      "MESSAGEvaluation of parameter set No. 2 completed: FAILED - model run error\n"
      "MESSAGEvaluation of parameter set No. 3 completed: OK\nMESSAGEvaluation of parameter set No. 4 completed: OK\n"
      "MESSAGBest so far: 2 (evaluation 4, 2026-11-21 01:00:00 +0000)\nCOMSPD0.01\nTIMLFT3600\nPROGRE10.0\n"
      "MESSAGEvaluation of parameter set No. 5 initiated\n",
      1795226400.0);  // 02:00:00
  records.feed(furtherRecords, 1795226400.0);
  return records.state();
}

ViewerSituation situationOf(RunPresence presence = RunPresence::running, double now = 1795226410.0) {
  return {.setupName = "basin", .presence = presence, .now = now};
}

TEST(ScreenLayout, AnOrdinaryScreen) {
  EXPECT_EQ(textOf(layoutScreen(stateOf(), situationOf(), {80, 24}, CharacterSet::utf8)),
            R"(Größe                                                                    running
Parameter optimisation: Dynamically Dimensioned Search

███████░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░░  10.0 %

Evaluations  4 of 40, 1 failed          Time left    59 min 50 s
Speed        36 an hour                 Running for  2 h
Best so far  2 (No. 4, 1 h ago)

8 ┤                   ─────────────────────────────────────────────────────────╮
  │                                                                            │
  │                                                                            │
  │                                                                            │
  │                                                                            │
  │                                                                            │
  │                                                                            │
2 ┤                                                                            ╰
   0                                                               4 evaluations

Evaluation of parameter set No. 2 completed: FAILED - model run error
Evaluation of parameter set No. 5 initiated


q cancel the run   d leave, the run goes on
)");
}

TEST(ScreenLayout, ANarrowOneInAscii) {
  EXPECT_EQ(textOf(layoutScreen(stateOf(), situationOf(), {40, 10}, CharacterSet::ascii)),
            R"(Gr??e                            running
Parameter optimisation: Dynamically D...
[###...........................]  10.0 %
Runs      4 of 40, 1 failed
Best      2 (No. 4, 1 h ago)
Time left 59 min 50 s
Speed     36 an hour
Running   2 h
Evaluation of parameter set No. 5 ini...
q cancel run   d leave
)");
}

TEST(ScreenLayout, NoSizeIsTooSmallAndNoLineTooLong) {
  ProgressState state = stateOf();
  state.title = std::string(300, 'T') + "\x1b[2J\xff";
  state.notices.assign(50, "\u6C34\u6C34\u6C34\u6C34 flood \u0301 " + std::string(300, 'm'));
  for (const CharacterSet characters : {CharacterSet::ascii, CharacterSet::utf8}) {
    for (int columns : {0, 1, 2, 5, 17, 39, 64, 65, 300}) {
      for (int rows : {0, 1, 2, 3, 5, 9, 19, 20, 100}) {
        for (const RunPresence presence :
             {RunPresence::awaited, RunPresence::running, RunPresence::vanished, RunPresence::ended}) {
          const auto lines = layoutScreen(state, situationOf(presence), {columns, rows}, characters);
          EXPECT_EQ(lines.size(), static_cast<std::size_t>(std::max(1, rows)));
          for (const ScreenLine& line : lines) {
            EXPECT_LE(displayWidth(line.text), std::max(1, columns)) << line.text;
            EXPECT_EQ(line.text.find('\x1b'), std::string::npos);
          }
        }
      }
    }
  }
}

TEST(ScreenLayout, WhatBecameOfTheRunIsSaid) {
  using enum RunPresence;
  // further records, presence, what is shown, what is not
  const std::tuple<std::string, RunPresence, std::vector<std::string>, std::string> cases[] = {
      {"", running, {" 10.0 %", "Running for"}, "Ran for"},
      {"STATUSEnded: Normal termination\nPROGRE100.0\n",
       ended,
       {"  ended\n", "Normal termination", "100.0 %", "Time left    -", "Ran for      2 h"},
       "q cancel"},
      {"STATUSEnded: Simulation cancelled\nPROGRE100.0\n", ended, {"Simulation cancelled", " 10.0 %"}, "100.0 %"},
      {"", vanished, {"  gone\n", "process 77"}, "q cancel"},
      {"MESLBL of 0\n", running, {"4 (0 planned), 1 failed"}, "4 of"},
      {"MESLBL of 0\nSTATUSEnded: Error: odd\nPROGRE100.0\n", ended, {"    - %", "Error: odd"}, "q cancel"},
      {"STATUSInitialisation\n",
       running,
       {"basin  ", "    - %", "Evaluations  none yet", "Best so far  none yet"},
       "Größe"}};
  for (const auto& [records, presence, shown, notShown] : cases) {
    const std::string text =
        textOf(layoutScreen(stateOf(records), situationOf(presence), {80, 24}, CharacterSet::utf8));
    for (const std::string& part : shown) EXPECT_THAT(text, HasSubstr(part));
    EXPECT_THAT(text, Not(HasSubstr(notShown)));
  }
}

TEST(ScreenLayout, ARunThatHasGoneQuietIsPointedOutByItsOwnPace) {
  // At 36 evaluations an hour three of them take five minutes.
  for (const auto& [quietSeconds, shown] :
       {std::pair{10.0, "  running\n"}, {290.0, "  running\n"}, {310.0, "no news for 5 min 10 s\n"}}) {
    const ViewerSituation situation = situationOf(RunPresence::running, 1795226400.0 + quietSeconds);
    EXPECT_THAT(textOf(layoutScreen(stateOf(), situation, {80, 24}, CharacterSet::utf8)), HasSubstr(shown));
  }
}

TEST(ScreenLayout, TheLastLineAsksTellsAndOffersKeys) {
  ViewerSituation situation = situationOf();
  situation.asksToCancel = true;
  for (const int columns : {120, 45, 20}) {
    const ScreenLine last = layoutScreen(stateOf(), situation, {columns, 10}, CharacterSet::utf8).back();
    EXPECT_THAT(last.text, ::testing::MatchesRegex("Cancel.*\\by\\b.*"));
    EXPECT_EQ(last.style, LineStyle::alarm);
  }
  situation = situationOf();
  situation.problem = "Unable to cancel: Permission denied";
  EXPECT_EQ(layoutScreen(stateOf(), situation, {80, 10}, CharacterSet::utf8).back().text, situation.problem);
  for (const auto& [width, line] : {std::pair{79, "2 h: 4 of 40 runs, 1 failed, best 2, 59 min 50 s left"},
                                    {50, "4 of 40 runs, 1 failed, best 2, 59 min 50 s left"},
                                    {40, "4 of 40 runs, 1 failed, best 2"},
                                    {25, "4 of 40 runs, 1 failed"},
                                    {12, "4 of 40 runs"},
                                    {10, "4 of 40"},
                                    {6, "4"}}) {
    EXPECT_EQ(liveLine(stateOf(), situationOf(), width, CharacterSet::ascii), line);
  }
  EXPECT_EQ(progressLine(stateOf(), situationOf()),
            "4 of 40 evaluations, 1 failed, 10.0 %, best so far 2 (No. 4, 1 h ago), 36 an hour, 59 min 50 s left");
}

TEST(CoursePlot, ValuesOverDecadesAreDrawnOnALogarithmicScale) {
  const std::vector<ProgressState::CoursePoint> decades{{1, 1000.0}, {4, 10.0}, {7, 0.1}};
  EXPECT_EQ(plotCourse(decades, 12, 19, 6, CharacterSet::ascii),
            (std::vector<std::string>{"1000 + ---+        ", "     |    |        ", "     |    +--+     ",
                                      "     |       |     ", " 0.1 +       +-----", "                 12"}));
}

TEST(CoursePlot, OddCoursesAreDrawnOrLeftOut) {
  using Course = std::vector<ProgressState::CoursePoint>;
  EXPECT_TRUE(plotCourse(Course{}, 10, 80, 10, CharacterSet::utf8).empty());
  EXPECT_TRUE(plotCourse(Course{{1, 1.0}}, 0, 80, 10, CharacterSet::utf8).empty());
  EXPECT_TRUE(plotCourse(Course{{1, 1.0}}, 10, 12, 10, CharacterSet::utf8).empty());
  EXPECT_TRUE(plotCourse(Course{{1, 1.0}}, 10, 80, 3, CharacterSet::utf8).empty());
  for (const Course& course : {Course{{1, 3.0}}, Course{{1, 1e308}, {2, -1e308}}, Course{{1, 1e30}, {5, 0.0}},
                               Course{{1, 1.0}, {2, 2.0}}, Course{{50, 4.0}}}) {
    const auto lines = plotCourse(course, 10, 40, 8, CharacterSet::utf8);
    EXPECT_EQ(lines.size(), 8U);
    for (const std::string& line : lines) EXPECT_LE(displayWidth(line), 40);
  }
}

TEST(DisplayText, NumbersForPeople) {
  const std::pair<double, const char*> durations[] = {
      {0.0, "0 s"},         {59.9, "59 s"}, {61.0, "1 min 1 s"},       {3600.0, "1 h"},
      {93600.0, "1 d 2 h"}, {-5.0, "0 s"},  {1e300, "11574074 d 1 h"}, {NAN, "0 s"}};
  for (const auto& [seconds, text] : durations) {
    EXPECT_EQ(durationText(seconds), text);
  }
  EXPECT_EQ(roughDurationText(3725.0), "1 h");
  EXPECT_EQ(roughDurationText(5.0), "5 s");
  for (const auto& [perSecond, text] :
       {std::pair{12.34, "12.3 a second"}, {0.5, "30 a minute"}, {0.01, "36 an hour"}, {1e-5, "0.864 a day"}}) {
    EXPECT_EQ(speedText(perSecond), text);
  }
}

TEST(DisplayText, OnlyWhatATerminalShowsOnOneLineIsLetThrough) {
  const std::tuple<std::string, const char*, const char*> cases[] = {{"a\tb\rc\x1b[31m", "a b?c?[31m", "a b?c?[31m"},
                                                                     {"Gr\u00FC\u00DFe", "Gr\u00FC\u00DFe", "Gr??e"},
                                                                     {"\xc0\xaf\xed\xa0\x80\xf5", "??????", "??????"},
                                                                     {"\xe2\x82", "??", "??"},
                                                                     {"x\u202Ey\u009Bz", "x?y?z", "x?y?z"},
                                                                     {std::string("\0\x7f", 2), "??", "??"}};
  for (const auto& [raw, utf8, ascii] : cases) {
    EXPECT_EQ(printable(raw, CharacterSet::utf8), utf8);
    EXPECT_EQ(printable(raw, CharacterSet::ascii), ascii);
  }
  EXPECT_EQ(displayWidth("\u6C34\u00FCe\u0301"), 4);
  EXPECT_EQ(fitted("\u6C34\u6C34\u6C34", 5, CharacterSet::utf8), "\u6C34\u6C34\u2026");
  EXPECT_EQ(fitted("abcdef", 5, CharacterSet::ascii), "ab...");
  EXPECT_EQ(padded("abc", 5, CharacterSet::ascii), "abc  ");
}

}  // namespace
}  // namespace mirevo
