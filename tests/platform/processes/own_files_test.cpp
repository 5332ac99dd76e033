#include "platform/processes/own_files.h"

#include <filesystem>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "matchers.h"
#include "platform/processes/leaving_links.h"
#include "platform/processes/process_folder.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

/// A model's folder `base` beside folders of others, and a process folder.
class OwnFiles : public testing::Test {
 protected:
  OwnFiles() {
    folder_.write("base/run.sh", "");
    folder_.write("base/data/out.csv", "the model's");
    folder_.write("else/out.csv", "another's");
    folder_.write("third/deep.csv", "a third one's");
  }
  void link(const std::string& name, const std::string& target) const {
    std::filesystem::create_symlink(target, folder_ / name);
  }
  /// The refusal of the process folder with this file of its own; "accepted" where there is none.
  std::string make(const std::string& file) const {
    return refusalOf([&] {
      const std::vector<std::string> files{file};
      requireOwnFiles(folder_ / "base", files);
      makeProcessFolder(folder_ / "base", copy_, folder_ / "run_Process");
      makeFilesOwn(copy_, folder_ / "base", files, folder_ / "run_Process");
      EXPECT_FALSE(findLeavingLink(copy_, file)) << file;
    });
  }

  TemporaryFolder folder_;
  std::string copy_ = folder_ / "run_Process1";
};

TEST_F(OwnFiles, EveryLinkOnTheWayToThemIsReplacedAndNoOther) {
  link("base/out", folder_ / "else");
  link("base/first", "second");
  link("base/second", folder_ / "else");
  link("else/deeper", "../third");
  link("base/series.csv", folder_ / "else/out.csv");
  link("base/none.csv", folder_ / "else/none.csv");
  link("base/inside", "data");
  link("base/around", "../base/data");
  link("base/spelt", folder_ / "way/base/data");
  link("way", ".");
  // the file, what it then contains, the links that are still there
  const std::tuple<const char*, const char*, std::vector<const char*>> cases[] = {
      {"/out/out.csv", "another's", {"first", "second", "series.csv"}},
      {"/out/new.csv", "<no file>", {"first"}},
      {"/first/out.csv", "another's", {"first", "out"}},
      {"/out/deeper/deep.csv", "a third one's", {"first"}},
      {"/series.csv", "another's", {"out", "none.csv"}},
      {"/none.csv", "<no file>", {"out", "series.csv"}},
      {"/inside/out.csv", "the model's", {"inside", "out"}},
      {"/around/out.csv", "the model's", {"around", "out"}},
      {"/spelt/out.csv", "the model's", {"spelt", "out"}},
  };
  for (const auto& [file, content, links] : cases) {
    EXPECT_EQ(make(file), "accepted") << file;
    EXPECT_EQ(TemporaryFolder::readFile(copy_ + file), content) << file;
    for (const char* name : links) {
      EXPECT_TRUE(std::filesystem::is_symlink(copy_ + "/" + name)) << file << ", " << name;
    }
    folder_.write(std::string("run_Process1") + file, "written");
  }
  EXPECT_THAT(requireOwnFiles(folder_ / "base", std::vector<std::string>{"/out/a", "/out/b", "/series.csv", "/data/c"}),
              ElementsAre(StartsWith("The link " + (folder_ / "base/out") + " leads to " + (folder_ / "else, "))));
  EXPECT_EQ(folder_.read("else/out.csv"), "another's");
  EXPECT_EQ(folder_.read("third/deep.csv"), "a third one's");
  EXPECT_EQ(folder_.read("base/data/out.csv"), "the model's");
}

TEST_F(OwnFiles, WhatCannotBeCopiedIsRefusedWithFileLinkAndRemedy) {
  folder_.write("large/out.csv", "");
  folder_.write("large/grid.bin", "");
  std::filesystem::resize_file(folder_ / "large/grid.bin", 100'000'000);
  link("base/up", "..");
  link("base/large", folder_ / "large");
  link("base/gone", folder_ / "gone");
  link("base/device.csv", "/dev/null");
  const std::tuple<std::string, std::string, std::string> cases[] = {
      {"/up/else/out.csv", folder_.path(), "it cannot be copied, as " + (folder_ / "base") + " is in it"},
      {"/large/out.csv", folder_ / "large",
       "it is too large to be copied for each of them: more than 100 MB or 10000 files"},
      {"/gone/out.csv", folder_ / "gone", "there is no such folder"},
      {"/device.csv", "/dev/null", "it is neither a file nor a folder"},
  };
  for (const auto& [file, target, why] : cases) {
    EXPECT_EQ(make(file), "Error: The file " + (folder_ / "base") + file +
                              " does not lie in the model's folder\nthe link " + (folder_ / "base") +
                              file.substr(0, file.find('/', 1)) + " leads to " + target +
                              ", which all model runs would share; " + why +
                              "\nReplace the link with a folder or file of the model, or name another file.");
    EXPECT_FALSE(std::filesystem::exists(copy_)) << file;
  }
}

TEST_F(OwnFiles, AFolderThatIsOnlyLargeBehindItsFirstLinkIsRefusedInTheCopy) {
  link("base/out", folder_ / "else");
  link("else/deeper", folder_.path());
  EXPECT_THAT(make("/out/deeper/out.csv"), HasSubstr("the link " + copy_ + "/out/deeper leads to " + folder_.path()));
}

}  // namespace
}  // namespace mirevo
