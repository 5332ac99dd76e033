#include "run/results/shared_files.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/file_lock.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::AllOf;
using ::testing::Contains;
using ::testing::Each;
using ::testing::HasSubstr;
using ::testing::Not;

TEST(SharedFiles, AreThoseOfSetupsNamedAfterAResultOfAnother) {
  const TemporaryFolder folder;
  const std::string name = folder / "x_Run";
  EXPECT_THAT(prefixesThatShare(name),
              AllOf(Contains(folder / "x"), Contains(name + "_Optimisation_Run"), Contains(name + "_Termination"),
                    Not(Contains(name + "_Saved")), Not(Contains(name + "_Process"))));
  FileLock lock;
  ASSERT_TRUE(lock.take((folder / "x") + "._lock_", {}, 0.0));
  EXPECT_EQ(runningPrefixThatShares(folder / "x_Optimisation"), folder / "x");
  EXPECT_EQ(runningPrefixThatShares(folder / "x_Opt"), "");
}

TEST(SharedFiles, KeptResultsOfAnotherSetupAreToldOfOnce) {
  const TemporaryFolder folder;
  for (const auto& [setup, warnings] : {std::pair{"/old/x.KDX", 0}, {"/old/x_Optimisation.kdx", 1}}) {
    std::vector<std::string> paths;
    for (const char* file : {"x_Optimisation.dat", "x_Optimisation_Run.dat"}) {
      paths.push_back(folder.write(file, std::string("# Title\n# Setup file: ") + setup + "\n1\tOK\n"));
    }
    RunLog log;
    EXPECT_THAT(keepEarlierResults(paths, folder / "x.kdx", log), Each(HasSubstr("/x_Optimisation")));
    EXPECT_EQ(log.warningCount(), warnings) << setup;
  }
}

}  // namespace
}  // namespace mirevo
