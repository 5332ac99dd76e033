#include "platform/processes/shared_targets.h"

#include <filesystem>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "matchers.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

namespace fs = std::filesystem;

TEST(SharedTargets, WhatChangesBehindALinkOutOfTheFolderIsToldOnce) {
  // What is written to, the links that tell of it.
  const std::tuple<const char*, std::vector<std::string>> cases[] = {
      {"work/in/old.txt", {"work"}}, {"work/new.txt", {"work"}}, {"input.txt", {"input.txt"}},
      {"results/row.dat", {}},       {"copy/own/x.txt", {}},     {"unlinked.txt", {}},
  };
  for (const auto& [written, links] : cases) {
    const TemporaryFolder folder;
    for (const char* name : {"work/in/old.txt", "input.txt", "results/row.dat", "copy/own/x.txt"}) {
      folder.write(name, "before");
    }
    for (const char* name : {"work", "input.txt", "results"}) {
      fs::create_symlink(folder / name, folder / "copy/" + name);
    }
    fs::create_symlink("own", folder / "copy/inside");
    fs::create_symlink(folder.path(), folder / "copy/above");
    const std::vector<std::string> own{folder / "results"};
    SharedTargets targets(folder / "copy", own);
    EXPECT_THAT(SharedTargets(targets).takeChanged(), IsEmpty());
    folder.write(written, "what a model writes");
    std::vector<std::string> told = targets.takeChanged();
    ASSERT_EQ(told.size(), links.size()) << written;
    for (const std::string& link : links) {
      EXPECT_THAT(told.front(), StartsWith((folder / link) + " was changed during the first model run. The link " +
                                           (folder / "copy/" + link) + " leads to it"));
    }
    EXPECT_THAT(targets.takeChanged(), IsEmpty());
  }
}

TEST(SharedTargets, AResultWithANameOutsideTheFolderIsToldOnce) {
  const TemporaryFolder folder;
  folder.write("copy/flow.csv", "");
  folder.write("shared.csv", "");
  const std::vector<std::string> files{"/flow.csv", "/peak.csv"};
  SharedTargets targets(folder / "copy", {});
  fs::create_hard_link(folder / "copy/flow.csv", folder / "copy/last.csv");
  EXPECT_THAT(targets.takeHardLinked(folder / "copy", files), IsEmpty());
  fs::create_hard_link(folder / "shared.csv", folder / "copy/peak.csv");
  EXPECT_THAT(SharedTargets().takeHardLinked(folder / "copy", files), IsEmpty()) << "of one run at a time";
  EXPECT_THAT(targets.takeHardLinked(folder / "copy", files),
              testing::ElementsAre(StartsWith((folder / "copy/peak.csv") + " has another name outside")));
  EXPECT_THAT(targets.takeHardLinked(folder / "copy", files), IsEmpty());
}

}  // namespace
}  // namespace mirevo
