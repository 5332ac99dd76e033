#include "run/job_end.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/fatal_error.h"
#include "evaluation/fake_job.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using testing::HasSubstr;
using testing::IsEmpty;

TEST(JobEnd, TheMasterLeavesOrAbortsItsJob) {
  const struct {
    const char* what;
    int exitCode;
    int farewells;
    bool isBroken;
    bool leaves;
    bool warnsOfLateError;
    std::string said;
  } cases[] = {
      {"all workers answer", 0, 2, false, true, true, "Warning: Worker 2 met an error that no evaluation depended on"},
      {"after an error of the run", 1, 2, false, true, false, ""},
      {"a worker is silent", 0, 1, false, false, true,
       "Warning: All processes of the MPI job are aborted: a worker did not answer the request to stop"},
      {"the way to them is broken", 1, 2, true, false, false,
       "Warning: All processes of the MPI job are aborted: Error: MPI communication failed\nwhy"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    const TemporaryFolder folder;
    RunState state;
    std::string reason;
    ASSERT_TRUE(state.log.open(folder / "run.log", reason)) << reason;
    auto owned = std::make_unique<FakeJob>(3);
    FakeJob& job = *owned;
    state.job = std::move(owned);
    job.deliver(2, RankMessage::failure, encode(FailureMessage{"too late", {}}));
    for (int rank = 1; rank <= c.farewells; ++rank) job.deliver(rank, RankMessage::farewell, {});
    if (c.isBroken) job.onReceive = [](double) { fatalError(kCommunicationFailed, "why"); };

    testing::internal::CaptureStderr();
    int abortedWith = -1;
    try {
      leaveJob(state, c.exitCode, "the end");
    } catch (const FakeJob::Aborted& aborted) {
      abortedWith = aborted.exitCode;
    }
    const std::string said = testing::internal::GetCapturedStderr();
    EXPECT_EQ(job.finalisations, c.leaves ? 1 : 0);
    EXPECT_EQ(abortedWith, c.leaves ? -1 : c.exitCode);
    EXPECT_THAT(said, c.said.empty() ? testing::Matcher<std::string>(IsEmpty()) : HasSubstr(c.said));
    state.log.close();
    EXPECT_EQ(folder.read("run.log").find("Worker 2 met an error") != std::string::npos, c.warnsOfLateError);
  }
}

TEST(JobEnd, AProcessAloneHasNothingToLeave) {
  RunState state;
  leaveJob(state, 1, "the end");
  EXPECT_EQ(state.job->rank(), -1);
}

}  // namespace
}  // namespace mirevo
