#include "evaluation/ranks/mpi_worker.h"

#include "evaluation/evaluation_fixture.h"
#include "evaluation/fake_channel.h"
#include "evaluation/fake_launcher.h"

namespace mirevo {
namespace {

using testing::ElementsAre;

/// A worker whose master sends the next of `sets` for each answer, and then stop.
class MpiWorkerTest : public EvaluationTest {
 protected:
  MpiWorkerTest() : launcher_(batch) {
    channel_.onSend = [this](const Message&) {
      if (sets_.empty()) {
        channel_.deliver(0, RankMessage::stop, {});
      } else {
        channel_.deliver(0, RankMessage::set, encode(SetMessage{1, {sets_.front()}}));
        sets_.pop_front();
      }
    };
    makeRunner(launcher_, 1);
  }
  /// The model with a = 2. The second run leaves a process behind, the third one does not end.
  static FakeLauncher::Batch batch(int start, const std::string&) {
    FakeLauncher::Batch batch;
    batch.seconds = start < 3 ? 10.0 : 1e9;
    batch.leftBehind = start == 2 ? "a process" : "";
    batch.write = [](const std::string& folder) { std::ofstream(folder + "/simulated.csv") << series(2.0); };
    return batch;
  }
  std::vector<RankMessage> sentTags() const {
    std::vector<RankMessage> tags;
    for (const Message& message : channel_.sent) tags.push_back(static_cast<RankMessage>(message.tag));
    return tags;
  }

  FakeLauncher launcher_;
  FakeChannel channel_{3};
  std::deque<double> sets_;
};

TEST_F(MpiWorkerTest, AnswersEachSetUntilItIsToldToStop) {
  sets_ = {2.0, 9.5, 2.0};
  runWorkerLoop(channel_, *runner_);
  ASSERT_THAT(sentTags(),
              ElementsAre(RankMessage::ready, RankMessage::result, RankMessage::result, RankMessage::result));
  EXPECT_EQ(decodeReady(channel_.sent[0].content).processFolder, folder_ / "run_Process1");
  const ResultMessage first = decodeResult(channel_.sent[1].content);
  EXPECT_THAT(first.result.measureValues, ElementsAre(1.0));
  EXPECT_EQ(first.leftBehind, "");
  EXPECT_EQ(decodeResult(channel_.sent[2].content).result.failure->kind, EvaluationFailure::Kind::constraintsViolated);
  EXPECT_EQ(decodeResult(channel_.sent[3].content).leftBehind, "a process");
  EXPECT_EQ(launcher_.starts, 2);
}

TEST_F(MpiWorkerTest, KeepsTheFolderOfItsLastRunWhereTheMasterSaysSo) {
  description_.failedFolderPrefix = folder_ / "run_Failed";
  makeRunner(launcher_, 1);
  sets_ = {2.0, 3.0};
  const auto sendNext = channel_.onSend;
  channel_.onSend = [this, sendNext](const Message& message) {
    if (message.tag == static_cast<int>(RankMessage::result) && sets_.size() == 1) {
      channel_.deliver(0, RankMessage::keepFolder, encode(KeepFolderMessage{17}));
    }
    sendNext(message);
  };
  runWorkerLoop(channel_, *runner_);
  EXPECT_THAT(folder_.read("run_Failed17/parameters.txt"), testing::EndsWith(" 2\n"));
  EXPECT_THAT(sentTags(), ElementsAre(RankMessage::ready, RankMessage::result, RankMessage::result));
}

TEST_F(MpiWorkerTest, StopEndsAModelThatRuns) {
  sets_ = {2.0, 2.0, 2.0};
  channel_.onReceive = [this](double) {
    if (launcher_.starts == 3 && launcher_.now > 25.0) channel_.deliver(0, RankMessage::stop, {});
  };
  runWorkerLoop(channel_, *runner_);
  EXPECT_EQ(launcher_.halts, 1);
  EXPECT_EQ(launcher_.runningCount(), 0);
  EXPECT_LE(launcher_.now, 25.5);  // it listens often
  EXPECT_EQ(channel_.sent.size(), 3U);
}

TEST(RankMessages, ContentThatWasCutOrHasMoreIsRefused) {
  ResultMessage message;
  message.result.measureValues = {1.0, -0.0};
  message.result.failure = EvaluationFailure{EvaluationFailure::Kind::signal, "why", {"a", ""}};
  message.result.warnings = {"careful"};
  message.result.shownSeries = {{{10, 20}, {1.0F, 2.0F}}, {}};
  message.leftBehind = "left";
  const std::string content = encode(message);
  EXPECT_EQ(encode(decodeResult(content)), content);
  for (std::size_t length = 0; length < content.size(); ++length) {
    EXPECT_THROW(decodeResult(content.substr(0, length)), FatalError) << length;
  }
  EXPECT_THROW(decodeResult(content + "x"), FatalError);
  EXPECT_THROW(decodeSet(std::string(12, '\xff')), FatalError);  // a count that no memory could hold
}

}  // namespace
}  // namespace mirevo
