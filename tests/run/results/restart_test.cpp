#include "run/results/restart.h"

#include <cmath>
#include <functional>
#include <tuple>

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "common/run_files.h"
#include "run/results/failed_run_file.h"
#include "run/results/restart_settings.h"
#include "run/results/simulated_values_file.h"
#include "run/results/unkept_files.h"
#include "run/setup_fixture.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class RestartSettingsTest : public SetupFixture {
 protected:
  /// Through the file, as a restarted run meets them.
  static std::vector<std::string> changes(const RunConfig& then, const RunConfig& now) {
    const auto read = parseRestartSettings(formatRestartSettings(restartSettings(then)));
    EXPECT_TRUE(read.has_value());
    return changedSettings(*read, restartSettings(now));
  }
};

TEST_F(RestartSettingsTest, WhatHasChangedIsNamed) {
  const RunConfig then = read();
  const std::pair<const char*, std::vector<std::string>> cases[] = {
      {"", {}},
      {"Upper catchment    => x & NoSimultaneousSim = 4 => NoSimultaneousSim = 2\nMaxSimulationTime = 5", {}},
      {"'model\\run.sh' => './model/run.sh' & Upper_Bound = 900 => 9.0E2", {}},
      {"Item_No = 2 => 2 // as before & KeyLine = 'soil' => 'other'", {}},
      {"Max_No_Evaluations = 500 => 600", {}},
      {"Max_No_Evaluations = 500 => 400",
       {"Max_No_Evaluations of OPTIMISATION_ALGORITHM/STOPPING_CRITERIA: 500 then, 400 now"}},
      {"Upper_Bound = 900 => 800", {"Upper_Bound of PARAMETER_1 (Depth): 900 then, 800 now"}},
      {"'gauge.csv' => 'other.csv'",
       {"File_Name of MEASURE_1/OBSERVATION_FILE (Flow error): gauge.csv then, other.csv now"}},
      {"Weight = 0.75 => Weight = 0.75\nStandard_Deviation = 2",
       {"Standard_Deviation of OBJECTIVE_1 (Flow): absent then, 2 now"}},
      {"TqSEKdxListItemCount = 1\n      [CONSTRAINT_1] => 0\n      [CONSTRAINT_1]",
       {"Left_Equation of MODEL_PARAMETERS/INTERNAL_CONSTRAINTS/CONSTRAINT_1: 'Rate' then, absent now",
        "Right_Equation of MODEL_PARAMETERS/INTERNAL_CONSTRAINTS/CONSTRAINT_1: 'Depth' then, absent now",
        "Logical_Operator of MODEL_PARAMETERS/INTERNAL_CONSTRAINTS/CONSTRAINT_1: 1 then, absent now"}},
  };
  for (const auto& [edits, expected] : cases) EXPECT_EQ(changes(then, read(edits)), expected);
}

TEST_F(RestartSettingsTest, OfAKeywordThatIsRepeatedEachIsCompared) {
  const auto groups = [](const std::vector<std::string>& values) {
    RestartSettings settings = restartSettings(RunConfig());
    for (const std::string& value : values) settings.settings.push_back({"SENSITIVITY_ANALYSIS/SOBOL", "Group", value});
    return settings;
  };
  using Changes = std::vector<std::string>;
  const std::string of = "Group of SENSITIVITY_ANALYSIS/SOBOL: ";
  const auto changesTo = [&](const std::vector<std::string>& now) {
    return changedSettings(parseRestartSettings(formatRestartSettings(groups({"'x: a'", "'y: b'"}))).value(),
                           groups(now));
  };
  EXPECT_EQ(changesTo({"'x: a'", "'y: b'"}), Changes());
  EXPECT_EQ(changesTo({"'x: c'", "'y: b'"}), Changes({of + "'x: a' then, 'x: c' now"}));
  EXPECT_EQ(changesTo({"'y: b'"}), Changes({of + "'x: a' then, 'y: b' now", of + "'y: b' then, absent now"}));
  EXPECT_EQ(changesTo({"'x: a'", "'y: b'", "'z: c'"}), Changes({of + "absent then, 'z: c' now"}));
}

TEST_F(RestartSettingsTest, AnObjectiveFunctionIsTheSameByNameAndByNumber) {
  const auto settings = [](const std::string& objective, const std::string& second) {
    const std::string list = "ObjectiveFunctions/OBJECTIVE_FUNCTIONS/OBJECTIVE_";
    RestartSettings all;
    all.settings = {{list + "1", "Name", "'Flow'"},
                    {list + "2", "Name", second},
                    {"UNCERTAINTY_ESTIMATION/DREAM", "Objective_Function", objective}};
    return all;
  };
  const auto changes = [&](const std::string& then, const std::string& now, const std::string& second = "'flow low'") {
    const auto read = parseRestartSettings(formatRestartSettings(settings(then, second)));
    return changedSettings(read.value(), settings(now, "'flow low'"));
  };
  for (const auto& [then, now] : {std::pair{"2", "'flow low'"}, {"'Flow Low '", "2"}, {"'FLOW'", "'Flow'"}}) {
    EXPECT_THAT(changes(then, now), IsEmpty()) << then << " " << now;
  }
  const std::string of = "Objective_Function of UNCERTAINTY_ESTIMATION/DREAM: ";
  EXPECT_THAT(changes("1", "'flow low'"), ElementsAre(of + "1 then, 'flow low' now"));
  EXPECT_THAT(changes("0", "'Flow'"), ElementsAre(of + "0 then, 'Flow' now"));
  // The file may have been changed since.
  EXPECT_THAT(changes("'", "'Flow'"), ElementsAre(of + "' then, 'Flow' now"));
  EXPECT_THAT(changes("'flow'", "'flow'", "'FLOW'"), testing::Contains(testing::StartsWith("Name of")));
}

TEST_F(RestartSettingsTest, WhatMeansTheSameIsNoChange) {
  const auto settings = [](const std::string& section, const std::string& keyword, const std::string& value) {
    RestartSettings all;
    all.settings = {{"MODEL_PARAMETERS/PARAMETER_1", "Parameter_Name", "'Rate'"},
                    {"MODEL_PARAMETERS/PARAMETER_2", "Parameter_Name", "'rate 2'"},
                    {section, keyword, value}};
    return all;
  };
  const std::string pair = "UNCERTAINTY_ESTIMATION/CORRELATIONS/PAIR_1";
  const struct {
    std::string section;
    const char* keyword;
    const char* then;
    const char* now;
    bool isSame;
  } cases[] = {{pair, "First_Parameter", "'Rate'", "'RATE '", true},
               {pair, "Second_Parameter", "'RATE 2'", "'rate 2'", true},
               {pair, "First_Parameter", "'Rate'", "'rate 2'", false},
               {pair, "First_Parameter", "'Rate", "'Depth'", false},
               {"UNCERTAINTY_ESTIMATION", "Random_Seed", "1", "-1", true},
               {"SENSITIVITY_ANALYSIS", "Random_Seed", "-7", "7", true},
               {"UNCERTAINTY_ESTIMATION", "Random_Seed", "1", "-2", false},
               {"INITIAL_SAMPLE", "Random_Seed", "1", "-1", false}};
  for (const auto& one : cases) {
    const auto changes =
        changedSettings(settings(one.section, one.keyword, one.then), settings(one.section, one.keyword, one.now));
    EXPECT_EQ(changes.empty(), one.isSame) << one.keyword << " " << one.then << " " << one.now;
  }
}

TEST_F(RestartSettingsTest, AKeywordThatAnEarlierVersionDidNotKnowWorkedAsItsDefaultDoes) {
  const RestartSettings now = restartSettings(read());
  RestartSettings then = now;
  EXPECT_GT(std::erase_if(then.settings, std::mem_fn(&ResultSetting::isDefault)), 0U);
  EXPECT_THAT(changedSettings(then, now), IsEmpty());
  // Also where the default is written by now.
  const RestartSettings written = restartSettings(
      read("Algorithm_Type = 1 => Algorithm_Type = 1\nRepetitions = 1\nRepetition_Order = 'consecutive'"));
  EXPECT_THAT(changedSettings(now, written), IsEmpty());
  EXPECT_THAT(changedSettings(then, written), IsEmpty());
  EXPECT_THAT(changedSettings(written, now), IsEmpty());
}

TEST_F(RestartSettingsTest, ALaterVersionIsToldByItsNumbers) {
  for (const char* version : {"99.0.0", "0.99.0-rc1", "99"}) EXPECT_TRUE(isLaterVersion(version)) << version;
  for (const char* version : {"", "0.1.99", "0.2.0", "x", ".", "99999999999.0.0"}) {
    EXPECT_FALSE(isLaterVersion(version)) << version;
  }
}

TEST_F(RestartSettingsTest, ANameThatIsCutOffIsNotShown) {
  RestartSettings then = restartSettings(read());
  RestartSettings now = then;
  for (ResultSetting& setting : then.settings) {
    if (setting.keyword == "Parameter_Name") setting.value.clear();
  }
  std::erase_if(now.settings, [](const ResultSetting& setting) { return setting.keyword == "Upper_Bound"; });
  EXPECT_THAT(changedSettings(then, now),
              testing::Contains("Upper_Bound of MODEL_PARAMETERS/PARAMETER_1: 900 then, absent now"));
}

TEST_F(RestartSettingsTest, FilesAreHeldAgainstTheirContent) {
  const RunConfig config = read();
  const auto then = parseRestartSettings(formatRestartSettings(restartSettings(config)));
  folder_.write("model/soil.par", "written by every run");
  folder_.write("model/soil.tpl", "!\n!Rate!\n!\n");
  folder_.write("gauge.csv", "time,flow\n");
  EXPECT_THAT(
      changedSettings(*then, restartSettings(config)),
      ElementsAre("TemplateFileName of MIREVO_SIMULATION_OPTION/SIMPARAM/SIMPARAMITEM_1: the content of model/soil.tpl "
                  "has changed, 10 bytes then, 11 now",
                  "File_Name of MEASURE_1/OBSERVATION_FILE (Flow error): the content of gauge.csv has changed, 0 bytes "
                  "then, 10 now"));
}

TEST_F(RestartSettingsTest, ACutOrDamagedFileIsNotTakenForSettings) {
  RestartSettings settings = restartSettings(read());
  settings.searches = {{500, 500}, {700, 650}};
  const std::string text = formatRestartSettings(settings);
  EXPECT_EQ(parseRestartSettings(text)->searches.back().lastEvaluation, 650);
  for (std::size_t length = 0; length + 1 < text.size(); length += 13) {
    EXPECT_FALSE(parseRestartSettings(text.substr(0, length))) << length;
  }
  for (const char* line : {"Setting\ta\tb", "File\ta\tb\t1\tx\tname", "Search\t5\t6", "Search\t5\t0", "Serch\t5\t4"}) {
    EXPECT_FALSE(parseRestartSettings(std::string(line) + "\nEnd\n")) << line;
  }
}

TEST_F(RestartSettingsTest, AFileThatIsRemovedDuringTheRunIsPutBack) {
  double now = 0.0;
  RestartSettingsFile file(folder_ / "settings.dat", [&now] { return now; });
  file.write(read());
  const std::string written = folder_.read("settings.dat");
  const auto isThereAt = [&](double time) {
    std::filesystem::remove(folder_ / "settings.dat");
    now = time;
    EXPECT_EQ(file.keep(), "");
    return folder_.exists("settings.dat");
  };
  EXPECT_FALSE(isThereAt(0.5));
  EXPECT_TRUE(isThereAt(1.5));
  EXPECT_EQ(folder_.read("settings.dat"), written);

  folder_.write("settings.dat", "");
  now = 3.0;
  EXPECT_EQ(file.keep(), "");
  EXPECT_EQ(folder_.read("settings.dat"), written);
  std::filesystem::rename(folder_.write("other", written), folder_ / "settings.dat");
  now = 5.0;
  EXPECT_EQ(file.keep(), "") << "it is another file with the same content";
  std::filesystem::rename(folder_.write("other", written + "# a remark\n"), folder_ / "settings.dat");
  now = 6.5;
  EXPECT_THAT(file.keep(), HasSubstr("Another program has replaced or changed"));
  now = 8.0;
  EXPECT_EQ(file.keep(), "");
}

/// A run whose result file holds the rows that a test gives it.
class EarlierRunTest : public SetupFixture {
 protected:
  static constexpr const char* kHeader = "Evaluation\tStatus\tDepth\tRate\tFlow error\tWritten\tFlow\tAggregate\n";

  std::string row(int number, const char* status = "OK") const {
    const bool isOk = std::string_view(status) == "OK";
    return fmt::format("{}\t{}\t400\t0.5\t{}\n", number, status, isOk ? "2\t7\t4\t3" : "1e30\t1e30\t1e30\t1e30");
  }
  /// The numbers of the rows that a run with `now` goes on from; or the refusal.
  std::string taken(const RunConfig& then, const RunConfig& now, const std::string& rows) {
    const RestartFiles files = restartFiles(folder_ / "setup", run_files::kOptimisation);
    folder_.write("setup_Optimisation.dat", "# Started: then\n# Restarted: later\n" + std::string(kHeader) + rows);
    RestartSettingsFile(files.settings).write(then);
    try {
      const auto run = findEarlierRun(files, now, {{"Depth", "Rate"}, {"Flow error", "Written"}, {"Flow"}}, record_);
      if (!run) return "nothing";
      EXPECT_EQ(run->started, record_ ? record_->started : "then");
      EXPECT_THAT(run->restarted, ElementsAre("later"));
      searches_ = run->searches;
      notes_ = run->notes;
      std::string numbers;
      for (const ResultRow& entry : run->rows) numbers += std::to_string(entry.number) + " ";
      return numbers;
    } catch (const FatalError& error) {
      return error.detail();
    }
  }

  std::optional<RunRecord> record_;  ///< none: of a version of the program that left none
  std::vector<EarlierSearch> searches_;
  std::vector<std::string> notes_;
};

TEST_F(EarlierRunTest, RowsThatTheRunGoesOnFrom) {
  RunConfig config = read("Max_No_Evaluations = 500 => 30");
  config.restart = RestartMode::goOn;
  const std::string rows = row(1) + row(3, "FAILED") + row(2) + row(5, "FAILED") + row(4, "FAILED");
  EXPECT_EQ(taken(config, config, ""), "nothing");
  EXPECT_EQ(taken(config, config, rows), "1 2 3 4 5 ");
  record_.emplace().started = "the day before";
  record_->restarted = {"later"};
  EXPECT_EQ(taken(config, config, rows + "6\tOK\t400\t0"), "1 2 3 4 5 ");
  EXPECT_THAT(notes_, ElementsAre(HasSubstr("damaged are made again: 1"), HasSubstr("no checksum")));
  EXPECT_EQ(taken(config, config, rows + "6\tOK\t400\t0\nof another\n5\tOK\n99\tOK\n"), "1 2 3 4 5 ");
  EXPECT_THAT(notes_, ElementsAre(HasSubstr("made again: 1"), HasSubstr("no rows of this run are passed over: 3"),
                                  HasSubstr("no checksum")));
  folder_.write("setup_Optimisation_Checksums.dat", "Evaluation\tChecksum\n7\t00000000000000ff\n9\t00000000000000ff\n");
  taken(config, config, rows + "6\tOK\nof another\nof another\n7\tO");
  EXPECT_THAT(notes_,
              ElementsAre(HasSubstr("damaged are made again: 2"), HasSubstr("has their checksums, are made again: 1"),
                          HasSubstr("no rows of this run are passed over: 2"), HasSubstr("no checksum")));
  EXPECT_EQ(taken(config, config, rows + row(30) + row(31)), "1 2 3 4 5 30 31 ");
  config.restart = RestartMode::goOnAndRepeatFailed;
  EXPECT_EQ(taken(config, config, rows), "1 2 ");

  RunConfig raised = read();
  raised.restart = RestartMode::goOn;
  EXPECT_EQ(taken(config, raised, rows + row(30) + row(31)), "1 2 3 4 5 30 ");
  const RunConfig tooSmall = read("Max_No_Evaluations = 500 => 19");
  EXPECT_THAT(taken(tooSmall, raised, rows), HasSubstr("only a search whose budget held its initial sample of 20"));
}

TEST_F(EarlierRunTest, RowsThatDoNotHoldEndTheRestart) {
  RunConfig config = read();
  config.restart = RestartMode::goOn;
  folder_.write("setup_Optimisation_Checksums.dat", "Evaluation\tChecksum\n2\t0123456789abcdef\n");
  std::string rows = row(2);
  for (int i = 0; i < 21; ++i) rows += row(1);
  const std::string told = withoutFolder(taken(config, config, rows));
  EXPECT_THAT(told,
              testing::StartsWith("setup_Optimisation.dat has rows that do not hold:\n"
                                  "   line 4 (evaluation No. 2): it is not as it was written: it has another checksum\n"
                                  "   line 6 (evaluation No. 1): the evaluation is in line 5, too\n"));
  EXPECT_THAT(told, testing::EndsWith(
                        "\n   and 1 more\n"
                        "Restore these lines from a copy, or delete them: their evaluations are then made again.\n"
                        "If the rows are right and setup_Optimisation_Checksums.dat is not, remove that file.\n"
                        "Restart = 0 starts afresh and keeps the earlier results under a numbered name."));
}

TEST_F(EarlierRunTest, ARaisedBudgetOfDdsIsAnotherSearch) {
  const auto config = [this](int budget) {
    RunConfig read = this->read(
        "Algorithm_Type = 1 => 2 & Include_Initial_Parameters = 1 => 0 & NoSimultaneousSim = 4 => 1 & "
        "Max_No_Evaluations = 500 => " +
        std::to_string(budget));
    read.restart = RestartMode::goOn;
    return read;
  };
  // The budget then, the number of rows, the searches before, the last evaluation of each search.
  const std::tuple<int, int, std::vector<EarlierSearch>, std::vector<int>> cases[] = {
      {10, 11, {}, {10}},              // finished, with its final run
      {10, 7, {}, {7}},                // cut off
      {10, 2, {}, {5}},                // in the start points, which it needs
      {20, 11, {{10, 10}}, {10, 11}},  // a second time
      {20, 10, {{10, 10}}, {10}}};     // the second search had not begun
  for (const auto& [budget, count, before, lastEvaluations] : cases) {
    RunConfig then = config(budget);
    then.task->continueFrom(before);
    std::string some;
    for (int number = 1; number <= count; ++number) some += row(number);
    taken(then, config(40), some);
    std::vector<int> last;
    for (const EarlierSearch& search : searches_) last.push_back(search.lastEvaluation);
    EXPECT_EQ(last, lastEvaluations) << budget << " " << count;
  }
}

TEST_F(EarlierRunTest, WithoutItsSettingsOrItsHeaderItIsRefused) {
  const RunConfig config = read();
  const RestartFiles files = restartFiles(folder_ / "setup", run_files::kOptimisation);
  const std::string settings = formatRestartSettings(restartSettings(config));
  const std::string damaged = "Evalu\tStatus\n" + row(1) + row(2);
  const char* const kNoRuns =
      "setup_Optimisation.dat has no header row that can be read\nsetup_Optimisation.dat: It is not";
  // The results, the settings (no file when empty), what is said.
  const std::tuple<std::string, std::string, const char*> cases[] = {
      {std::string(kHeader) + row(1), "", "setup_Optimisation_Restart.dat"},
      {std::string(kHeader) + row(1), "# nothing\n", "setup_Optimisation_Restart.dat"},
      {"# Mirevo 1\n" + damaged, "", "setup_Optimisation.dat has no header row that can be read\nRestart = 0 starts"},
      {damaged, "", kNoRuns},
      {std::string(kHeader) + row(1), settings, "setup_Optimisation.dat has other columns than"},
      {"# Setup file: /old/x.kdx\n" + std::string(kHeader) + row(1), settings,
       "setup_Optimisation.dat names another setup, /old/x.kdx. If "}};
  for (const auto& [results, written, detail] : cases) {
    folder_.write("setup_Optimisation.dat", results);
    if (!written.empty()) folder_.write("setup_Optimisation_Restart.dat", written);
    EXPECT_THAT(withoutFolder(refusalOf([&] { findEarlierRun(files, config, {}, std::nullopt); })),
                HasSubstr(std::string("\n") + detail));
  }
}

TEST(SimulatedValuesFile, KeepsWholeRecordsOfTheEvaluationsThatCount) {
  const TemporaryFolder folder;
  const auto add = [](SimulatedValuesFile& file, int number) {
    EvaluationResult result;
    result.number = number;
    result.simulatedValues = {0.1 * number};
    result.exactMeasures = {-1.0 * number};
    result.measureValues = {0.5 * number};
    file.add(std::vector{1.0 * number}, result);
  };
  const auto rowsOf = [](const std::vector<int>& numbers, double parameterOf2 = 2.0, double measureOf3 = 1.5) {
    std::vector<ResultRow> rows;
    for (const int n : numbers) {
      rows.push_back({n, true, {n == 2 ? parameterOf2 : 1.0 * n}, {n == 3 ? measureOf3 : 0.5 * n}, {}, 0.0});
    }
    return rows;
  };
  const auto fileOf = [&](SeriesPrecision precision = SeriesPrecision::single) {
    return SimulatedValuesFile(folder / "v.bin", 1, precision, 1, true);
  };
  SimulatedValuesFile file = fileOf();
  file.create();
  for (const int number : {3, 1, 2}) add(file, number);
  const std::string whole = folder.read("v.bin");
  constexpr std::size_t kHead = 16;
  constexpr std::size_t kRecord = 32;
  ASSERT_EQ(whole.size(), kHead + 3 * kRecord);
  for (std::size_t length = 0; length <= whole.size(); ++length) {
    folder.write("v.bin", whole.substr(0, length));
    SimulatedValuesFile cut = fileOf();
    const auto found = cut.takeUp(rowsOf({1, 3}));
    const std::size_t records = length < kHead ? 0 : (length - kHead) / kRecord;
    ASSERT_EQ(found.size(), std::min<std::size_t>(records, 2)) << length;
    for (const auto& [number, values] : found) {
      EXPECT_THAT(values.simulatedValues, IsEmpty());
      EXPECT_THAT(cut.valuesOf(number), ElementsAre(0.1 * number));
      EXPECT_THAT(values.exactMeasures, ElementsAre(-1.0 * number));
    }
    add(cut, 2);
    EXPECT_EQ(folder.read("v.bin").size(), kHead + (records + 1) * kRecord);
    if (records == 0) continue;
    EXPECT_THAT(cut.columns(std::vector{2, 3}, 0, 1), ElementsAre(0.2, 0.1 * 3));
  }
  std::string damaged = whole;
  damaged[kHead + kRecord + 10] ^= 1;
  const std::vector<ResultRow> rows = rowsOf({1, 2, 3});
  folder.write("v.bin", whole.substr(0, kHead + kRecord) + damaged.substr(kHead));
  SimulatedValuesFile again = fileOf();
  EXPECT_EQ(again.takeUp(rowsOf({3})).size(), 1U);
  EXPECT_THAT(again.valuesOf(3), ElementsAre(0.1 * 3));
  folder.write("v.bin", damaged);  // No. 1 is now where the second record of No. 3 was
  EXPECT_THAT(refusalOf([&] { again.valuesOf(3); }), HasSubstr("another program has changed it"));
  EXPECT_THAT(fileOf().takeUp(rows), ElementsAre(testing::Key(2), testing::Key(3)));
  EXPECT_THAT(SimulatedValuesFile(folder / "v.bin", 3).takeUp(rows), IsEmpty()) << "of other series";
  folder.write("v.bin", whole);
  EXPECT_THAT(fileOf().takeUp(rowsOf({1, 2, 3}, 2.25, 1.75)), ElementsAre(testing::Key(1))) << "of another run";
  folder.write("v.bin", whole);
  EXPECT_THAT(fileOf(SeriesPrecision::exact).takeUp(rows), IsEmpty());
}

TEST(UnkeptFiles, AreThoseThatNoLaterRunHasKept) {
  const TemporaryFolder folder;
  UnkeptFiles first(folder / "u.dat", {"head"});
  first.add(3, std::vector<UnkeptFile>{{"/a.csv", "full"}, {"/b.csv", "full"}});
  first.add(1, std::vector<UnkeptFile>{{"/a.csv", "full"}});
  first.add(5, std::vector<UnkeptFile>{{"/a.csv", "full"}});
  first.add(1, {});
  first.add(3, std::vector<UnkeptFile>{{"/b.csv", "late"}});
  const std::string text = folder.read("u.dat");
  EXPECT_THAT(text, HasSubstr("\n3\t/b.csv\tlate\n"));
  const auto isOneOf = [](std::set<int> numbers) { return [numbers](int number) { return numbers.contains(number); }; };
  EXPECT_EQ(UnkeptFiles(folder / "u.dat", {"head"}).goOn(isOneOf({1, 3, 4}), {"/a.csv", "/b.csv"}), std::set{3});
  EXPECT_EQ(folder.read("u.dat"), "# head\nEvaluation\tFile\tReason\n3\t/b.csv\tlate\n");
  folder.write("u.dat", text);
  EXPECT_EQ(UnkeptFiles(folder / "u.dat", {}).goOn(isOneOf({1, 3, 5}), {"/a.csv"}), std::set{5});
  EXPECT_THAT(UnkeptFiles(folder / "none.dat", {}).goOn(isOneOf({1}), {"/a.csv"}), IsEmpty());
  EXPECT_FALSE(folder.exists("none.dat"));
}

TEST(FailedRunFile, IsContinuedWithTheFailuresThatCount) {
  const TemporaryFolder folder;
  const FailedRunPaths paths{folder / "calSimErr.dat", folder / "basin_Failures.dat"};
  const auto fail = [](int number, std::vector<std::string> output = {}) {
    EvaluationResult result;
    result.number = number;
    result.failure = EvaluationFailure{EvaluationFailure::Kind::timedOut, fmt::format("why\n\"of\"\t#{}", number),
                                       std::move(output)};
    return result;
  };
  const std::vector<std::string> output{"Evaluation No. 7 (batch ran too long)", "", "\x1B[31m\xFF\\x41\r"};
  const std::vector<double> values{0.1 + 0.2};
  {
    FailedRunFile file(paths, "basin", {"k"}, {"Title"});
    for (const int number : {2, 9, 5}) file.add(values, fail(number, output));
    file.add(values, fail(6, {""}));
  }
  const std::string told = folder.read("calSimErr.dat");
  const std::string table = folder.read("basin_Failures.dat");
  folder.write("basin_Failures.dat", table + "11\ttimedOut\twhy\t");  // cut off
  const auto goOn = [&](FailedRunFile& file, const std::set<int>& numbers) {
    auto earlier = file.readEarlier(numbers);
    std::map<int, std::vector<double>> sets;
    for (const int number : numbers) sets[number] = values;
    file.continueBehind(earlier.rows, sets);
    return earlier;
  };
  FailedRunFile file(paths, "basin", {"k"}, {"Title"});
  const auto earlier = goOn(file, {2, 5, 6});
  ASSERT_EQ(earlier.rows.size(), 3U);
  EXPECT_EQ(earlier.unknown, 0U);
  EXPECT_EQ(earlier.rows[1].number, 5);
  EXPECT_EQ(earlier.rows[1].failure.kind, EvaluationFailure::Kind::timedOut);
  EXPECT_EQ(earlier.rows[1].failure.reason, "why\n\"of\"\t#5");
  EXPECT_EQ(earlier.rows[1].failure.lastOutput, output);
  EXPECT_THAT(earlier.rows[2].failure.lastOutput, ElementsAre(""));
  // Both files go on as if the evaluation that is made again had not been there.
  file.add(values, fail(9, output));
  const auto moved = [](const std::string& text, std::size_t from, std::size_t to) {
    return text.substr(0, from) + text.substr(to) + text.substr(from, to - from);
  };
  EXPECT_EQ(folder.read("calSimErr.dat"),
            moved(told, told.find("\nEvaluation No. 9"), told.find("\nEvaluation No. 5")));
  EXPECT_EQ(folder.read("basin_Failures.dat"), moved(table, table.find("\n9\t") + 1, table.find("\n5\t") + 1));

  EXPECT_EQ(folder.read("calSimErr.1.dat"), told) << "what is made again is not lost";

  folder.write("calSimErr.dat", "# Failed evaluations of another\n");
  std::filesystem::remove(paths.table);
  FailedRunFile other(paths, "basin", {"k"}, {"Title"});
  EXPECT_EQ(goOn(other, {2}).unknown, 1U);
  EXPECT_EQ(folder.read("calSimErr.2.dat"), "# Failed evaluations of another\n");
  EXPECT_THAT(folder.read("calSimErr.dat"),
              HasSubstr("\nEvaluation No. 2 (reason not known any more)\n   failed in the earlier run\n"));
  EXPECT_EQ(goOn(other, {2}).unknown, 0U);
}

}  // namespace
}  // namespace mirevo
