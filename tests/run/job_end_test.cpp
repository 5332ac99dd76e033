#include "run/job_end.h"

#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/fatal_error.h"
#include "evaluation/fake_job.h"
#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(JobEnd, TheMasterLeavesOrAbortsItsJob) {
  const std::tuple<const char*, int, int, bool, bool, bool, std::string> cases[] = {
      {"all workers answer", 0, 2, false, true, true, "Warning: Worker 2 met an error that no evaluation depended on"},
      {"after an error of the run", 1, 2, false, true, false, ""},
      {"a worker is silent", 0, 1, false, false, true,
       "Warning: All processes of the MPI job are aborted: a worker did not answer the request to stop"},
      {"the way to them is broken", 1, 2, true, false, false,
       "Warning: All processes of the MPI job are aborted: Error: MPI communication failed\nwhy"},
  };
  for (const auto& [what, exitCode, farewells, isBroken, leaves, warnsOfLateError, wanted] : cases) {
    SCOPED_TRACE(what);
    const TemporaryFolder folder;
    RunState state;
    std::string reason;
    ASSERT_TRUE(state.log.open(folder / "run.log", reason)) << reason;
    auto owned = std::make_unique<FakeJob>(3);
    FakeJob& job = *owned;
    state.job = std::move(owned);
    job.deliver(2, RankMessage::failure, encode(FailureMessage{"too late", {}}));
    for (int rank = 1; rank <= farewells; ++rank) job.deliver(rank, RankMessage::farewell, {});
    if (isBroken) job.onReceive = [](double) { fatalError(kCommunicationFailed, "why"); };

    testing::internal::CaptureStderr();
    int abortedWith = -1;
    try {
      leaveJob(state, exitCode, "the end");
    } catch (const FakeJob::Aborted& aborted) {
      abortedWith = aborted.exitCode;
    }
    const std::string said = testing::internal::GetCapturedStderr();
    EXPECT_EQ(job.finalisations, leaves ? 1 : 0);
    EXPECT_EQ(abortedWith, leaves ? -1 : exitCode);
    EXPECT_THAT(said, wanted.empty() ? testing::Matcher<std::string>(IsEmpty()) : HasSubstr(wanted));
    state.log.close();
    EXPECT_EQ(folder.read("run.log").find("Worker 2 met an error") != std::string::npos, warnsOfLateError);
  }
}

TEST(JobEnd, AProcessAloneHasNothingToLeave) {
  RunState state;
  leaveJob(state, 1, "the end");
  EXPECT_EQ(state.job->rank(), -1);
}

}  // namespace
}  // namespace mirevo
