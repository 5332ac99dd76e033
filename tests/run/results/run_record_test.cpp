#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/fatal_error.h"
#include "run/results/run_record_file.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;

RunRecord begun() {
  RunRecord record;
  record.task = "optimisation";
  record.program = "1.2.3";
  record.started = "2001-02-03 04:05:06";
  record.restarted = {"2001-02-04 04:05:06", "2001-02-05 04:05:06"};
  record.plannedEvaluations = 31;
  record.seed = -4;
  record.warningCount = 22;
  record.warnings = {"first\nline", "second"};
  return record;
}

/// What only a run that has ended can know.
void complete(RunRecord& record) {
  record.initialEvaluation = 2;
  record.best = ShownEvaluation{17, 0.1 + 0.2};
  record.evaluations = 31;
  record.failed = 3;
  record.repeats = 12;
  record.analysed = 28;
  record.failuresByKind = {{"exitCode", 2}, {"timedOut", 1}};
  record.scales = {{"flow # 1", 0.1, -2.0}, {"", 1e-300, 0.0}};
  record.ended = "2001-02-05 05:00:00";
  record.stage = RunStage::failed;
  record.message = "Error: why\n\tstate\tfinished\n# more";
}

TEST(RunRecord, ReadsBackAsItWasWritten) {
  RunRecord record = begun();
  const auto before = readRunRecord(runRecordText(record, {"Title"}));
  ASSERT_TRUE(before.has_value());
  EXPECT_FALSE(before->stage);
  complete(record);
  const std::string text = runRecordText(record, {"Title"});
  const auto read = readRunRecord(text);
  ASSERT_TRUE(read.has_value());
  EXPECT_EQ(runRecordText(*read, {"Title"}), text);
  EXPECT_EQ(read->best, record.best);
  EXPECT_EQ(read->restarted, record.restarted);
  EXPECT_EQ(read->warningCount, 22);
  EXPECT_EQ(read->warnings, record.warnings);
  EXPECT_EQ(read->failuresByKind, record.failuresByKind);
  EXPECT_EQ(read->analysed, 28);
  EXPECT_EQ(read->repeats, 12);
  EXPECT_EQ(read->scales.at(0).objective, "flow # 1");
  EXPECT_EQ(read->stage, RunStage::failed);
  EXPECT_EQ(read->message, record.message);
  EXPECT_FALSE(readRunRecord(""));
  EXPECT_FALSE(readRunRecord("Evaluation\tStatus\n"));
}

TEST(RunRecordFile, HoldsTheEndingOfTheRunOrOfTheSignalThatEndedIt) {
  const TemporaryFolder folder;
  RunRecordFile file(folder / "s_Run.dat", {"Title"});
  std::string reason;
  EXPECT_FALSE(file.readEarlier());
  EXPECT_TRUE(file.end(reason)) << "it has not begun";
  EXPECT_FALSE(folder.exists("s_Run.dat"));

  file.begin(begun());
  EXPECT_FALSE(file.readEarlier()->stage) << "killed now, it has no ending";
  for (const RunStage stage : {RunStage::cutOff, RunStage::failed}) {
    const std::string before = folder.read("s_Run.dat");
    folder.write("s_Run.dat", before + endingBeforeMessage(stage) + "Termination request\n");
    EXPECT_EQ(file.readEarlier()->stage, stage);
    EXPECT_EQ(file.readEarlier()->message, "Termination request");
  }
  complete(file.record());
  ASSERT_TRUE(file.end(reason)) << reason;
  EXPECT_EQ(file.readEarlier()->evaluations, 31);
  EXPECT_EQ(file.readEarlier()->restarted, begun().restarted);

  folder.write("in the way/s_Run.dat.tmp/file", "");
  RunRecordFile other(folder / "in the way/s_Run.dat", {});
  EXPECT_THROW(other.begin(begun()), FatalError);
}

// What version 0.1.0 left, kept as it was.
TEST(RunRecord, OfAnEarlierVersionIsReadFromItsResults) {
  const std::string rows =
      "# Started: monthly means\n# Mirevo 0.1.0\n# Started: 2026-11-21 04:10:09\n# Restarted: 2026-11-22 04:10:09\n"
      "Evaluation\tStatus\tk\tAggregate\n1\tOK\t1\t2\n";
  const ResultColumns columns{{"k"}, {}, {}};
  const RunRecord cutOff = recordOfEarlierVersion(readResultTable(rows, columns));
  EXPECT_EQ(cutOff.started, "2026-11-21 04:10:09") << "a title may look like anything";
  EXPECT_THAT(cutOff.restarted, ElementsAre("2026-11-22 04:10:09"));
  EXPECT_FALSE(cutOff.stage);
  const RunRecord ended = recordOfEarlierVersion(readResultTable(
      rows + "# Optimisation terminated: Population converged\n# Ended: 2026-11-23 04:10:09\n# Best evaluation: 7\n",
      columns));
  EXPECT_EQ(ended.stage, RunStage::finished);
  EXPECT_EQ(ended.message, "Optimisation terminated: Population converged");
  EXPECT_EQ(ended.ended, "2026-11-23 04:10:09");
  EXPECT_EQ(ended.best->number, 7);
}

}  // namespace
}  // namespace mirevo
