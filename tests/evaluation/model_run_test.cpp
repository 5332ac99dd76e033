#include "evaluation/model_run.h"

#include <filesystem>
#include <tuple>
#include <utility>

#include "evaluation/evaluation_fixture.h"
#include "evaluation/evaluation_ledger.h"
#include "evaluation/fake_launcher.h"
#include "matchers.h"

namespace mirevo {
namespace {

using Kind = EvaluationFailure::Kind;

class ModelRunTest : public EvaluationTest {
 protected:
  ModelRunTest() : launcher_([this](int, const std::string&) { return batch_; }) {}

  EvaluationResult evaluate(double a) {
    const std::vector<double> set = {a};
    EXPECT_FALSE(runner_->prepareModelRun(set, 1, ++number_).has_value());
    launcher_.now += batch_.seconds;
    std::int32_t executing = 1;
    std::int32_t status = 0;
    launcher_.isExecuting(1, executing, status);
    EXPECT_EQ(executing, 0);
    return runner_->collect(1);
  }
  void writes(const std::string& name, const std::string& content) {
    batch_.write = [name, content](const std::string& folder) { std::ofstream(folder + "/" + name) << content; };
  }
  /// The message of the FatalError that making the runner ends in.
  std::string refusal() {
    return refusalOf([this] { makeRunner(launcher_, 1); });
  }

  int number_ = 0;
  FakeLauncher::Batch batch_;
  FakeLauncher launcher_;
};

TEST_F(ModelRunTest, WhatAModelMayDoWrongIsAFailedEvaluationWithItsReason) {
  const std::string file = folder_ / "run_Process1/simulated.csv";
  // content: of simulated.csv; "-" writes none
  const std::tuple<const char*, std::string, Kind, std::string> cases[] = {
      {"nothing", "-", Kind::resultsNotWritten, "the batch ended well but did not write " + file},
      {"empty file", "", Kind::resultsNotReadable, file},
      {"header alone", "time,flow\n", Kind::resultsNotReadable, file + ": expected at least one time step, found none"},
      {"cut line", "time,flow\n2001-01-01,1\n2001-01-0", Kind::resultsNotReadable, file + ":3"},
      {"all missing", series(std::nan("")), Kind::resultsNotReadable, file + ": item No. 1 (flow) has missing values"},
      {"item gone", "time\n2001-01-01\n", Kind::resultsNotReadable, file},
      {"overflow", series(1e30), Kind::resultNotFinite, "output measure \"bias\" is Inf"},
      {"good results of a batch that failed", series(4.0), Kind::signal, "why"},
  };
  description_.measures[0].statisticType = StatisticType::rootMeanSquare;  // squares 1e30 in 32 bits
  makeRunner(launcher_, 1);
  batch_.output = {"last words"};
  for (const auto& [name, content, kind, reason] : cases) {
    batch_.write = nullptr;
    if (content != "-") writes("simulated.csv", content);
    if (kind == Kind::signal) batch_.failure = {BatchFailure::Kind::signal, 11, "why"};
    const EvaluationResult result = evaluate(2.0);
    batch_.failure = {};
    ASSERT_FALSE(result.ok()) << name;
    EXPECT_EQ(result.failure->kind, kind) << name;
    EXPECT_THAT(result.failure->reason, StartsWith(reason)) << name;
    EXPECT_THAT(result.failure->lastOutput, ElementsAre("last words"));
    EXPECT_THAT(result.measureValues, ElementsAre(kFailedRunValue)) << name;
    EXPECT_THAT(result.objectiveValues, ElementsAre(kFailedRunValue)) << name;
    // A good run in the same slot follows; then the next case must not find its results.
    writes("simulated.csv", series(4.0));
    EXPECT_THAT(evaluate(2.0).measureValues, ElementsAre(3.0)) << name;
  }
}

TEST_F(ModelRunTest, ReadingResultsHoldsTheTimeLimitAndIsCancelled) {
  const std::string files = MIREVO_SOURCE_DIR "/tests/platform/series/";
  const auto leaves = [this, &files](const std::string& name) {
    batch_.write = [from = files + name](const std::string& folder) {
      std::filesystem::copy_file(from, folder + "/simulated.nc", std::filesystem::copy_options::overwrite_existing);
    };
  };
  std::filesystem::copy_file(files + "sound.nc", folder_ / "base/simulated.nc");
  description_.measures[0].simulation.fileName = folder_ / "base/simulated.nc";
  settings_.maxSeconds = 0.5;
  makeRunner(launcher_, 1);
  leaves("endless.nc");
  const EvaluationResult result = evaluate(2.0);
  ASSERT_FALSE(result.ok());
  EXPECT_EQ(result.failure->kind, Kind::resultsNotReadable);
  EXPECT_THAT(result.failure->reason,
              AnyOf(HasSubstr("simulated.nc: reading it took longer than the model run had left of its 0.5 seconds"),
                    HasSubstr("simulated.nc: opening")));  // once the library is mended
  leaves("sound.nc");
  EXPECT_THAT(evaluate(2.0).measureValues, ElementsAre(2.0));

  settings_.maxSeconds = 0.0;
  leaves("endless.nc");
  batch_.write = [this, write = batch_.write](const std::string& folder) {
    write(folder);
    observer_.cancelled = true;
  };
  EXPECT_THROW(EvaluationTest::evaluate(makeEvaluator(launcher_, 1, 9), {2.0}), RunCancelled);
}

TEST_F(ModelRunTest, NumbersOfAListingAreFoundByInstructions) {
  std::string reason;
  const auto instructions = InstructionFile::parse("i.ins", "pif ~\n~RMS~ !rms! ~bias~ !bias!\n", reason);
  description_.measures[0].interfaceType = InterfaceType::measureFile;
  description_.measures[0].measurementNo = 2;
  description_.measureFile = folder_ / "base/out/listing.txt";
  description_.instructions = std::make_shared<const InstructionFile>(instructions.value());
  folder_.write("base/out/keep", "");
  makeRunner(launcher_, 1);
  writes("out/listing.txt", "A model\nRMS 7.5 bias -8.5\n");
  EXPECT_THAT(evaluate(2.0).measureValues, ElementsAre(-8.5));
  writes("out/listing.txt", "A model\nRMS 7.5m and that is all\n");
  EXPECT_EQ(evaluate(2.0).failure->reason,
            folder_ / "run_Process1/out/listing.txt" +
                ":2:5: expected a number, found \"7.5m\" (the number \"rms\" at i.ins:2:7)");
}

/// A listing that is in the base folder is one of a run before; without it the first one that is read tells.
TEST_F(ModelRunTest, InstructionsThatAListingDoesNotFitOrThatCutItsNumbersAreWarnedOf) {
  description_.measures[0].interfaceType = InterfaceType::measureFile;
  description_.measureFile = folder_ / "base/out/listing.txt";
  folder_.write("base/out/keep", "");
  std::string reason;
  description_.instructions =
      std::make_shared<const InstructionFile>(InstructionFile::parse("i.ins", "pif ~\nl1 [rms]5:7\n", reason).value());
  const auto warnings = [this](const char* before) {
    before == nullptr ? void(std::filesystem::remove(description_.measureFile))
                      : void(folder_.write("base/out/listing.txt", before));
    makeRunner(launcher_, 1);
    return runner_->output().warnings();
  };
  EXPECT_THAT(
      warnings("RMS x\n"),
      ElementsAre(AllOf(StartsWith(description_.measureFile + ":1:5: expected a number, found \"x\" (the number "
                                                              "\"rms\" at i.ins:2:4)\nThis listing, as it is in"),
                        HasSubstr("A model run that writes such a one has failed"))));
  EXPECT_THAT(warnings("RMS 7.5\n"), ElementsAre());
  const auto tellsOfCut = testing::Field(&FileDoubt::text, HasSubstr("the columns 5:7 cut \"17.51\""));
  writes("out/listing.txt", "RMS 17.51\n");
  EXPECT_THAT(evaluate(2.0).doubts, ElementsAre(tellsOfCut));
  EXPECT_THAT(warnings("RMS 17.51\n"), ElementsAre(HasSubstr(":1:5: the columns 5:7 cut \"17.51\", of which \"17.\"")));
  EXPECT_THAT(warnings(nullptr), ElementsAre());
  writes("out/listing.txt", "RMS 17.51\n");
  EXPECT_THAT(evaluate(2.0).doubts, ElementsAre(tellsOfCut));
  EXPECT_THAT(evaluate(2.0).doubts, ElementsAre());
}

TEST_F(ModelRunTest, SeveralListingsGiveOneListOfNumbersAndDifferencesToObservedValues) {
  std::string reason;
  const auto read = [&reason](const char* text) {
    return std::make_shared<const InstructionFile>(InstructionFile::parse("i.ins", text, reason).value());
  };
  description_.measures[0].interfaceType = InterfaceType::measureFile;
  description_.measures[0].measurementNo = 3;
  description_.measures[0].observedValue = 4.0;
  description_.measures[0].weight = 10.0;
  description_.measures[0].weightAbove = 100.0;
  description_.measureFile = folder_ / "base/out/a.txt";
  description_.instructions = read("pif ~\nl1 !a! !b!\n");
  description_.furtherMeasureFiles = {{folder_ / "base/out/b.txt", "", read("pif ~\nl1 !c!\n")}};
  folder_.write("base/out/keep", "");
  makeRunner(launcher_, 1);
  for (const auto& [number, measure] : {std::pair("3", -10.0), {"4.5", 50.0}, {"4", 0.0}}) {
    batch_.write = [this, number = number](const std::string& folder) {
      std::ofstream(folder + "/out/a.txt") << "1 2\n";
      std::ofstream(folder + "/out/b.txt") << number << "\n";
    };
    EXPECT_THAT(evaluate(2.0).measureValues, ElementsAre(measure)) << number;
  }
  batch_.write = [](const std::string& folder) { std::ofstream(folder + "/out/a.txt") << "1 2\n"; };
  EXPECT_THAT(evaluate(2.0).failure.value().reason, HasSubstr("did not write"));
}

TEST_F(ModelRunTest, MeasureFileValuesAreTakenByTheirNumber) {
  description_.measures[0].interfaceType = InterfaceType::measureFile;
  description_.measures[0].measurementNo = 2;
  description_.measureFile = folder_ / "base/out/measures.txt";
  folder_.write("base/out/keep", "");
  makeRunner(launcher_, 1);
  const std::string file = folder_ / "run_Process1/out/measures.txt";
  const std::pair<std::string, std::string> cases[] = {{"7 8.5 # rms and bias", ""},
                                                       {"7\n", file + ": expected at least 2 numbers, found 1"},
                                                       {"7\n8.x\n", file + ":2"},
                                                       {"7 0,153", file + ":1:3: \"0,153\" may be"},
                                                       {"", file + ": expected at least 2 numbers, found 0"}};
  for (const auto& [content, reason] : cases) {
    writes("out/measures.txt", content);
    const EvaluationResult result = evaluate(2.0);
    EXPECT_EQ(result.ok(), reason.empty()) << content;
    if (result.ok()) {
      EXPECT_THAT(result.measureValues, ElementsAre(8.5));
      EXPECT_EQ(result.pairs.at(0).file.numberCount, 2U);
      EXPECT_FALSE(result.pairs.at(0).file.endsLine);
    } else {
      EXPECT_EQ(result.failure->kind, Kind::resultsNotReadable);
      EXPECT_THAT(result.failure->reason, StartsWith(reason));
    }
  }
  batch_.write = nullptr;
  EXPECT_EQ(evaluate(2.0).failure->reason, "the batch ended well but did not write " + file);
}

TEST_F(ModelRunTest, MeasuresThatCannotBeComputedEndTheRunNamingTheSlotsFile) {
  const std::string ofOtherYear = "time,flow\n1990-01-01,1\n1990-01-02,1\n";
  folder_.write("base/simulated.csv", ofOtherYear);
  makeRunner(launcher_, 1);
  writes("simulated.csv", ofOtherYear);
  EXPECT_THAT(refusalOf([this] { evaluate(2.0); }),
              AllOf(StartsWith("Error: No simulated data found at observation times for item No. 1 in " +
                               folder_ / "base/simulated.csv" + "\n"),
                    HasSubstr("read from " + folder_ / "run_Process1/simulated.csv")));
}

TEST_F(ModelRunTest, ARunThatStopsBeforeThePeriodIsAFailedEvaluation) {
  description_.period = {{2001, 1, 3}, {2001, 12, 31}};
  for (const int round : {0, 1, 2, 3}) {
    folder_.write("base/simulated.csv", round < 2 ? series(0.0) : "time,flow\n");  // which may be all that it has
    description_.measures[0].statisticType =
        round % 2 == 0 ? StatisticType::rootMeanSquare : StatisticType::peakDifference;
    makeRunner(launcher_, 1);
    writes("simulated.csv", "time,flow\n2001-01-01,1\n2001-01-02,1\n");
    const EvaluationResult result = evaluate(2.0);
    ASSERT_FALSE(result.ok());
    EXPECT_EQ(result.failure->kind, Kind::resultsNotWritten);
    EXPECT_EQ(result.failure->reason, (folder_ / "run_Process1/simulated.csv") +
                                          ": item No. 1 (flow) has no value at any observation time in the evaluation "
                                          "period");
    writes("simulated.csv", series(4.0));
    EXPECT_THAT(evaluate(2.0).measureValues, ElementsAre(3.0));
  }
}

TEST_F(ModelRunTest, ARunThatMeetsFewerObservationsThanAnyBeforeIsNamedInAWarning) {
  makeRunner(launcher_, 1);
  // warning: its part that differs; none when empty
  const std::tuple<const char*, const char*> cases[] = {
      {"2001-01-01,4\n2001-01-02,4\n2001-01-03,4\n2001-01-04,4\n2001-01-05,4\n", ""},
      {"2001-01-01,4\n2001-01-02,4\n2001-01-03,4\n2001-01-04,4\n", "1 of 5"},
      {"2001-01-01,4\n2001-01-02,4\n2001-01-03,4\n2001-01-04,NaN\n2001-01-05,4\n", ""},
      {"2001-01-01,4\n2001-01-02,4\n", "3 of 5"},
      {"2001-01-01,4\n2001-01-02,4\n", ""},
      {"2001-01-01,4\n", "4 of 5"}};
  FailedRunPolicy failedRuns(10);
  EvaluationLedger ledger(observer_, failedRuns);
  const std::vector<ParameterSet> sets(std::size(cases), {2.0});
  ledger.open(sets, DispatchMode::task);
  std::string last;
  for (const auto& [simulated, warning] : cases) {
    writes("simulated.csv", std::string("time,flow\n") + simulated);
    const EvaluationResult result = evaluate(2.0);
    EXPECT_THAT(result.measureValues, ElementsAre(3.0));  // judged on what there is
    observer_.events.clear();
    ledger.finish(*ledger.takeNext(), result);
    last = observer_.events.front();
    EXPECT_EQ(last.starts_with("warning: "), *warning != '\0') << last;
    EXPECT_THAT(last, HasSubstr(warning));
  }
  EXPECT_EQ(last,
            "warning: Evaluation of parameter set No. 6: output measure \"bias\": 4 of 5 observations in the "
            "evaluation period are not used, as item No. 1 of " +
                (folder_ / "base/simulated.csv") + " has no value at their time; the first is at 2001-01-02 00:00");
}

TEST_F(ModelRunTest, SavedFilesAreThoseThatTheRunWrote) {
  folder_.write("base/out/state.txt", "from before");
  description_.savedFiles = {folder_ / "base/simulated.csv", folder_ / "base/out/state.txt",
                             folder_ / "base/parameters.txt", folder_ / "base/none.txt"};
  description_.savedFolder = folder_ / "run_Saved";
  makeRunner(launcher_, 1);
  const auto notKept = [this](const std::string& name) {
    return testing::Field(&UnkeptFile::reason, StartsWith((folder_ / "run_Process1") + "/" + name + " was not kept: "));
  };
  // Before the first run the file is the base folder's copy, before the second the first run's.
  writes("simulated.csv", series(4.0));
  for (const int number : {1, 4}) {
    EvaluationResult result = evaluate(2.0 + number);
    runner_->keepOutputFiles(1, number, result);
    EXPECT_THAT(result.absentFiles, ElementsAre(notKept("out/state.txt"), notKept("none.txt")));
    const std::string folder = fmt::format("run_Saved/{}/", number);
    EXPECT_EQ(folder_.read(folder + "simulated.csv"), series(4.0));
    EXPECT_THAT(folder_.read(folder + "parameters.txt"), EndsWith(fmt::format(" {}\n", 2 + number)));
    EXPECT_FALSE(folder_.exists(folder + "out/state.txt"));
  }
  writes("out/state.txt", "by the run");
  EvaluationResult result = evaluate(2.0);
  runner_->keepOutputFiles(1, 8, result);
  EXPECT_EQ(folder_.read("run_Saved/8/out/state.txt"), "by the run");
  // What a run that was cut off has kept of the evaluation goes.
  folder_.write("run_Saved/9/out/state.txt", "by a run that was cut off");
  writes("simulated.csv", series(4.0));
  result = evaluate(2.0);
  runner_->keepOutputFiles(1, 9, result);
  EXPECT_FALSE(folder_.exists("run_Saved/9/out/state.txt"));
}

TEST_F(ModelRunTest, AFileBehindALinkOutOfTheProcessFolderIsNeitherReadNorKept) {
  folder_.write("shared/simulated.csv", series(4.0));
  description_.savedFiles = {folder_ / "base/simulated.csv"};
  description_.savedFolder = folder_ / "run_Saved";
  makeRunner(launcher_, 1);
  for (const bool leaves : {true, false}) {
    batch_.write = [&](const std::string& folder) {
      std::ofstream(folder + "/own.csv") << series(4.0);
      std::filesystem::create_symlink(leaves ? folder_ / "shared/simulated.csv" : "own.csv", folder + "/simulated.csv");
    };
    EvaluationResult result = evaluate(2.0);
    runner_->keepOutputFiles(1, 1, result);
    ASSERT_EQ(result.ok(), !leaves);
    EXPECT_EQ(folder_.exists("run_Saved/1/simulated.csv"), !leaves);
    if (!leaves) continue;
    const std::string file = folder_ / "run_Process1/simulated.csv";
    EXPECT_EQ(result.failure->kind, Kind::resultsNotReadable);
    EXPECT_THAT(result.failure->reason,
                StartsWith(file + ": the link " + file + " leads to " + (folder_ / "shared/simulated.csv")));
    EXPECT_THAT(result.absentFiles.at(0).reason, StartsWith(file + " was not kept: the link "));
  }
  EXPECT_EQ(folder_.read("shared/simulated.csv"), series(4.0));
}

TEST_F(ModelRunTest, NumericIdTemplatesAreConvertedIntoTheSlotsAlone) {
  folder_.write("base/parameters.tpl", "a = 1.5E-035\n");
  description_.parameterFiles[0].templateType = TemplateType::numericId;
  makeRunner(launcher_, 2);
  writes("simulated.csv", series(4.0));
  EXPECT_TRUE(evaluate(2.5).ok());
  EXPECT_EQ(folder_.read("run_Process1/parameters.txt"), "a =         2.5\n");
  EXPECT_EQ(folder_.read("run_Process2/parameters.tpl_tag.tpl"), "!\na = !a        !\n");
  EXPECT_FALSE(folder_.exists("base/parameters.tpl_tag.tpl"));
  EXPECT_EQ(folder_.read("base/parameters.txt"), "a = 0\n");
}

TEST_F(ModelRunTest, CrossSectionFilesHaveTheirResistanceNumbersUpdated) {
  folder_.write("base/river.QCSR", "");
  description_.parameterFiles.push_back(
      {TemplateType::delimiter, folder_ / "base/river.QCSR", folder_ / "base/parameters.tpl"});
  makeRunner(launcher_, 1);
  writes("simulated.csv", series(4.0));
  EXPECT_TRUE(evaluate(2.0).ok());
  EXPECT_THAT(launcher_.resistanceFiles, ElementsAre(folder_ / "run_Process1/river.QCSR"));

  const std::pair<ResistanceUpdate, const char*> texts[] = {
      {ResistanceUpdate::functionNotFound, "Function \"R35UpdateResistanceNumbers\" not found in DLL"},
      {ResistanceUpdate::libraryNotFound, "DLL \"ProfileTool.dll\" not found"},
      {ResistanceUpdate::writeError, "Error writing the .qcs cross section file"},
      {ResistanceUpdate::readError, "Error reading the .qcs cross section file"},
      {ResistanceUpdate::documentCreationFailed, "Creation of document object failed"},
      {ResistanceUpdate::noReadAccess, "Read access to the .qcs cross section file not found"},
      {ResistanceUpdate::wrongExtension, "File extension \".qcsr\" is expected"},
  };
  for (const auto& [outcome, text] : texts) {
    launcher_.resistanceUpdate = outcome;
    EXPECT_EQ(refusalMessageOf([this] { runner_->prepareModelRun(std::vector<double>{2.0}, 1, 1); }),
              std::string("Error updating resistance numbers: ") + text);
  }
}

TEST_F(ModelRunTest, AMasterKnowsWhatItsWorkersCouldNotWrite) {
  makeRunner(launcher_, 0);
  EXPECT_EQ(runner_->findUnrunnable(std::vector{-1e120})->kind, Kind::valueNotWritable);
  EXPECT_FALSE(runner_->findUnrunnable(std::vector{-1e99}));
}

TEST_F(ModelRunTest, WhatCannotWorkIsRefusedBeforeAModelRuns) {
  const ModelDescription good = description_;
  const std::string lie = "expected a file in " + good.baseFolder +
                          " or below it, the folder of the first batch file, which every slot has a copy of";

  description_.parameterFiles[0].templateFileName = folder_ / "base/missing.tpl";
  EXPECT_EQ(refusal(),
            "Error: Unable to open template file " + (folder_ / "base/missing.tpl") + "\nNo such file or directory");
  description_.parameterFiles[0].templateType = TemplateType::numericId;
  EXPECT_EQ(refusal(), "Error: Unable to open " + (folder_ / "base/missing.tpl") + "\nNo such file or directory");
  description_ = good;
  description_.measures[0].simulation.fileName = folder_ / "base_other/simulated.csv";
  EXPECT_EQ(refusal(), "Error: The file " + (folder_ / "base_other/simulated.csv") +
                           " does not lie in the model's folder\n" + lie);
  description_ = good;
  description_.measures[0].observation.fileName = folder_ / "missing.csv";
  EXPECT_THAT(refusal(), StartsWith("Error opening TS object for file: " + (folder_ / "missing.csv")));
  EXPECT_FALSE(folder_.exists("run_Process1"));
  description_ = good;
  launcher_.initialiseError = "Unable to create the folder /x: Permission denied";
  EXPECT_EQ(refusal(),
            "Error: Unable to initialise MirevoSimpleLaunch\nUnable to create the folder /x: Permission denied");
}

}  // namespace
}  // namespace mirevo
