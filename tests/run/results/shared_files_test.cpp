#include "run/results/shared_files.h"

#include <tuple>

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
  const std::tuple<const char*, const char*, int> cases[] = {
      {"/old/x.KDX", "x.kdx", 0}, {"/old/x_Optimisation.kdx", "x.kdx", 1}, {"/old/\xEF\xBF\xBD.kdx", "\xE4.kdx", 0}};
  for (const auto& [named, setup, warnings] : cases) {
    std::vector<std::string> paths;
    for (const char* file : {"x_Optimisation.dat", "x_Optimisation_Run.dat"}) {
      paths.push_back(folder.write(file, std::string("# Title\n# Setup file: ") + named + "\n1\tOK\n"));
    }
    RunLog log;
    keepEarlierResults(paths, folder / setup, log);
    for (const std::string& path : paths) EXPECT_FALSE(std::filesystem::exists(path));
    EXPECT_EQ(log.warningCount(), warnings) << named;
  }
  RunLog log;
  const std::vector<std::string> paths{folder.write("y.dat", "# Setup file: /a/one.kdx\n"), folder.write("y.bin", "v"),
                                       folder.write("y_Run.dat", "# Setup file: /a/two.kdx\n")};
  keepEarlierResults(paths, folder / "y.kdx", log);
  EXPECT_THAT(log.warnings(), testing::ElementsAre(AllOf(HasSubstr("/a/one.kdx"), HasSubstr("y.1.bin. ")),
                                                   AllOf(HasSubstr("/a/two.kdx"), HasSubstr("y_Run.1.dat. "))));
}

}  // namespace
}  // namespace mirevo
