#include "platform/processes/process_folder.h"

#include <csignal>
#include <fcntl.h>
#include <functional>
#include <iterator>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <sys/resource.h>
#include <sys/stat.h>
#include <system_error>
#include <tuple>
#include <unistd.h>
#include <vector>

#include <fmt/core.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/fatal_error.h"
#include "common/run_files.h"
#include "platform/processes/folder_makers.h"
#include "platform/processes/folder_room.h"
#include "platform/processes/folder_tree.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

namespace fs = std::filesystem;

struct stat statusOf(const std::string& path) {
  struct stat status {};
  EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
  return status;
}

TEST(ProcessFolder, CopiesFilesFoldersModesAndTimes) {
  const TemporaryFolder folder;
  folder.write("base/run.sh", "#!/bin/sh\n", 0755);
  folder.write("base/in/read_only.txt", "1", 0444);
  folder.write("base/in/deep/er/empty", "");
  folder.write("base/large.bin", std::string(3'000'000, 'z') + "end");
  fs::create_directory(folder / "base/none");
  fs::permissions(folder / "base/in/deep", fs::perms::owner_read | fs::perms::owner_exec);
  const timespec times[2] = {{1'000'000'000, 0}, {1'000'000'007, 5}};
  utimensat(AT_FDCWD, (folder / "base/in/read_only.txt").c_str(), times, 0);

  makeProcessFolder(folder / "base", folder / "run_Process1", folder / "run_Process");

  EXPECT_EQ(statusOf(folder / "run_Process1/run.sh").st_mode & 07777, 0755u);
  EXPECT_EQ(statusOf(folder / "run_Process1/in/read_only.txt").st_mode & 07777, 0444u);
  EXPECT_EQ(statusOf(folder / "run_Process1/in/read_only.txt").st_mtim.tv_sec, 1'000'000'007);
  EXPECT_EQ(folder.read("run_Process1/large.bin"), folder.read("base/large.bin"));
  EXPECT_TRUE(folder.exists("run_Process1/in/deep/er/empty"));
  EXPECT_TRUE(folder.exists("run_Process1/none"));
}

TEST(ProcessFolder, ReplacesWhatWasThere) {
  const TemporaryFolder folder;
  folder.write("base/run.sh", "new");
  folder.write("run_Process1/run.sh", "old");
  folder.write("run_Process1/" + std::string(run_files::kBatchLog), "old");
  folder.write("run_Process1/left/over.txt", "old");
  fs::permissions(folder / "run_Process1/left", fs::perms::owner_read | fs::perms::owner_exec);
  folder.write("elsewhere/kept.txt", "kept");
  fs::create_directory_symlink(folder / "elsewhere", folder / "run_Process1/link");

  makeProcessFolder(folder / "base", folder / "run_Process1", folder / "run_Process");

  EXPECT_EQ(folder.read("run_Process1/run.sh"), "new");
  EXPECT_FALSE(folder.exists("run_Process1/left"));
  EXPECT_TRUE(folder.exists("run_Process1/" + std::string(run_files::kFolderMark)));
  EXPECT_EQ(folder.read("elsewhere/kept.txt"), "kept");
}

TEST(ProcessFolder, LinksLeadWhereTheyShould) {
  const TemporaryFolder folder;
  folder.write("setup/model/base/data/x.txt", "x");
  folder.write("setup/model/shared/y.txt", "y");
  const std::string base = folder / "setup/model/base";
  fs::create_symlink("data/x.txt", base + "/inside_relative");
  fs::create_symlink(base + "/data/x.txt", base + "/inside_absolute");
  fs::create_symlink("../shared/y.txt", base + "/outside_relative");
  fs::create_symlink(folder / "setup/model/shared/y.txt", base + "/outside_absolute");
  fs::create_symlink("nowhere", base + "/dangling");
  fs::create_symlink(".", base + "/data/loop");
  fs::create_symlink("../../base/data", base + "/data/around");
  fs::create_directory_symlink(base, folder / "way");
  fs::create_symlink(folder / "way/data", base + "/spelt_otherwise");

  const std::string copy = folder / "setup/run_Process1";
  makeProcessFolder(base, copy, folder / "setup/run_Process");

  const std::tuple<const char*, std::string> cases[] = {{"/inside_relative", "data/x.txt"},
                                                        {"/inside_absolute", copy + "/data/x.txt"},
                                                        {"/outside_relative", folder / "setup/model/shared/y.txt"},
                                                        {"/outside_absolute", folder / "setup/model/shared/y.txt"},
                                                        {"/dangling", "nowhere"},
                                                        {"/data/loop", "."},
                                                        {"/data/around", copy + "/data"},
                                                        {"/spelt_otherwise", copy + "/data"}};
  for (const auto& [name, target] : cases) EXPECT_EQ(fs::read_symlink(copy + name).string(), target) << name;
}

TEST(ProcessFolder, WhatWasCopiedBeforeAFailureIsRemoved) {
  const TemporaryFolder folder;
  folder.write("base/a.txt", "a");
  fs::create_symlink("a.txt", folder / "base/link");
  folder.write("base/z.bin", std::string(100'000, 'z'));
  const auto before = std::signal(SIGXFSZ, SIG_IGN);
  rlimit limit{};
  ::getrlimit(RLIMIT_FSIZE, &limit);
  const rlimit small{50'000, limit.rlim_max};
  ::setrlimit(RLIMIT_FSIZE, &small);
  const std::string refusal =
      refusalOf([&] { makeProcessFolder(folder / "base", folder / "run_Process1", folder / "run_Process"); });
  ::setrlimit(RLIMIT_FSIZE, &limit);
  std::signal(SIGXFSZ, before);
  EXPECT_EQ(refusal, "Unable to write " + (folder / "run_Process1/z.bin") + ": File too large");
  EXPECT_FALSE(folder.exists("run_Process1"));
}

TEST(ProcessFolder, ACopyLeavesRoomForTheModelRuns) {
  const TemporaryFolder folder;
  folder.write("base/in/run.sh", "");
  std::error_code failed;
  EXPECT_EQ(extentOf(folder / "base", failed).entries, 3U);
  EXPECT_EQ(whyNoRoom(folder / "base", folder.path(), 1), "");
  EXPECT_THAT(whyNoRoom(folder / "base", folder.path(), 2'000'000'000), testing::StartsWith("it needs 0.0 MB, and "));
}

// A setup that lies in the model's own folder has what its runs make in what it copies.
TEST(ProcessFolder, NeverCopiesWhatRunsMake) {
  const TemporaryFolder folder;
  for (const char* setup : {"cal.kdx", "cal.1.kdx", "in/deep/cal.KDX"}) folder.write(setup, "");
  const std::map<std::string, std::string> made{
      {"cal_Process2/big.dat", ""},
      {"other_Process1/" + std::string(run_files::kBatchLog), "of another setup's"},
      {"cal.log", "Warning: early\nMirevo 1.2, started\n"},
      {"cal.2.dat", "# Title\n# Mirevo 1.2\n"},
      {"cal_Failed17/" + std::string(run_files::kFolderMark), ""},
      {"cal_Band_1.csv", "# Band of 90 %\n"},
      {"cal_Simulated.bin", "1v0veriM"},
      {"cal_Run.dat.tmp", "# Ti"}};
  // Empty files, as a full disk leaves them, and folders of numbers.
  std::istringstream madeByName(
      "in/deep/cal_Saved/1/out.csv cal_Saved/2/out.csv cal_Saved.12/3/out.csv cal_Optimisation.dat "
      "cal_Optimisation.3.dat cal.1_Sensitivity.dat cal_Band_2.csv cal_Band_2.1.csv cal_Report.html cal_Series.dat "
      "cal_Series.dat.tmp cal_Report.html.4711.tmp calSimErr.dat.tmp cal._spi_ calSimErr.1.dat");
  // Folders without a batch log or a setup of their name, names that runs do not give, files by their content.
  std::istringstream ours(
      "run.sh my_Process1/data.txt cal_Processes/data.txt cal_Saved.old/data.txt my_Saved/data.txt cal_Failed/run.sh "
      "cal_Saved.3/data.txt cal_Failed18/run.sh cal_Band_3.csv cal_Simulated.1.bin cal_Report.1.html calSimErr.2.dat "
      "cal_Optimisation.old.dat cal.dat.tmp cal.dat cal.1.log cal.txt in/calSimErr.dat");
  const std::vector<std::string> left(std::istream_iterator<std::string>(madeByName), {});
  const std::vector<std::string> copied(std::istream_iterator<std::string>(ours), {});
  for (const auto& [name, content] : made) folder.write(name, content);
  for (const std::string& name : left) folder.write(name, "");
  for (const std::string& name : copied) folder.write(name, name == "cal.txt" ? "Mirevo " : "initial storages\n");
  for (int round = 0; round < 2; ++round)
    makeProcessFolder(folder.path(), folder / "cal_Process1", folder / "cal_Process");
  for (const auto& [name, content] : made) EXPECT_FALSE(folder.exists("cal_Process1/" + name)) << name;
  for (const std::string& name : left) EXPECT_FALSE(folder.exists("cal_Process1/" + name)) << name;
  for (const std::string& name : copied) EXPECT_TRUE(folder.exists("cal_Process1/" + name)) << name;
  EXPECT_FALSE(folder.exists("cal_Process1/cal_Process1"));
  EXPECT_FALSE(folder.exists("cal_Process1/other_Process1"));
}

TEST(ProcessFolder, KnowsItsOwnBehindALink) {
  const TemporaryFolder folder;
  folder.write("base/scratch/cal_Process2/run.sh", "");
  fs::create_directory_symlink(folder / "base/scratch", folder / "link");
  makeProcessFolder(folder / "base", folder / "link/cal_Process1", folder / "link/cal_Process");
  EXPECT_TRUE(folder.exists("link/cal_Process1/scratch"));
  EXPECT_TRUE(fs::is_empty(folder / "link/cal_Process1/scratch"));
}

/// Makes the process folders 1 to `count` of a run.
FoldersMade makeFolders(
    const TemporaryFolder& folder, int count, const FolderMaking& making = {},
    const std::function<void(const FoldersMade&)>& look = [](const FoldersMade&) {}) {
  std::vector<std::string> targets;
  for (int i = 1; i <= count; ++i) targets.push_back(folder / ("run_Process" + std::to_string(i)));
  return makeProcessFolders(listFolder(folder / "base", folder / "run_Process"), targets, making, look);
}

void setModified(const std::string& path, const struct stat& status) {
  const timespec times[2] = {status.st_atim, status.st_mtim};
  ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
}

// Whatever a model, the user or a crash did between two runs, the folder is then what a new copy would be.
TEST(ProcessFolder, KeepsFromAnEarlierRunOnlyWhatACopyWouldBe) {
  struct Case {
    const char* what;
    std::function<void(const TemporaryFolder&)> happens;
    bool isKept;
  };
  const std::string copy = "run_Process1/in/a.txt";
  const Case cases[] = {
      {"nothing", [](const TemporaryFolder&) {}, true},
      {"a model writes as much as was there, and sets the time back",
       [&](const TemporaryFolder& folder) {
         const struct stat before = statusOf(folder / copy);
         folder.write(copy, "abd");
         setModified(folder / copy, before);
       },
       false},
      {"the same content is written again", [&](const TemporaryFolder& folder) { folder.write(copy, "abc"); }, false},
      {"the original is changed, with its time set back",
       [&](const TemporaryFolder& folder) {
         const struct stat before = statusOf(folder / "base/in/a.txt");
         folder.write("base/in/a.txt", "xyz");
         setModified(folder / "base/in/a.txt", before);
       },
       false},
      {"another file takes its name",
       [&](const TemporaryFolder& folder) {
         folder.write("run_Process1/b.txt", "abd");
         fs::rename(folder / "run_Process1/b.txt", folder / copy);
       },
       false},
      {"its mode is changed", [&](const TemporaryFolder& folder) { fs::permissions(folder / copy, fs::perms(0600)); },
       false},
      {"it gets a second name outside",
       [&](const TemporaryFolder& folder) { fs::create_hard_link(folder / copy, folder / "outside.txt"); }, false},
      {"it becomes a link to the original",
       [&](const TemporaryFolder& folder) {
         fs::remove(folder / copy);
         fs::create_symlink(folder / "base/in/a.txt", folder / copy);
       },
       false},
      {"its folder becomes a link",
       [&](const TemporaryFolder& folder) {
         fs::rename(folder / "run_Process1/in", folder / "moved");
         fs::create_directory_symlink(folder / "moved", folder / "run_Process1/in");
       },
       false},
      {"a model leaves files and folders",
       [](const TemporaryFolder& folder) {
         folder.write("run_Process1/in/left/over.txt", "old");
         folder.write("run_Process1/empty", "old");
       },
       true},
      {"the record is cut off",
       [](const TemporaryFolder& folder) {
         const std::string mark = folder / ("run_Process1/" + std::string(run_files::kFolderMark));
         fs::resize_file(mark, fs::file_size(mark) - 9);
       },
       false},
      {"the record is damaged",
       [](const TemporaryFolder& folder) {
         const std::string mark = "run_Process1/" + std::string(run_files::kFolderMark);
         std::string text = folder.read(mark);
         text[text.size() / 2] ^= 1;
         folder.write(mark, text);
       },
       false},
  };
  for (const Case& tested : cases) {
    SCOPED_TRACE(tested.what);
    const TemporaryFolder folder;
    folder.write("base/in/a.txt", "abc", 0644);
    folder.write("base/own.txt", "1");
    fs::create_symlink("in/a.txt", folder / "base/link");
    const std::vector<std::string> own{"/own.txt"};
    makeFolders(folder, 1, {own});
    const ino_t before = statusOf(folder / copy).st_ino;
    // Keeps the number of the file's inode from being given to a new one.
    const int held = ::open((folder / copy).c_str(), O_RDONLY | O_CLOEXEC);
    tested.happens(folder);

    const FoldersMade made = makeFolders(folder, 1, {own});

    ::close(held);
    EXPECT_EQ(statusOf(folder / copy).st_ino == before, tested.isKept);
    EXPECT_EQ(made.keptFiles, tested.isKept ? 1U : 0U);
    EXPECT_EQ(folder.read(copy), folder.read("base/in/a.txt"));
    EXPECT_EQ(statusOf(folder / copy).st_mode, statusOf(folder / "base/in/a.txt").st_mode);
    EXPECT_EQ(statusOf(folder / copy).st_mtim.tv_nsec, statusOf(folder / "base/in/a.txt").st_mtim.tv_nsec);
    EXPECT_EQ(folder.read("run_Process1/own.txt"), "1");
    EXPECT_EQ(fs::read_symlink(folder / "run_Process1/link"), "in/a.txt");
    std::set<std::string> names;
    for (const auto& entry : fs::recursive_directory_iterator(folder / "run_Process1")) {
      names.insert(entry.path().filename());
    }
    EXPECT_EQ(names, (std::set<std::string>{run_files::kFolderMark, "in", "a.txt", "own.txt", "link"}));
  }
}

TEST(ProcessFolder, SeveralAreMadeSideBySide) {
  const TemporaryFolder folder;
  for (int i = 0; i < 300; ++i) folder.write(fmt::format("base/in{}/f{}.txt", i % 7, i), std::to_string(i));
  FoldersMade made = makeFolders(folder, 5);
  EXPECT_EQ(made.files, 1500U);
  EXPECT_EQ(made.keptFiles, 0U);
  made = makeFolders(folder, 5);
  EXPECT_EQ(made.keptFiles, 1500U);
  EXPECT_EQ(made.share, 1.0);
  EXPECT_EQ(folder.read("run_Process5/in5/f299.txt"), "299");
}

TEST(ProcessFolder, AFailureSideBySideIsToldAndLeavesNoPart) {
  const TemporaryFolder folder;
  for (int i = 0; i < 400; ++i) folder.write(fmt::format("base/f{}.txt", i), "1");
  folder.write("base/z.bin", std::string(100'000, 'z'));
  const auto before = std::signal(SIGXFSZ, SIG_IGN);
  rlimit limit{};
  ::getrlimit(RLIMIT_FSIZE, &limit);
  const rlimit small{50'000, limit.rlim_max};
  ::setrlimit(RLIMIT_FSIZE, &small);
  const std::string refusal = refusalOf([&] { makeFolders(folder, 3); });
  ::setrlimit(RLIMIT_FSIZE, &limit);
  std::signal(SIGXFSZ, before);
  EXPECT_THAT(refusal, testing::MatchesRegex("Unable to write .*run_Process./z.bin: File too large"));
  for (const char* made : {"run_Process1", "run_Process2", "run_Process3"}) EXPECT_FALSE(folder.exists(made)) << made;
}

TEST(ProcessFolder, WhatACancellationLeavesIsMadeAnew) {
  const TemporaryFolder folder;
  folder.write("base/a.txt", "a");
  for (int i = 0; i < 800; ++i) folder.write(fmt::format("base/in/f{}.txt", i), "1");
  const auto cancel = [](const FoldersMade&) { throw RunCancelled(); };
  bool isCancelled = false;
  for (int i = 0; i < 20 && !isCancelled; ++i) {
    try {
      makeFolders(folder, 8, {}, cancel);
      for (int slot = 1; slot <= 8; ++slot) removeTree(folder / ("run_Process" + std::to_string(slot)));
    } catch (const RunCancelled&) {
      isCancelled = true;
    }
  }
  ASSERT_TRUE(isCancelled);
  const FoldersMade made = makeFolders(folder, 8);
  EXPECT_EQ(made.files, 8U * 801U);
  EXPECT_EQ(folder.read("run_Process8/in/f799.txt"), "1");
}

TEST(ProcessFolder, LinksReadOnlyFilesOnRequest) {
  const TemporaryFolder folder;
  folder.write("base/forcing.bin", "large", 0444);
  folder.write("base/own.txt", "1", 0444);
  folder.write("base/state.txt", "1", 0644);
  const std::vector<std::string> own{"/own.txt"};
  const auto isLinked = [&folder](const std::string& name) {
    return fs::equivalent(folder / ("base/" + name), folder / ("run_Process1/" + name));
  };
  for (const bool links : {true, true, false}) {  // what one run linked the next one keeps, or replaces
    makeFolders(folder, 1, {own, links});
    EXPECT_EQ(isLinked("forcing.bin"), links);
    EXPECT_FALSE(isLinked("own.txt"));
    EXPECT_FALSE(isLinked("state.txt"));
    EXPECT_EQ(folder.read("run_Process1/forcing.bin"), "large");
  }
  makeProcessFolder(folder / "run_Process1", folder / "run_Failed1", folder / "run_Process");
  EXPECT_FALSE(fs::equivalent(folder / "base/forcing.bin", folder / "run_Failed1/forcing.bin"));
}

TEST(ProcessFolder, KeepsOneCopyOfReadOnlyFilesOnAnotherDisk) {
  const TemporaryFolder folder;
  folder.write("base/forcing.bin", "large", 0444);
  std::string other = "/dev/shm/mirevo_test_XXXXXX";
  if (::mkdtemp(other.data()) == nullptr || statusOf(other).st_dev == statusOf(folder.path()).st_dev) {
    fs::remove(other);
    GTEST_SKIP() << "no other disk";
  }
  const std::vector<std::string> targets{other + "/run_Process1"};
  std::vector<std::uint64_t> kept;
  for (int run = 0; run < 3; ++run) {
    kept.push_back(makeProcessFolders(listFolder(folder / "base", folder / "run_Process"), targets, {{}, true},
                                      [](const FoldersMade&) {})
                       .keptFiles);
    if (run == 1) folder.write("base/forcing.bin", "other", 0644);
    if (run == 1) fs::permissions(folder / "base/forcing.bin", fs::perms::owner_read);
  }
  EXPECT_THAT(kept, ElementsAre(0U, 1U, 0U));
  EXPECT_EQ(TemporaryFolder::readFile(targets[0] + "/forcing.bin"), "other");
  fs::remove_all(other);
}

}  // namespace
}  // namespace mirevo
