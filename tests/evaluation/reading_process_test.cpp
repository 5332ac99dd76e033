#include "evaluation/reading_process.h"

#include <csignal>
#include <filesystem>
#include <fstream>
#include <poll.h>
#include <unistd.h>

#include "common/fatal_error.h"
#include "evaluation/evaluation_fixture.h"
#include "evaluation/fake_launcher.h"
#include "evaluation/result_layout.h"
#include "platform/processes/helper_process.h"

namespace mirevo {
namespace {

using State = ReadingProcess::State;

State await(ReadingProcess& process) {
  constexpr int kMilliseconds = 10;
  State state = State::reading;
  while ((state = process.look()) == State::reading) {
    pollfd poll{process.socket(), POLLIN, 0};
    ::poll(&poll, 1, kMilliseconds);
  }
  return state;
}

/// The helpers of this process.
std::vector<pid_t> helpers() {
  std::vector<pid_t> found;
  std::ifstream children(fmt::format("/proc/self/task/{}/children", ::getpid()));
  for (pid_t child = 0; children >> child;) {
    if (isHelperProcess(child)) found.push_back(child);
  }
  return found;
}

TEST(ReadingProcess, WhateverBecomesOfItIsKnown) {
  RunReading sent;
  sent.result.measureValues = {0.1 + 0.2, -0.0};
  sent.result.simulatedValues.assign(400'000, 1.0 / 3.0);  // more than a socket holds
  sent.result.shownSeries = {{{1, 2}, {0.5F, std::nanf("")}}};
  sent.result.failure = EvaluationFailure{EvaluationFailure::Kind::tooFewPairs, "few", {"last"}};
  sent.mayBeCutOff = true;
  int changed = 0;
  ReadingProcess process;
  ASSERT_TRUE(process.start(
      [&] {
        ++changed;
        return sent;
      },
      60.0));
  ASSERT_EQ(await(process), State::done);
  const RunReading taken = process.take();
  EXPECT_EQ(bytesOf(taken.result), bytesOf(sent.result));
  EXPECT_TRUE(taken.mayBeCutOff);
  EXPECT_EQ(changed, 0);
  EXPECT_TRUE(helpers().empty());

  ASSERT_TRUE(process.start([]() -> RunReading { fatalError("of the setup", "in line 3"); }, 60.0));
  ASSERT_EQ(await(process), State::done);
  try {
    process.take();
    ADD_FAILURE() << "nothing was thrown";
  } catch (const FatalError& error) {
    EXPECT_EQ(error.message() + "/" + error.detail(), "of the setup/in line 3");
  }

  const std::tuple<const char*, std::function<RunReading()>, double> losses[] = {
      {"killed", []() -> RunReading { std::raise(SIGKILL), std::abort(); }, 60.0},
      {"crashed", []() -> RunReading { std::raise(SIGSEGV), std::abort(); }, 60.0},
      {"without memory", []() -> RunReading { throw std::bad_alloc(); }, 60.0},
      {"too late",
       []() -> RunReading {
         while (true) ::pause();
       },
       0.05},
  };
  for (const auto& [name, read, seconds] : losses) {
    ASSERT_TRUE(process.start(read, seconds)) << name;
    EXPECT_EQ(await(process), State::lost) << name;
  }
}

/// The same whatever the slot, which depends on how long a child takes to read.
std::string withoutSlot(std::string text) {
  constexpr std::string_view kFolder = "run_Process";
  for (std::size_t at = text.find(kFolder); at != std::string::npos; at = text.find(kFolder, at + 1)) {
    text[at + kFolder.size()] = 'n';
  }
  return text;
}

std::vector<std::string> inAnyOrder(std::vector<std::string> events) {
  for (std::string& event : events) event = withoutSlot(event);
  std::ranges::sort(events);
  return events;
}

/// What an observer was told.
struct Told {
  std::vector<std::string> events;
  std::map<int, EvaluationResult> results;
  bool cancelled = false;
};

/// Keeps results as they are recorded, with their series.
class KeepingObserver final : public EvaluationObserver {
 public:
  explicit KeepingObserver(Told& told) : told_(told) {}
  void message(std::string_view text) override { told_.events.emplace_back(text); }
  void warning(std::string_view text) override { told_.events.push_back("warning: " + std::string(text)); }
  void urgentWarning(std::string_view text) override { told_.events.push_back("at once: " + std::string(text)); }
  void evaluationFinished(std::span<const double>, const EvaluationResult&) override {}
  void recordEvaluation(std::span<const double>, const EvaluationResult& result) override {
    told_.results[result.number] = result;
  }
  void runCompared(const ComparisonFindings& found) override {
    told_.events.insert(told_.events.end(), found.firstLines.begin(), found.firstLines.end());
    for (const RunDifference& difference : found.differences) told_.events.push_back(difference.text);
  }
  bool isCancelled() override { return told_.cancelled; }

 private:
  Told& told_;
};

class ReadBesideTest : public EvaluationTest {
 protected:
  ReadBesideTest() {
    description_.hasShownSeries = true;
    description_.keepSimulatedValues = true;
    description_.computeExactMeasures = true;
  }

  /// What a model run leaves; several of each kind.
  FakeLauncher::Batch batchOf(int start, const std::string& folder) const {
    const std::string whole = series(static_cast<double>((start * 7) % 10) / 3.0);
    const std::string texts[] = {whole,
                                 whole,
                                 {},                                  // no file
                                 whole.substr(0, whole.size() - 1),   // may be cut off
                                 whole.substr(0, whole.size() - 15),  // lacks a pair
                                 "time,flow\n2001-01-01,x\n",         // cannot be read
                                 "time,flow\n2001-01-01,\n",          // without a value
                                 "time,flow\n1999-01-01,1\n"};        // without a pair
    const std::string text = texts[static_cast<std::size_t>(start) % std::size(texts)];
    FakeLauncher::Batch batch;
    batch.seconds = 1.0 + 0.1 * ((start * 5) % 7);
    batch.output = {fmt::format("line of {}", start)};
    if (start % 11 == 0) batch.failure = {BatchFailure::Kind::exitCode, 3, "run.sh exited with code 3"};
    batch.write = [this, text](const std::string& to) {
      const std::string path = std::filesystem::relative(to, folder_.path()) / "simulated.csv";
      if (!text.empty()) folder_.write(path, text);
    };
    static_cast<void>(folder);
    return batch;
  }

  /// Evaluates 40 sets in four slots.
  void run(double besideFrom) {
    FakeLauncher launcher([this](int start, const std::string& folder) { return batchOf(start, folder); });
    launcher.onWait = [this, &launcher] {
      if (onWait_) onWait_(launcher);
    };
    told_ = {};
    KeepingObserver observer(told_);
    makeRunner(launcher, 4);
    runner_->readBesideFrom(besideFrom);
    failedRuns_ = std::make_unique<FailedRunPolicy>(1000, 0);
    LocalEvaluator evaluator(*runner_, observer, *failedRuns_, 4);
    std::vector<double> values;
    for (int i = 0; i < 40; ++i) values.push_back(0.1 * i + 0.05);
    readers_ = 0;
    try {
      evaluate(evaluator, values);
    } catch (const RunCancelled&) {
      told_.events.push_back("cancelled");
    }
    readers_ = launcher.readersWaitedFor;
    halts_ = launcher.halts;
  }

  Told told_;
  std::function<void(FakeLauncher&)> onWait_;
  int readers_ = 0;
  int halts_ = 0;
};

TEST_F(ReadBesideTest, GivesTheSameBitsMessagesAndSeries) {
  run(1e9);
  EXPECT_EQ(readers_, 0);
  const Told expected = told_;
  run(0.0);
  EXPECT_GT(readers_, 20);
  EXPECT_EQ(inAnyOrder(told_.events), inAnyOrder(expected.events));
  ASSERT_EQ(told_.results.size(), 40U);
  std::size_t shown = 0;
  std::size_t failed = 0;
  for (const auto& [number, result] : told_.results) {
    EXPECT_EQ(withoutSlot(bytesOf(result)), withoutSlot(bytesOf(expected.results.at(number)))) << number;
    shown += result.shownSeries.empty() ? 0 : 1;
    failed += result.ok() ? 0 : 1;
  }
  EXPECT_GT(shown, 0U);
  EXPECT_LT(shown, 40U);
  EXPECT_GT(failed, 10U);
  EXPECT_TRUE(helpers().empty());
}

TEST_F(ReadBesideTest, ReadsAgainWhatAKilledProcessHasRead) {
  run(1e9);
  const Told expected = told_;
  int killed = 0;
  onWait_ = [&killed](FakeLauncher&) {
    for (const pid_t helper : helpers()) killed += ::kill(helper, SIGKILL) == 0 ? 1 : 0;
  };
  run(0.0);
  EXPECT_GT(killed, 10);
  EXPECT_EQ(inAnyOrder(told_.events), inAnyOrder(expected.events));
  for (const auto& [number, result] : told_.results) {
    EXPECT_EQ(withoutSlot(bytesOf(result)), withoutSlot(bytesOf(expected.results.at(number)))) << number;
  }
}

TEST_F(ReadBesideTest, IsEndedWithTheRun) {
  onWait_ = [this](FakeLauncher&) {
    if (!helpers().empty()) told_.cancelled = true;
  };
  run(0.0);
  EXPECT_EQ(told_.events.back(), "cancelled");
  EXPECT_EQ(halts_, 1);
  EXPECT_TRUE(helpers().empty());
}

}  // namespace
}  // namespace mirevo
