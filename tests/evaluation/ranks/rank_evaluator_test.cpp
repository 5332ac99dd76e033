#include "evaluation/ranks/rank_evaluator.h"

#include <algorithm>
#include <cmath>

#include "evaluation/evaluation_fixture.h"
#include "evaluation/fake_job.h"
#include "evaluation/fake_launcher.h"
#include "matchers.h"

namespace mirevo {
namespace {

/// A master with workers that answer when the test lets them: each result is the set's value less 1.
class RankEvaluatorTest : public EvaluationTest {
 protected:
  RankEvaluatorTest() : launcher_([](int, const std::string&) { return FakeLauncher::Batch{}; }) {
    job_.onSend = [this](const Message& message) {
      if (message.tag != static_cast<int>(RankMessage::set)) return;
      const SetMessage given = decodeSet(message.content);
      running_[message.rank] = given.set.at(0);
      given_.emplace_back(message.rank, given.number);
    };
  }
  RankEvaluator& makeMaster(int planned = 100) {
    makeRunner(launcher_, 0);
    failedRuns_ = std::make_unique<FailedRunPolicy>(planned, foldersToKeep_);
    master_ = std::make_unique<RankEvaluator>(*runner_, job_, watch_, observer_, *failedRuns_, earlier_.get());
    return *master_;
  }
  void becomeReady(int rank, const std::vector<std::string>& warnings = {}) {
    job_.deliver(rank, RankMessage::ready, encode(ReadyMessage{"node", "/folder", warnings}));
  }
  void answer(int rank) {
    const double measure = running_.at(rank) - 1.0;
    // The aggregate is the worker's own, which counts for nothing.
    const EvaluationResult result{
        .measureValues = {measure}, .objectiveValues = {std::abs(measure)}, .aggregate = -99.0, .pairs = pairs_};
    job_.deliver(rank, RankMessage::result, encode(ResultMessage{result}));
    running_.erase(rank);
  }
  /// The running workers answer one by one, those first whose set has the largest value.
  void answerLargestFirst() {
    job_.onReceive = [this](double) {
      if (!job_.arriving.empty() || running_.empty()) return;
      int first = running_.begin()->first;
      for (const auto& [rank, value] : running_) {
        if (value > running_.at(first)) first = rank;
      }
      answer(first);
    };
  }

  static constexpr double kLimit = 10.0;

  FakeLauncher launcher_;
  FakeJob job_{3};
  double now_ = 0.0;
  WorkerWatch watch_{job_, kLimit, [this] { return now_; }};
  std::map<int, double> running_;           ///< the set's value, by rank
  std::vector<std::pair<int, int>> given_;  ///< rank and evaluation of all that was handed out
  std::vector<MeasurePairs> pairs_;         ///< of each answer
  std::unique_ptr<RankEvaluator> master_;
};

TEST_F(RankEvaluatorTest, WhoeverIsFreeGetsTheNextSetAndResultsStandInTheOrderOfTheSets) {
  RankEvaluator& master = makeMaster();
  becomeReady(2, {"no locks"});
  becomeReady(1, {"no locks"});
  answerLargestFirst();
  const auto results = evaluate(master, {4.0, 2.0, 9.5, 3.0, 6.0});  // the third one violates a constraint
  EXPECT_THAT(measuresOf(results), ElementsAre(3.0, 1.0, kFailedRunValue, 2.0, 5.0));
  EXPECT_EQ(results[0].aggregate, 3.0) << "the master's own";
  EXPECT_THAT(
      observer_.events,
      ElementsAre("Worker 2 is ready on node, process folder /folder", "warning: worker 2 on node: no locks",
                  "Evaluation of parameter set No. 1 initiated", "Worker 1 is ready on node, process folder /folder",
                  "Evaluation of parameter set No. 2 initiated", "Evaluation of parameter set No. 1 completed: OK",
                  "record 1 a=4 OK",
                  "Evaluation of parameter set No. 3 completed: FAILED - parameter constraints violated",
                  "record 3 a=9.5 FAILED", "Evaluation of parameter set No. 4 initiated",
                  "Evaluation of parameter set No. 4 completed: OK", "record 4 a=3 OK",
                  "Evaluation of parameter set No. 5 initiated", "Evaluation of parameter set No. 5 completed: OK",
                  "record 5 a=6 OK", "Evaluation of parameter set No. 2 completed: OK", "record 2 a=2 OK"));
  std::vector<int> receivers;
  for (const Message& message : job_.sent) receivers.push_back(message.rank);
  EXPECT_THAT(receivers, ElementsAre(2, 1, 2, 2));

  // The numbers go on, and of two free workers the first is taken.
  const auto next = evaluate(master, {1.0});
  EXPECT_EQ(next.at(0).number, 6);
  EXPECT_EQ(job_.sent.back().rank, 1);
  EXPECT_EQ(launcher_.starts, 0);
}

TEST_F(RankEvaluatorTest, ResultsOfAWindowAreTakenInTheOrderOfItsSets) {
  takeUp({{3, 3.0}});
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  answerLargestFirst();
  const auto results = evaluateInWindow(master, {2.0, 4.0, 3.0, 9.5, 6.0, 7.0}, 4);
  EXPECT_THAT(measuresOf(results), ElementsAre(1.0, 3.0, 2.0, kFailedRunValue, 5.0, 6.0));
  std::erase_if(observer_.events, [](const std::string& event) { return event.find("a=") == event.npos; });
  // The smallest value, which is the first set, ends last of those that were submitted with it.
  EXPECT_THAT(observer_.events, ElementsAre("replay 3 a=3 OK", "record 2 a=4 OK", "record 4 a=9.5 FAILED",
                                            "record 1 a=2 OK", "record 6 a=7 OK", "record 5 a=6 OK"));
  EXPECT_EQ(evaluate(master, {1.0}).at(0).number, 7);

  job_.onReceive = [this](double) { observer_.cancelled = true; };
  EXPECT_THROW(evaluateInWindow(master, {2.0, 4.0}, 2), RunCancelled);
  EXPECT_TRUE(master.takeUnfinished().sets.empty());
}

TEST_F(RankEvaluatorTest, WorkersWaitForTheFirstSuccessfulRunWhosePairsTheirsNeed) {
  description_.minimumCoverage = 0.5;
  pairs_ = {{.count = 5}};
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  answerLargestFirst();
  evaluate(master, {2.0, 4.0, 6.0});
  std::vector<std::pair<int, std::vector<std::size_t>>> required;
  for (const Message& message : job_.sent) {
    required.emplace_back(message.rank, decodeSet(message.content).standard.firstCounts);
  }
  EXPECT_THAT(required, ElementsAre(testing::Pair(1, IsEmpty()), testing::Pair(1, ElementsAre(5)),
                                    testing::Pair(2, ElementsAre(5))));
}

TEST_F(RankEvaluatorTest, AFileWithoutALineEndWaitsForTheFirstSuccessfulRun) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.onReceive = [this](double) {
    if (!job_.arriving.empty() || running_.empty()) return;
    const int last = running_.rbegin()->first;
    pairs_ = {{.count = 5}};
    pairs_[0].file.endsLine = running_.at(last) == 2.0;  // the first successful run's, which ends last
    answer(last);
  };
  const auto results = evaluate(master, {2.0, 4.0, 6.0});
  EXPECT_THAT(measuresOf(results), ElementsAre(1.0, kFailedRunValue, kFailedRunValue));
  EXPECT_EQ(job_.sent.at(2).rank, 1) << "the other one waits with its folder";
  EXPECT_EQ(decodeSet(job_.sent.at(2).content).standard.firstNumber, 1);
}

TEST_F(RankEvaluatorTest, FailedRunsOfAllWorkersCountTogether) {
  RankEvaluator& master = makeMaster(10);
  becomeReady(1);
  becomeReady(2);
  job_.onSend = [this](const Message& message) {
    ResultMessage failed{
        runner_->failedResult({EvaluationFailure::Kind::exitCode, "code 3", {"last words"}}), "left", {}};
    failed.warnings = {"x was made anew"};
    job_.deliver(message.rank, RankMessage::result, encode(failed));
  };
  EXPECT_THAT(refusalOf([&] { evaluate(master, std::vector(4, 2.0)); }),
              AllOf(StartsWith("Error: Unable to continue. No of failed simulations too high.\n"),
                    HasSubstr("code 3\n| last words")));
  EXPECT_EQ(failedRuns_->failedCount(), 2);
  EXPECT_THAT(observer_.events,
              testing::IsSupersetOf({"warning: Evaluation of parameter set No. 1: left", "warning: x was made anew"}));
}

TEST_F(RankEvaluatorTest, AWorkersFatalErrorIsTheMastersWithItsPlace) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.deliver(2, RankMessage::failure, encode(FailureMessage{"Error: Unable to open x", "No space left"}));
  EXPECT_EQ(refusalOf([&] { evaluate(master, {2.0}); }),
            "Error: Unable to open x\nNo space left\nreported by worker 2 on node");
}

TEST_F(RankEvaluatorTest, ACancelledRunStopsWhileWorkersAreBusy) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  job_.onReceive = [this](double seconds) {
    EXPECT_LE(seconds, 3.0);
    observer_.cancelled = !running_.empty();
  };
  EXPECT_THROW(evaluate(master, std::vector(4, 2.0)), RunCancelled);
  EXPECT_EQ(observer_.events.back(), "EM: Simulation cancelled");
}

TEST_F(RankEvaluatorTest, StoppingGoesInRankOrderAndEndsWithTheLastFarewell) {
  job_.onSend = nullptr;
  job_.deliver(2, RankMessage::failure, encode(FailureMessage{"too late", "No space left"}));
  job_.deliver(2, RankMessage::farewell, {});
  job_.deliver(1, RankMessage::farewell, {});
  std::vector<std::string> warnings;
  const auto warn = [&](const std::string& text) { warnings.push_back(text); };
  const auto isEnough = [] { return true; };
  stopWorkers(job_);
  EXPECT_THAT(awaitFarewells(job_, {}, isEnough, warn), IsEmpty());
  EXPECT_THAT(warnings, ElementsAre("Worker 2 met an error that no evaluation depended on: too late\nNo space left"));
  ASSERT_EQ(job_.sent.size(), 2U);
  EXPECT_EQ(job_.sent[0].rank, 1);
  EXPECT_EQ(job_.sent[1].tag, static_cast<int>(RankMessage::stop));
  job_.deliver(1, RankMessage::farewell, {});
  EXPECT_THAT(awaitFarewells(job_, {}, isEnough, warn), ElementsAre(2));
}

TEST_F(RankEvaluatorTest, NobodyWaitsForWorkersThatAreLost) {
  const auto never = [] { return false; };
  job_.ended = {2};
  EXPECT_THAT(awaitFarewells(job_, {1}, never, nullptr), ElementsAre(1, 2));
  stopWorkers(job_, {1});
  dismissWorkers(job_, {2});
  ASSERT_EQ(job_.sent.size(), 2U);
  EXPECT_EQ(job_.sent[0].rank, 2);
  EXPECT_EQ(job_.sent[1].rank, 1);
  EXPECT_EQ(job_.sent[1].tag, static_cast<int>(RankMessage::leave));
}

/// What becomes of the first worker, which has the first of four sets, and whether its own result comes, too.
struct LossCase {
  const char* name;
  bool ends;           ///< its process; otherwise it is silent
  double comesBackAt;  ///< with its result, s; 0: never
  std::vector<std::pair<int, int>> given;
  std::vector<std::string> says;
};

class LossTest : public RankEvaluatorTest, public testing::WithParamInterface<LossCase> {};

// The other worker takes 4 s for each set, and gives signs of life.
TEST_P(LossTest, CostsOneModelRun) {
  const LossCase& loss = GetParam();
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  double begun = 0.0;
  bool hasComeBack = false;
  job_.onReceive = [&](double) {
    if (!job_.arriving.empty()) return;
    now_ += 0.25;
    ASSERT_LT(now_, 200.0);
    if (loss.ends && now_ > 1.0) job_.ended = {1};
    job_.deliver(2, RankMessage::alive, {});
    if (loss.comesBackAt > 0.0 && now_ >= loss.comesBackAt && running_.contains(1)) {
      hasComeBack = true;
      answer(1);
    }
    if (running_.contains(2) && now_ - begun >= 4.0) {
      begun = now_;
      answer(2);
    }
  };
  EXPECT_THAT(measuresOf(evaluate(master, {4.0, 2.0, 3.0, 6.0, 7.0})), ElementsAre(3.0, 1.0, 2.0, 5.0, 6.0));
  EXPECT_EQ(hasComeBack, loss.comesBackAt > 0.0);
  EXPECT_EQ(given_, loss.given);
  EXPECT_THAT(measuresOf(evaluate(master, std::vector(20, 2.0))), testing::Each(1.0))
      << "of what runs on, nothing counts";
  EXPECT_EQ(failedRuns_->failedCount(), 0);
  for (const std::string& text : loss.says) EXPECT_THAT(observer_.events, testing::Contains(HasSubstr(text)));
  const auto records = std::count_if(observer_.events.begin(), observer_.events.end(),
                                     [](const std::string& event) { return event.starts_with("record "); });
  EXPECT_EQ(records, 25);
}

const LossCase kLosses[] = {
    {"Ended",
     true,
     0.0,
     {{1, 1}, {2, 2}, {2, 1}, {2, 3}, {2, 4}, {2, 5}},
     {"warning: Worker 1 on node is lost: its process has ended. Evaluation No. 1, which it had for "}},
    {"Silent",
     false,
     0.0,
     {{1, 1}, {2, 2}, {2, 3}, {2, 4}, {2, 1}, {2, 5}},
     {"warning: Worker 1 on node is lost: it has given no sign of life for 10 s. Evaluation No. 1, which it had for "}},
    // Before the set that was put back is taken again: it is the other one's next but one.
    {"BackAtOnce", false, 10.5, {{1, 1}, {2, 2}, {2, 3}, {2, 4}, {1, 5}}, {"Worker 1 on node answers again"}},
    {"FirstAllTheSame",
     false,
     13.0,
     {{1, 1}, {2, 2}, {2, 3}, {2, 4}, {2, 1}, {1, 5}},
     {"The result of evaluation No. 1 from worker 2 on node is dropped"}},
    {"Late",
     false,
     17.0,
     {{1, 1}, {2, 2}, {2, 3}, {2, 4}, {2, 1}, {2, 5}},
     {"The result of evaluation No. 1 from worker 1 on node is dropped: another worker had it first"}}};

INSTANTIATE_TEST_SUITE_P(Cases, LossTest, testing::ValuesIn(kLosses), [](const auto& loss) { return loss.param.name; });

TEST_F(RankEvaluatorTest, TheMastersOwnAbsenceIsNoSilenceOfItsWorkers) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  int waits = 0;
  job_.onReceive = [&](double) {
    if (!job_.arriving.empty() || running_.empty()) return;
    now_ += 3600.0;
    if (++waits % 4 == 0) answer(waits % 8 == 0 ? running_.begin()->first : running_.rbegin()->first);
  };
  evaluate(master, std::vector(6, 2.0));
  EXPECT_THAT(watch_.lost(), IsEmpty());
  EXPECT_EQ(given_.size(), 6U);
}

TEST_F(RankEvaluatorTest, WithoutALimitSilenceIsNoLoss) {
  WorkerWatch watch(job_, 0.0, [this] { return now_; });
  watch.handOut(1, 1);
  for (; now_ < 1000.0; now_ += 0.5) EXPECT_THAT(watch.findLost(), IsEmpty());
  job_.ended = {1};
  EXPECT_THAT(watch.findLost(), ElementsAre(1));
}

TEST_F(RankEvaluatorTest, ARunWhoseWorkersAreAllLostEnds) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.onReceive = [&](double) {
    now_ += 0.25;
    if (now_ > 1.0) job_.ended = {2};
    if (now_ < 3.0 && job_.arriving.empty() && running_.contains(2)) answer(2);
  };
  EXPECT_EQ(refusalOf([&] { evaluate(master, std::vector(20, 2.0)); }),
            "Error: All workers of the job are lost\nworker 1 on node: it gives no sign of life\n"
            "worker 2 on node: its process has ended\nRestart = 1 goes on with what has been evaluated");
  EXPECT_GE(master.takeUnfinished().results.size(), 1U) << "what was evaluated is kept";
}

TEST_F(RankEvaluatorTest, AResultThatWaitsIsKeptWhenItsWorkerIsLost) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  pairs_ = {{.count = 5}};
  pairs_[0].file.endsLine = false;
  job_.onReceive = [&](double) {
    if (!job_.arriving.empty()) return;
    now_ += 0.25;
    if (running_.contains(2)) return answer(2);  // waits for the first set's
    job_.ended = {2};
    if (now_ > 2.0 && running_.contains(1)) answer(1);
  };
  EXPECT_THAT(measuresOf(evaluate(master, {2.0, 4.0, 6.0})), ElementsAre(1.0, 3.0, 5.0));
  EXPECT_THAT(given_, ElementsAre(testing::Pair(1, 1), testing::Pair(2, 2), testing::Pair(1, 3)));
}

TEST_F(RankEvaluatorTest, TheWorkerOfAnEarlyFailureIsToldToKeepItsFolder) {
  foldersToKeep_ = 1;
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  job_.onReceive = [this](double) {
    if (running_.erase(1) == 0) return;
    job_.deliver(1, RankMessage::result,
                 encode(ResultMessage{runner_->failedResult({EvaluationFailure::Kind::timedOut, "too long", {}})}));
  };
  evaluate(master, {2.0, 3.0});
  ASSERT_EQ(job_.sent.size(), 3U);  // set, keep, set
  EXPECT_EQ(job_.sent[1].tag, static_cast<int>(RankMessage::keepFolder));
  EXPECT_EQ(decodeKeepFolder(job_.sent[1].content).number, 1);
}

TEST_F(RankEvaluatorTest, TheSetOfAWorkerThatIsGivenUpIsAnothersUntilNoneIsLeft) {
  const std::string damage = encode(GivenUpMessage{"Unable to open x", "no such file", {"x was made anew"}});
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.deliver(1, RankMessage::givenUp, damage);
  answerLargestFirst();
  // The first worker runs nothing of what follows, though it is free.
  job_.onSend = [this, known = job_.onSend](const Message& message) {
    known(message);
    if (message.rank == 1) running_.erase(1);
  };
  EXPECT_THAT(measuresOf(evaluate(master, {4.0, 2.0, 3.0})), ElementsAre(3.0, 1.0, 2.0));
  EXPECT_THAT(
      observer_.events,
      testing::IsSupersetOf({"warning: x was made anew",
                             "warning: Worker 1 is given up and runs no model any more, as its process folder "
                             "was damaged again. Unable to open x: no such file; reported by worker 1 on node"}));
  job_.onReceive = nullptr;
  job_.deliver(2, RankMessage::givenUp, damage);
  EXPECT_THAT(refusalOf([&] { evaluate(master, {5.5}); }),
              StartsWith("Error: Unable to open x\nno such file; reported by worker 2 on node\nno process folder is "
                         "left"));
}

TEST_F(RankEvaluatorTest, ARunEndsWhenOfTheWorkersSomeAreLostAndTheOthersGivenUp) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.onReceive = [this](double) {
    ASSERT_LT(now_ += 0.25, 60.0);
    job_.ended = {1};
    if (now_ < 5.0 || running_.erase(2) == 0) return;
    job_.deliver(2, RankMessage::givenUp, encode(GivenUpMessage{"Unable to open x", "no such file", {}}));
  };
  EXPECT_THAT(refusalOf([&] {
                evaluate(master, {4.0, 2.0, 3.0});
              }),
              AllOf(StartsWith("Error: All workers of the job are lost\n"), HasSubstr("worker 1 on node: its process"),
                    HasSubstr("worker 2 on node: its process folder cannot be used")));
}

TEST_F(RankEvaluatorTest, AFailureOfAWorkerThatWasTakenForLostDoesNotCount) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.onReceive = [&, hasFailed = false](double) mutable {
    if (!job_.arriving.empty()) return;
    ASSERT_LT(now_ += 0.25, 60.0);
    job_.deliver(2, RankMessage::alive, {});
    if (now_ >= 12.0 && !std::exchange(hasFailed, true)) {
      EvaluationResult failed;
      failed.failure = EvaluationFailure{EvaluationFailure::Kind::exitCode, "run.sh exited with code 1"};
      job_.deliver(1, RankMessage::result, encode(ResultMessage{failed, {}, {}}));
      running_.erase(1);
    }
    if (running_.contains(2) && (now_ == 4.0 || now_ >= 16.0)) answer(2);
  };
  EXPECT_THAT(measuresOf(evaluate(master, {4.0, 2.0})), ElementsAre(3.0, 1.0));
  EXPECT_EQ(failedRuns_->failedCount(), 0);
  EXPECT_THAT(observer_.events, testing::Contains(HasSubstr("taken for lost, and another makes the run")));
}

class SetGivenBackTest : public RankEvaluatorTest, public testing::WithParamInterface<bool> {};

TEST_P(SetGivenBackTest, IsRunByTheWorkerWhoseOwnResultWaitsForIt) {
  RankEvaluator& master = makeMaster();
  becomeReady(1);
  becomeReady(2);
  job_.onReceive = [this](double) {
    if (!job_.arriving.empty()) return;
    observer_.cancelled = running_.empty();  // or it would wait for ever
    if (observer_.cancelled) return;
    const bool isGivenBackFirst = GetParam();
    const int rank = isGivenBackFirst ? running_.begin()->first : running_.rbegin()->first;
    pairs_ = {{.count = 5}};
    pairs_[0].file.endsLine = running_.at(rank) == 2.0;
    if (rank == 2) return answer(rank);
    running_.erase(rank);
    job_.deliver(1, RankMessage::givenUp, encode(GivenUpMessage{"Unable to open x", "no such file", {}}));
  };
  EXPECT_THAT(measuresOf(evaluate(master, {2.0, 4.0})), ElementsAre(1.0, kFailedRunValue));
}

INSTANTIATE_TEST_SUITE_P(BeforeAndAfter, SetGivenBackTest, testing::Bool());

}  // namespace
}  // namespace mirevo
