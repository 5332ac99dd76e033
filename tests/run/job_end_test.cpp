#include "run/job_end.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/fatal_error.h"
#include "evaluation/fake_job.h"
#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(JobEnd, TheMasterLeavesItsJobOrGivesUpAfterSomeTime) {
  const std::string late = "Warning: Worker 2 met an error that no evaluation depended on";
  const std::string silent =
      "Warning: All processes of the MPI job are aborted: no answer to the request to stop from "
      "worker 2";
  struct Case {
    std::string what;
    int exitCode;
    bool isKilled, answersLeave;  // the kill file is there, those who have answered leave
    int farewells;
    std::string told;
    double seconds;
  };
  const Case cases[] = {
      {"all workers answer", 0, false, true, 2, late, 0.0},
      {"after an error of the run", 1, false, true, 2, "", 0.0},
      {"a worker is silent at the end of the task", 0, false, true, 1, silent, 600.0},
      {"a worker is silent after an error", 1, false, true, 1, silent, 20.0},
      {"a worker is silent after a cancellation", 1, true, true, 1, silent, 2.5},
      {"the end of the task is cancelled", 0, true, true, 1, silent, 2.5},
      {"a worker is stopped behind its farewell", 1, true, false, 2,
       "are aborted: a worker that has stopped does not end", 2.5},
      {"the way to them is broken", 1, false, true, -1, "are aborted: Error: MPI communication failed\nwhy", 0.0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    const TemporaryFolder folder;
    RunState state;
    double now = 0.0;
    state.clock = [&now] { return now; };
    std::string reason;
    ASSERT_TRUE(state.log.open(folder / "run.log", reason)) << reason;
    state.progress.progressInit(folder / "run.log", "NONE");
    if (c.isKilled) folder.write("run._kill_", "");
    auto owned = std::make_unique<FakeJob>(3);
    FakeJob& job = *owned;
    state.job = std::move(owned);
    job.othersLeave = c.answersLeave;
    job.deliver(2, RankMessage::failure, encode(FailureMessage{"too late", {}}));
    for (int rank = 1; rank <= c.farewells; ++rank) job.deliver(rank, RankMessage::farewell, {});
    job.onReceive = [&](double seconds) {
      if (c.farewells < 0) fatalError(kCommunicationFailed, "why");
      if (job.arriving.empty()) now += seconds;
    };

    testing::internal::CaptureStderr();
    leaveJob(state, c.exitCode);
    const std::string said = testing::internal::GetCapturedStderr();
    EXPECT_EQ(job.sent.size(), 2U);
    EXPECT_EQ(job.finalisations, c.farewells == 2 ? 1 : 0);
    EXPECT_NEAR(now, c.seconds, 1.0);
    EXPECT_THAT(said, c.told.empty() ? testing::Matcher<std::string>(IsEmpty()) : HasSubstr(c.told));
    state.log.close();
    EXPECT_EQ(folder.read("run.log").find("Worker 2 met an error") != std::string::npos,
              c.exitCode == 0 && c.farewells >= 0);
  }
}

}  // namespace
}  // namespace mirevo
