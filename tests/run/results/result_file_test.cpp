#include "run/results/result_file.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <csignal>
#include <sys/resource.h>
#include <thread>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/checksum.h"
#include "common/text.h"
#include "refusal.h"
#include "run/results/failed_run_file.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

EvaluationResult success(int number, double measure, double objective) {
  EvaluationResult result;
  result.number = number;
  result.measureValues = {measure};
  result.objectiveValues = {objective};
  result.aggregate = objective;
  return result;
}

EvaluationResult failure(int number) {
  EvaluationResult result = success(number, kFailedRunValue, kFailedRunValue);
  result.failure = EvaluationFailure{EvaluationFailure::Kind::exitCode, "run.sh exited with code 3", {"a", "b"}};
  return result;
}

const ResultColumns kColumns{{"Manning n"}, {"Q\tRMSE"}, {"#1 \"fit\""}};
const std::vector<std::string> kHead{"Upper basin\nsecond line", "Mirevo 1"};
constexpr std::string_view kHeadText =
    "# Upper basin\n# second line\n# Mirevo 1\nEvaluation\tStatus\tManning n\tQ RMSE\t_1 'fit'\tAggregate\n";

class ResultFileTest : public ::testing::Test {
 protected:
  void open() { results_.open(path_, kHead, kColumns); }
  void add(const EvaluationResult& result, double parameter) {
    results_.addRow(resultRow(std::span(&parameter, 1), result));
  }

  /// Whether each row on disk is as one of its checksums says; how many checksums there are.
  std::size_t checksums() const {
    const RowChecksums checksums = readRowChecksums(folder_.read("r_Checksums.dat"));
    const std::string text = folder_.read("r.dat");
    for (const std::string_view line : splitLines(text)) {
      const int number = parseInteger(line.substr(0, line.find('\t'))).value_or(0);
      const bool isRow = !line.empty() && line.front() >= '0' && line.front() <= '9';
      EXPECT_TRUE(!isRow || checksums.has({number, checksumOf(line)})) << line;
    }
    return checksums.size();
  }

  TemporaryFolder folder_;
  std::string path_ = (folder_ / "r.dat");
  ResultFile results_{folder_ / "r_Checksums.dat", {"Mirevo 1"}};
  std::string reason_;
};

TEST_F(ResultFileTest, EveryRowIsOnDiskAtOnceAndReadsBackExactly) {
  open();
  EXPECT_EQ(folder_.read("r.dat"), kHeadText);
  add(success(1, 0.1 + 0.2, 5e-324), 1.0 / 3.0);
  add(failure(2), -0.0);
  EXPECT_EQ(folder_.read("r.dat"), std::string(kHeadText) +
                                       "1\tOK\t0.3333333333333333\t0.30000000000000004\t5e-324\t5e-324\n"
                                       "2\tFAILED\t-0\t1e+30\t1e+30\t1e+30\n");
  EXPECT_EQ(checksums(), 2U);
}

TEST_F(ResultFileTest, RowsEndUpInTheOrderOfTheirNumbers) {
  for (const std::vector<int>& arrival : {std::vector{1, 2, 3}, {3, 1, 2}, {2, 3, 1}, std::vector<int>{}}) {
    open();
    for (const int number : arrival) add(success(number, number, number), number);
    const std::vector<std::string> closing{"done", "Best evaluation: 1"};
    ASSERT_TRUE(results_.finish(closing, reason_)) << reason_;
    std::string expected(kHeadText);
    if (!arrival.empty()) expected += "1\tOK\t1\t1\t1\t1\n2\tOK\t2\t2\t2\t2\n3\tOK\t3\t3\t3\t3\n";
    EXPECT_EQ(folder_.read("r.dat"), expected + "# done\n# Best evaluation: 1\n");
    EXPECT_FALSE(folder_.exists("r.dat.tmp"));
    EXPECT_EQ(checksums(), arrival.size());
  }
}

TEST_F(ResultFileTest, ChecksumsFollowTheAggregatesThatAreSettledAtTheEnd) {
  std::filesystem::create_directories((folder_ / "r.dat.tmp"));
  for (const bool succeeds : {false, true}) {
    open();
    for (const int number : {2, 1}) add(success(number, 1, std::nan("")), number);
    results_.replaceAggregate(1, 5.0);
    EXPECT_EQ(results_.finish({}, reason_), succeeds);
    EXPECT_EQ(checksums(), succeeds ? 2U : 3U);  // before the rows are replaced those of both are there
    std::filesystem::remove(folder_ / "r.dat.tmp");
  }
  EXPECT_TRUE(folder_.read("r.dat").ends_with("1\tOK\t1\t1\tNaN\t5\n2\tOK\t2\t1\tNaN\tNaN\n"));
}

TEST_F(ResultFileTest, RowsThatAreTakenUpHaveTheirChecksumsWhateverTheFileHeld) {
  const double parameter = 1.0;
  const std::vector<ResultRow> rows{resultRow(std::span(&parameter, 1), success(7, 1, 2)),
                                    resultRow(std::span(&parameter, 1), success(8, 1, 2))};
  for (const char* before : {"", "Evaluation\tChecksum\n7\t00000000000000ff\n9\t00000000000000ff\n8\t0000"}) {
    folder_.write("r_Checksums.dat", before);
    results_.open(path_, kHead, kColumns, rows);
    EXPECT_EQ(checksums(), 2U);
    add(success(9, 1, 2), 1);
    EXPECT_EQ(checksums(), 3U);
    results_.replaceAggregate(7, 2.0);  // as it is
    results_.replaceAggregate(8, 3.0);
    ASSERT_TRUE(results_.finish({}, reason_)) << reason_;
    EXPECT_EQ(checksums(), 3U);
    EXPECT_THAT(folder_.read("r.dat"), testing::HasSubstr("\n7\tOK\t1\t1\t2\t2\n8\tOK\t1\t1\t2\t3\n9\t"));
  }
}

TEST_F(ResultFileTest, TheFirstRowThatRepeatsAnotherBringsItsColumn) {
  open();
  add(success(2, 1, 1), 4.0);
  folder_.write("r.dat", folder_.read("r.dat") + "a note of another program");
  add(failure(1), 3.0);
  const double parameter = 4.0;
  ResultRow repeat = resultRow(std::span(&parameter, 1), success(3, 1, 1));
  repeat.repeats = 2;
  results_.addRow(repeat);
  add(success(4, 1, std::nan("")), 5.0);
  EXPECT_EQ(results_.rowOf(3)->repeats, 2);
  EXPECT_EQ(results_.rowOf(2)->parameters, std::vector{4.0});
  EXPECT_TRUE(results_.isRepeat(3) && !results_.isRepeat(2) && !results_.isRepeat(9) && !results_.rowOf(9));
  EXPECT_EQ(checksums(), 4U);
  results_.replaceAggregate(4, 2.0);
  ASSERT_TRUE(results_.finish(std::vector<std::string>{"done"}, reason_)) << reason_;
  EXPECT_EQ(checksums(), 4U);
  const std::string_view head = kHeadText.substr(0, kHeadText.size() - 1);
  EXPECT_EQ(folder_.read("r.dat"), std::string(head) + "\tRepeats\n" +
                                       "1\tFAILED\t3\t1e+30\t1e+30\t1e+30\t0\n2\tOK\t4\t1\t1\t1\t0\n"
                                       "3\tOK\t4\t1\t1\t1\t2\n4\tOK\t5\t1\tNaN\t2\t0\n"
                                       "a note of another program\n# done\n");
  // A restart takes it up with its column.
  const ResultTable table = readResultTable(folder_.read("r.dat"), kColumns);
  ASSERT_EQ(table.rows.size(), 4U);
  results_.open(path_, kHead, kColumns, table.rows);
  add(success(5, 1, 1), 6.0);
  EXPECT_TRUE(results_.isRepeat(3));
  EXPECT_TRUE(folder_.read("r.dat").ends_with("\n5\tOK\t6\t1\t1\t1\t0\n"));
  EXPECT_EQ(checksums(), 5U);
}

TEST_F(ResultFileTest, AFileThatWasRemovedIsPutBackBeforeItGetsTheColumnOfRepeats) {
  open();
  add(success(1, 1, 1), 1);
  std::filesystem::remove(path_);
  ResultRow repeat = resultRow(std::vector<double>{1}, success(2, 1, 1));
  repeat.repeats = 1;
  results_.addRow(repeat);
  ASSERT_TRUE(results_.finish({}, reason_)) << reason_;
  EXPECT_THAT(folder_.read("r.dat"), testing::EndsWith("\tRepeats\n1\tOK\t1\t1\t1\t1\t0\n2\tOK\t1\t1\t1\t1\t1\n"));
  EXPECT_EQ(checksums(), 2U);
}

TEST_F(ResultFileTest, TheColumnOfRepeatsIsRefusedWhereTheFileIsNotAsItWasWritten) {
  open();
  add(success(1, 1, 1), 1.0);
  folder_.write("r.dat", folder_.read("r.dat").replace(kHeadText.size(), 1, "7"));
  EXPECT_FALSE(results_.rowOf(1).has_value());
  const double parameter = 1.0;
  ResultRow repeat = resultRow(std::span(&parameter, 1), success(2, 1, 1));
  repeat.repeats = 1;
  EXPECT_THAT(refusalOf([&] { results_.addRow(repeat); }), testing::HasSubstr("another program has changed it"));
}

TEST_F(ResultFileTest, RowsStayWhereTheyAreWhenTheyCannotBePutInOrder) {
  std::filesystem::create_directories((folder_ / "r.dat.tmp/in the way"));
  open();
  add(success(2, 2, 2), 2);
  add(success(1, 1, 1), 1);
  EXPECT_FALSE(results_.finish(std::vector<std::string>{"done"}, reason_));
  EXPECT_EQ(reason_, "Is a directory");
  EXPECT_TRUE(folder_.read("r.dat").ends_with("2\tOK\t2\t2\t2\t2\n1\tOK\t1\t1\t1\t1\n# done\n"));
}

TEST_F(ResultFileTest, OneThatAnotherProgramHasShortenedTakesNoMoreRows) {
  for (const bool isAtEnd : {false, true}) {
    open();
    for (const int number : {2, 1}) add(success(number, 1, 1), 1);
    const std::string text = folder_.read("r.dat");
    folder_.write("r.dat", text.substr(0, 60));
    if (!isAtEnd) reason_ = refusalOf([this] { add(success(3, 1, 1), 1); });
    EXPECT_FALSE(isAtEnd && results_.finish({}, reason_));
    EXPECT_THAT(reason_, testing::HasSubstr("another program has shortened it, from "));
    EXPECT_EQ(folder_.read("r.dat").size(), 60U);
    folder_.write("r.dat", text);
    EXPECT_EQ(results_.finish({}, reason_), isAtEnd) << "it is closed after the first, and failed before the other";
    EXPECT_EQ(folder_.read("r.dat"), text);
  }
}

TEST_F(ResultFileTest, OneThatSeemsShorterForAMomentIsNot) {
  open();
  add(success(1, 1, 1), 1);
  const std::string text = folder_.read("r.dat");
  std::filesystem::resize_file(path_, 60);
  std::thread mend([&] { folder_.write("r.dat", text); });
  add(success(2, 1, 1), 1);
  mend.join();
  EXPECT_EQ(folder_.read("r.dat"), text + "2\tOK\t1\t1\t1\t1\n");

  std::filesystem::resize_file(path_, 60);
  std::thread edit([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    std::filesystem::resize_file(path_, 1000);
  });
  EXPECT_THAT(refusalOf([this] { add(success(3, 1, 1), 1); }), testing::HasSubstr("another program has shortened it"));
  edit.join();
}

TEST_F(ResultFileTest, OneThatAnotherFileReplacesIsNotCalledRemoved) {
  open();
  std::filesystem::rename(folder_.write("other", ""), path_);
  EXPECT_THAT(refusalOf([this] { add(success(1, 1, 1), 1); }), testing::HasSubstr("another program has replaced it"));
}

TEST_F(ResultFileTest, OneThatAnotherProgramHasWrittenAgainIsLeftAsItIs) {
  for (const auto& [isReplaced, isInOrder] : {std::pair{true, false}, {false, false}, {true, true}, {false, true}}) {
    open();
    for (const int number : {isInOrder ? 1 : 2, isInOrder ? 2 : 1}) add(success(number, 1, 1), 1);
    std::string text = folder_.read("r.dat");
    text.insert(text.find("2\tOK"), "3\tOK\t1\t1\t1\t1\n");
    const std::string written = folder_.write(isReplaced ? "other" : "r.dat", text);
    if (isReplaced) std::filesystem::rename(written, path_);
    EXPECT_FALSE(results_.finish({}, reason_));
    EXPECT_THAT(reason_, testing::HasSubstr(isReplaced ? "has replaced it" : "has changed it: the row of evaluation"));
    EXPECT_EQ(folder_.read("r.dat"), text);
  }
}

TEST_F(ResultFileTest, WhatAnotherProgramAppendsStays) {
  open();
  add(success(2, 1, 1), 1);
  folder_.write("r.dat", folder_.read("r.dat") + "# a note");
  add(success(1, 1, 1), 1);
  EXPECT_THAT(folder_.read("r.dat"), testing::EndsWith("# a note\n1\tOK\t1\t1\t1\t1\n"));
  ASSERT_TRUE(results_.finish({}, reason_)) << reason_;
  EXPECT_THAT(folder_.read("r.dat"), testing::EndsWith("1\tOK\t1\t1\t1\t1\n2\tOK\t1\t1\t1\t1\n# a note\n"));
}

TEST_F(ResultFileTest, ARowWithoutRoomForItsChecksumIsNotWritten) {
  open();
  ::signal(SIGXFSZ, SIG_IGN);
  rlimit limit{};
  ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &limit), 0);
  const rlimit none{0, limit.rlim_max};
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &none), 0);
  const std::string refusal = refusalOf([this] { add(success(1, 1, 1), 1); });
  ::setrlimit(RLIMIT_FSIZE, &limit);
  EXPECT_EQ(refusal, "Error: Unable to write to " + (folder_ / "r_Checksums.dat") + "\nFile too large");
  EXPECT_FALSE(folder_.read("r.dat").ends_with("1\tOK\t1\t1\t1\t1\n"));
}

TEST(KeepEarlierFile, NumbersWithoutOverwriting) {
  const TemporaryFolder folder;
  // The name, the file that is made, and what is kept.
  const std::tuple<const char*, const char*, const char*> cases[] = {
      {"a.b/r.dat", "a.b/r.dat", "a.b/r.1.dat"},
      {"a.b/r.dat", "a.b/r.dat", "a.b/r.2.dat"},
      {"a.b/r.dat", nullptr, ""},
      {"a.b/no_ending", "a.b/no_ending", "a.b/no_ending.1"},
      {"v1.1.2_Saved", "v1.1.2_Saved/1/out.csv", "v1.1.2_Saved.1"}};
  for (const auto& [name, madeFile, kept] : cases) {
    if (madeFile != nullptr) folder.write(madeFile, kept);
    EXPECT_EQ(keepEarlierFile(folder / name), *kept == '\0' ? "" : folder / kept);
  }
  EXPECT_EQ(folder.read("a.b/r.1.dat"), "a.b/r.1.dat");
  EXPECT_EQ(folder.read("v1.1.2_Saved.1/1/out.csv"), "v1.1.2_Saved.1");
  EXPECT_EQ(keepEarlierFile("/dev/full"), "");
}

TEST(FailedRunFile, AppearsWithTheFirstFailureAndSaysWhatHappened) {
  const TemporaryFolder folder;
  FailedRunFile file({folder / "calSimErr.dat", folder / "basin_Failures.dat"}, "basin", {"k", "n"}, {});
  EXPECT_FALSE(folder.exists("calSimErr.dat"));
  const std::vector<double> values{0.1, 2.0};
  file.add(values, failure(4));
  EvaluationResult silent = failure(9);
  silent.failure->lastOutput = {"\xE9t\xC3\xA9"};  // the first in Latin-1
  file.add(values, silent);
  EXPECT_EQ(folder.read("calSimErr.dat"),
            "# Failed evaluations of basin\n"
            "\nEvaluation No. 4 (batch ended with an exit code)\n   run.sh exited with code 3\n   k = 0.1\n   n = 2\n"
            "   Last output:\n   | a\n   | b\n"
            "\nEvaluation No. 9 (batch ended with an exit code)\n   run.sh exited with code 3\n   k = 0.1\n   n = 2\n"
            "   Last output:\n   | \xEF\xBF\xBDt\xC3\xA9\n");
}

}  // namespace
}  // namespace mirevo
