#include "evaluation/ranks/rank_worker.h"

#include "evaluation/evaluation_fixture.h"
#include "evaluation/fake_job.h"
#include "evaluation/fake_launcher.h"
#include "matchers.h"

namespace mirevo {
namespace {

/// A worker whose master sends the next of `sets` for each answer, and then stop.
class RankWorkerTest : public EvaluationTest {
 protected:
  RankWorkerTest() : launcher_(batch) {
    job_.onSend = [this](const Message& message) {
      if (message.tag == static_cast<int>(RankMessage::alive)) return;
      if (std::ssize(sets_) == keepAt_) job_.deliver(0, RankMessage::keepFolder, encode(KeepFolderMessage{17}));
      if (sets_.empty()) {
        job_.deliver(0, RankMessage::stop, {});
      } else {
        job_.deliver(0, RankMessage::set, encode(SetMessage{1, {sets_.front()}}));
        sets_.pop_front();
      }
    };
    makeRunner(launcher_, 1);
  }
  /// The model with a = 2. The second run leaves a process behind, the third one does not end.
  static FakeLauncher::Batch batch(int start, const std::string&) {
    return {.seconds = start < 3 ? 10.0 : 1e9,
            .write = [](const std::string& folder) { std::ofstream(folder + "/simulated.csv") << series(2.0); },
            .leftBehind = start == 2 ? "a process" : ""};
  }
  std::vector<RankMessage> sentTags() const {
    std::vector<RankMessage> tags;
    for (const Message& message : job_.sent) tags.push_back(static_cast<RankMessage>(message.tag));
    return tags;
  }

  /// Of the answer to the set with that number, from 1.
  std::vector<std::string> warningsOf(std::size_t set) const {
    return decodeResult(job_.sent.at(set).content).result.warnings;
  }
  /// What came with it from the worker.
  std::vector<std::string> workerWarningsOf(std::size_t set) const {
    return decodeResult(job_.sent.at(set).content).warnings;
  }

  FakeLauncher launcher_;
  FakeJob job_{3};
  std::deque<double> sets_;
  double now_ = 0.0;
  MasterWatch watch_{folder_ / "run._kill_", [this] { return now_; }, [this] { job_.abort(1); }};
  LifeSigns signs_{job_, [this] { return now_; }, 8.0};
  int keepAt_ = -1;  ///< the sets left when the folder of the last run is to be kept
};

TEST_F(RankWorkerTest, AnswersEachSetUntilItIsToldToStop) {
  sets_ = {2.0, 9.5, 2.0};
  runWorkerLoop(job_, *runner_, watch_, signs_);
  ASSERT_THAT(sentTags(),
              ElementsAre(RankMessage::ready, RankMessage::result, RankMessage::result, RankMessage::result));
  EXPECT_EQ(decodeReady(job_.sent[0].content).processFolder, folder_ / "run_Process1");
  const ResultMessage first = decodeResult(job_.sent[1].content);
  EXPECT_THAT(first.result.measureValues, ElementsAre(1.0));
  EXPECT_EQ(first.leftBehind, "");
  EXPECT_EQ(decodeResult(job_.sent[2].content).result.failure->kind, EvaluationFailure::Kind::constraintsViolated);
  EXPECT_EQ(decodeResult(job_.sent[3].content).leftBehind, "a process");
  EXPECT_EQ(launcher_.starts, 2);
}

TEST_F(RankWorkerTest, KeepsTheFolderOfItsLastRunWhereTheMasterSaysSo) {
  description_.failedFolderPrefix = folder_ / "run_Failed";
  makeRunner(launcher_, 1);
  sets_ = {2.0, 3.0};
  keepAt_ = 1;
  runWorkerLoop(job_, *runner_, watch_, signs_);
  EXPECT_THAT(folder_.read("run_Failed17/parameters.txt"), EndsWith(" 2\n"));
  EXPECT_THAT(sentTags(), ElementsAre(RankMessage::ready, RankMessage::result, RankMessage::result));
}

TEST_F(RankWorkerTest, AWarningIsToldOnceWithTheNextResultThere) {
  description_.savedFiles = {folder_ / "base/often.txt"};
  description_.savedFolder = folder_ / "run_Saved";
  description_.failedFolderPrefix = folder_ / "none/run_Failed";
  folder_.write("base/often.txt", "");
  FakeLauncher launcher([](int start, const std::string&) {
    return FakeLauncher::Batch{.write = [start](const std::string& folder) {
      std::ofstream(folder + "/simulated.csv") << series(2.0);
      if (start > 1) std::ofstream(folder + "/often.txt") << "written";
    }};
  });
  makeRunner(launcher, 1);
  sets_ = {2.0, 2.0, 2.0, 2.0};
  keepAt_ = 2;
  runWorkerLoop(job_, *runner_, watch_, signs_);
  ASSERT_EQ(job_.sent.size(), 5U);
  const auto absent = [this](std::size_t set) { return decodeResult(job_.sent.at(set).content).result.absentFiles; };
  EXPECT_THAT(absent(1).at(0).reason, HasSubstr("often.txt was not kept: the model run did not write it"));
  EXPECT_THAT(absent(2), IsEmpty());
  EXPECT_THAT(workerWarningsOf(3),
              ElementsAre(HasSubstr("Evaluation of parameter set No. 17: The folder of this run was not kept as")));
  EXPECT_THAT(warningsOf(3), IsEmpty());
  EXPECT_THAT(warningsOf(4), IsEmpty());
}

TEST_F(RankWorkerTest, AFolderThatIsDamagedAgainIsToldInPlaceOfAResult) {
  FakeLauncher launcher([](int, const std::string&) {
    return FakeLauncher::Batch{.write = [](const std::string& folder) {
      std::ofstream(folder + "/simulated.csv") << series(2.0);
      std::filesystem::remove(folder + "/parameters.txt");
    }};
  });
  makeRunner(launcher, 1);
  sets_ = {2.0, 2.0, 2.0};
  runWorkerLoop(job_, *runner_, watch_, signs_);
  ASSERT_THAT(sentTags(),
              ElementsAre(RankMessage::ready, RankMessage::result, RankMessage::result, RankMessage::givenUp));
  EXPECT_THAT(workerWarningsOf(2), ElementsAre(HasSubstr("was made anew")));
  EXPECT_EQ(decodeGivenUp(job_.sent[3].content).what, "Unable to open " + (folder_ / "run_Process1/parameters.txt"));
}

TEST_F(RankWorkerTest, GivesSignsOfLifeWhileItsModelRuns) {
  LifeSigns signs(
      job_, [this] { return launcher_.now; }, 16.0);
  sets_ = {2.0};
  runWorkerLoop(job_, *runner_, watch_, signs);  // ten seconds
  EXPECT_THAT(sentTags(), ElementsAre(RankMessage::ready, RankMessage::alive, RankMessage::alive, RankMessage::alive,
                                      RankMessage::alive, RankMessage::result));
}

TEST_F(RankWorkerTest, ARunWhoseTimeWasOverWhenItsWorkerWasStoppedIsMadeOnceMore) {
  for (const bool isStopped : {true, false}) {
    SCOPED_TRACE(isStopped);
    FakeLauncher launcher([](int start, const std::string&) {
      FakeLauncher::Batch batch{.seconds = 5.0, .write = [](const std::string& folder) {
                                  std::ofstream(folder + "/simulated.csv") << series(2.0);
                                }};
      if (start == 1) batch.failure = {BatchFailure::Kind::timedOut, 0, "too long"};
      return batch;
    });
    bool isOver = !isStopped;
    launcher.onWait = [&] {
      if (!std::exchange(isOver, true)) launcher.now += 30.0;
    };
    LifeSigns signs(
        job_, [&] { return launcher.now; }, 0.0);
    makeRunner(launcher, 1);
    job_.sent.clear();
    sets_ = {2.0};
    runWorkerLoop(job_, *runner_, watch_, signs);
    EXPECT_EQ(launcher.starts, isStopped ? 2 : 1);
    EXPECT_EQ(decodeResult(job_.sent.at(1).content).result.ok(), isStopped);
  }
}

TEST_F(RankWorkerTest, InAJobThatOutlivesLossesItWaitsForItsMasterAndNobodyElse) {
  job_.outlives = true;
  job_.othersLeave = false;
  job_.onSend = nullptr;
  job_.deliver(0, RankMessage::leave, {});
  sayFarewell(job_, &watch_);
  EXPECT_THAT(sentTags(), ElementsAre(RankMessage::farewell));
  EXPECT_EQ(job_.leftWithout, std::set<int>{});
  EXPECT_EQ(job_.finalisations, 0);

  job_.onReceive = [this](double) {
    if (now_ += 0.5; now_ > 60.0) job_.ended = {0};
  };
  EXPECT_THAT(refusalOf([&] { runWorkerLoop(job_, *runner_, watch_, signs_); }),
              StartsWith("Error: MPI communication failed\nthe process of the master has ended"));
}

TEST_F(RankWorkerTest, StopEndsAModelThatRuns) {
  sets_ = {2.0, 2.0, 2.0};
  job_.onReceive = [this](double) {
    if (launcher_.starts == 3 && launcher_.now > 25.0) job_.deliver(0, RankMessage::stop, {});
  };
  runWorkerLoop(job_, *runner_, watch_, signs_);
  EXPECT_EQ(launcher_.halts, 1);
  EXPECT_EQ(launcher_.runningCount(), 0);
  EXPECT_LE(launcher_.now, 25.5);  // it listens often
  EXPECT_EQ(job_.sent.size(), 3U);
}

TEST_F(RankWorkerTest, AKillFileThatTheMasterDoesNotAnswerEndsTheJob) {
  const std::string killFile = folder_.write("run._kill_", "left over");
  watch_ = MasterWatch(
      killFile, [this] { return now_; }, [this] { job_.abort(1); });
  enum class Wait { forASet, forTheModel, forStop, forTheOthers };
  for (const auto& [wait, seconds] : {std::pair(Wait::forASet, 2.5), std::pair(Wait::forTheModel, 2.5),
                                      std::pair(Wait::forStop, 2.5), std::pair(Wait::forTheOthers, 60.0)}) {
    SCOPED_TRACE(static_cast<int>(wait));
    job_.sent.clear();
    const double start = now_;
    job_.onReceive = [&, wait = wait](double) {
      now_ += 0.1;
      if (now_ - start > 20.0 && folder_.read("run._kill_") != "the user's") folder_.write("run._kill_", "the user's");
      if (wait == Wait::forTheModel && job_.sent.size() == 1 && job_.arriving.empty() && launcher_.starts < 3) {
        launcher_.starts = 2;  // the one that does not end
        job_.deliver(0, RankMessage::set, encode(SetMessage{1, {2.0}}));
      }
    };
    job_.onSend = nullptr;
    job_.othersLeave = false;
    try {
      if (wait == Wait::forStop) reportFailure(job_, {"why", {}}, &watch_);
      if (wait == Wait::forTheOthers) sayFarewell(job_, &watch_);
      if (wait < Wait::forStop) runWorkerLoop(job_, *runner_, watch_, signs_);
      ADD_FAILURE() << "it went on";
    } catch (const FakeJob::Aborted& aborted) {
      EXPECT_EQ(aborted.exitCode, 1);
    }
    EXPECT_NEAR(now_ - start, 20.0 + seconds, 1.0);
    std::filesystem::remove(killFile);
    now_ += 1.0;
    watch_.requireAnswerWithin(0.0);  // sees that it is gone
  }
}

TEST(RankMessages, ContentThatWasCutOrHasMoreIsRefused) {
  const ResultMessage message{{.measureValues = {1.0, -0.0},
                               .validationValues = {2.5},
                               .validationPairs = {{3, 4}},
                               .shownSeries = {{{10, 20}, {1.0F, 2.0F}}, {}},
                               .failure = EvaluationFailure{EvaluationFailure::Kind::signal, "why", {"a", ""}},
                               .warnings = {"careful"}},
                              "left",
                              {"made anew"}};
  const std::string content = encode(message);
  EXPECT_EQ(encode(decodeResult(content)), content);
  EXPECT_EQ(decodeResult(content).result.validationValues, message.result.validationValues);
  EXPECT_EQ(decodeResult(content).result.validationPairs, message.result.validationPairs);
  for (const int kind : {-1, 13}) {
    ResultMessage other = message;
    other.result.failure->kind = static_cast<EvaluationFailure::Kind>(kind);
    EXPECT_THROW(decodeResult(encode(other)), FatalError) << kind;
  }
  for (std::size_t length = 0; length < content.size(); ++length) {
    EXPECT_THROW(decodeResult(content.substr(0, length)), FatalError) << length;
  }
  EXPECT_THROW(decodeResult(content + "x"), FatalError);
  EXPECT_THROW(decodeSet(std::string(12, '\xff')), FatalError);  // a count that no memory could hold
}

}  // namespace
}  // namespace mirevo
