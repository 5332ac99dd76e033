#include "run/results/shared_files.h"

#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/file_lock.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

TEST(SharedFiles, AreThoseOfSetupsNamedAfterAResultOfAnother) {
  const TemporaryFolder folder;
  for (const char* name : {"x.kdx", "x_Optimisation.KDX", "x_Run.kdx", "x_Opt.kdx", "y_Optimisation.kdx"}) {
    folder.write(name, "");
  }
  const std::string searching = folder / "x";
  const RunFile search[] = {run_files::kOptimisation.results, run_files::kOptimisation.record};
  const RunFile scenarios[] = {run_files::kPlain.results, run_files::kPlain.record};
  EXPECT_THAT(prefixesThatShare(searching, search), ElementsAre(searching + "_Optimisation"));
  EXPECT_THAT(prefixesThatShare(searching, scenarios), ElementsAre(searching + "_Run"));
  EXPECT_THAT(prefixesThatShare(searching + "_Run", scenarios), IsEmpty());

  FileLock lock;
  ASSERT_TRUE(lock.take(searching + "._lock_", {}, 0.0));
  EXPECT_EQ(runningPrefixThatShares(searching + "_Optimisation"), searching);
  EXPECT_EQ(runningPrefixThatShares(searching + "_Opt"), "");
}

TEST(SharedFiles, KeptResultsOfAnotherSetupAreToldOf) {
  const TemporaryFolder folder;
  const std::tuple<const char*, const char*, int> cases[] = {
      {"/old/x.kdx", "x.kdx", 0}, {"/old/x_Optimisation.kdx", "x.kdx", 1}, {"/old/\xEF\xBF\xBD.kdx", "\xE4.kdx", 0}};
  for (const auto& [named, setup, warnings] : cases) {
    const std::string path =
        folder.write("x_Optimisation.dat", std::string("# Title\n# Setup file: ") + named + "\n1\tOK\n");
    RunLog log;
    EXPECT_THAT(keepEarlierResults(path, folder / setup, log), HasSubstr("/x_Optimisation."));
    EXPECT_EQ(log.warningCount(), warnings) << named;
  }
}

}  // namespace
}  // namespace mirevo
