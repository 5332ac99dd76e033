#include "run/improvement_hook.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/text.h"
#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

class ImprovementHookTest : public testing::Test {
 protected:
  ImprovementHookTest() {
    config_.setupFolder = folder_.path();
    std::string reason;
    EXPECT_TRUE(log_.open(folder_ / "run.log", reason)) << reason;
  }
  /// As at an early end of a run, whose log has its last record before.
  void closeLog() {
    log_.close();
    log_.close();
    log_.passWarningsTo([this](std::string_view text) { heard_.emplace_back(text); });
  }

  TemporaryFolder folder_;
  RunConfig config_;
  RunLog log_;
  std::vector<std::string> heard_;
};

TEST_F(ImprovementHookTest, MoreParametersThanAnEnvironmentHoldsComeInTheTableAlone) {
  config_.improvementCommand =
      "echo \"${MIREVO_PARAMETER_p0-none} $MIREVO_OBJECTIVE_fit\" >told; tail -n +2 | wc -l >>told";
  struct Case {
    int count;
    const char* told;
  };
  for (const Case& each : {Case{3, "1.5 0.5\n5\n"}, Case{60000, "none 0.5\n60002\n"}}) {
    HookValues best{1, 0.5, {}, {}, {{"fit", 0.5}}};
    for (int i = 0; i < each.count; ++i) best.parameters.emplace_back("p" + std::to_string(i), 1.5);
    ImprovementHook hook(config_, log_);
    hook.improved(best);
    hook.finish("finished", best, false, [] { return false; });
    EXPECT_EQ(folder_.read("told"), each.told);
  }
  const std::string log = folder_.read("run.log");
  EXPECT_THAT(log, Not(HasSubstr("Warning")));
  EXPECT_THAT(log, HasSubstr("table alone, as 60000 variables would take more than 100 kB\n"));
  EXPECT_THAT(log, Not(HasSubstr("as 3 variables")));
}

TEST_F(ImprovementHookTest, AtAnEarlyEndItsTimeIsShortAndItsFailureIsTold) {
  struct Case {
    const char* state;
    bool isOfJob, hasKillFile;
    std::string told;
  };
  const std::string end =
      "Warning: The improvement command at the end of the run was ended because it ran longer than ";
  const Case cases[] = {
      {"cancelled", true, true, end + "1 second after 1."},
      {"cancelled", false, true, end + "2 seconds after 2."},
      {"failed", true, true, "Warning: The improvement command was not run at the end of the run, because of the kill"},
  };
  config_.improvementCommand = "trap '' TERM; [ $MIREVO_REASON = end ] || exit 3; while :; do sleep 0.1; done";
  closeLog();
  for (const Case& each : cases) {
    SCOPED_TRACE(each.told);
    heard_.clear();
    ImprovementHook hook(config_, log_);
    hook.improved({1, 0.5, {}, {}, {}});
    hook.finish(each.state, std::nullopt, each.isOfJob, [&each] { return each.hasKillFile; });
    ASSERT_EQ(heard_.size(), 2U);  // the first is the improvement's
    EXPECT_THAT(heard_.back(), StartsWith(each.told));
  }
  EXPECT_EQ(log_.warningCount(), 0) << "they are not in the log";
  EXPECT_EQ(folder_.read("run.log"), "");
}

}  // namespace
}  // namespace mirevo
