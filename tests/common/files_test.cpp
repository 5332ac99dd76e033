#include "common/files.h"

#include <filesystem>
#include <fstream>
#include <sys/stat.h>
#include <tuple>
#include <unistd.h>

#include <gtest/gtest.h>

#include "common/file_copy.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

class Files : public testing::Test {
 protected:
  unsigned modeOf(const char* name) const {
    struct stat status {};
    EXPECT_EQ(::stat((folder_ / name).c_str(), &status), 0);
    return status.st_mode & 07777U;
  }

  TemporaryFolder folder_;
  std::string reason_;
};

TEST_F(Files, AreReplacedByNewOnesWithTheModeAskedForOrTheirOwn) {
  const std::tuple<unsigned, bool> cases[] = {{0754, false}, {0640, true}, {0666, true}};
  for (const auto& [mode, isOwn] : cases) {
    const std::string path = folder_.write("a.txt", "an old and longer content", isOwn ? mode : 0600);
    std::filesystem::create_hard_link(path, folder_ / "b.txt");
    const bool isReplaced =
        isOwn ? replaceFile(path, "new", reason_) : writeByUnlinkAndCreate(path, "new", mode, reason_);
    ASSERT_TRUE(isReplaced) << reason_;
    EXPECT_EQ(readTextFile(path, reason_), "new");
    EXPECT_EQ(folder_.read("b.txt"), "an old and longer content") << "the old file itself was written";
    EXPECT_EQ(modeOf("a.txt"), mode);
    std::filesystem::remove(folder_ / "b.txt");
  }
  const mode_t mask = ::umask(027);
  EXPECT_TRUE(replaceFile(folder_ / "first.txt", "x", reason_)) << reason_;
  ::umask(mask);
  EXPECT_EQ(modeOf("first.txt"), 0640U);
}

TEST_F(Files, WhatCannotBeReplacedStaysAndNothingIsLeftBeside) {
  folder_.write("folder/old.txt", "old");
  EXPECT_FALSE(replaceFile(folder_ / "folder", "new", reason_));
  EXPECT_EQ(reason_, "Is a directory");
  EXPECT_EQ(folder_.read("folder/old.txt"), "old");
  EXPECT_FALSE(folder_.exists("folder.tmp"));
  folder_.write("a.txt", "old");
  folder_.write("a.txt.tmp/in the way", "");
  EXPECT_FALSE(replaceFile(folder_ / "a.txt", "new", reason_));
  EXPECT_EQ(reason_, "Is a directory");
  EXPECT_EQ(folder_.read("a.txt"), "old");
}

TEST_F(Files, AreReplacedAndComparedAPartAtATime) {
  const auto parts = [](std::vector<std::string_view> texts) {
    return [texts, i = std::size_t{0}]() mutable { return i < texts.size() ? texts[i++] : std::string_view(); };
  };
  const std::string path = folder_ / "parts.txt";
  EXPECT_FALSE(hasContent(path, parts({"one"})));
  EXPECT_TRUE(replaceFile(path, parts({"one ", "two ", "three"}), reason_)) << reason_;
  EXPECT_EQ(folder_.read("parts.txt"), "one two three");
  EXPECT_TRUE(hasContent(path, parts({"one two", " three"})));
  for (const char* other : {" thre", " threE", " three4"}) EXPECT_FALSE(hasContent(path, parts({"one two", other})));
  EXPECT_TRUE(replaceFile(path, parts({}), reason_)) << reason_;
  EXPECT_EQ(folder_.read("parts.txt"), "");
}

TEST_F(Files, HolesStayHolesInACopy) {
  constexpr std::uintmax_t kSize = 40'000'000'000;
  for (const bool hasData : {true, false}) {
    folder_.write("sparse", hasData ? "begin" : "");
    std::filesystem::resize_file(folder_ / "sparse", kSize);
    if (hasData) std::fstream(folder_ / "sparse").seekp(kSize / 2) << "middle";
    std::string reason;
    ASSERT_TRUE(copyWhole(folder_ / "sparse", folder_ / "copy", reason)) << reason;
    struct stat status {};
    ASSERT_EQ(::stat((folder_ / "copy").c_str(), &status), 0);
    EXPECT_EQ(status.st_size, kSize);
    EXPECT_LT(status.st_blocks, 1000);
    std::ifstream copy(folder_ / "copy");
    std::string begin(5, ' ');
    std::string middle(7, ' ');
    copy.read(begin.data(), 5).seekg(kSize / 2).read(middle.data(), 7);
    EXPECT_EQ(begin + middle, (hasData ? "beginmiddle" : std::string(11, '\0')) + std::string(1, '\0'));
  }
}

TEST_F(Files, SaysTheSystemsReason) {
  EXPECT_FALSE(readTextFile(folder_ / "none.txt", reason_).has_value());
  EXPECT_EQ(reason_, "No such file or directory");
  EXPECT_FALSE(readTextFile(folder_.path(), reason_).has_value());
  EXPECT_EQ(reason_, "Is a directory");
  ASSERT_EQ(::mkfifo((folder_ / "pipe").c_str(), 0600), 0);
  for (const std::string& endless : {folder_ / "pipe", std::string("/dev/zero")}) {
    EXPECT_FALSE(readTextFile(endless, reason_).has_value());
    EXPECT_EQ(reason_, "Not a regular file");
    EXPECT_EQ(faultOfFile(endless), "Not a regular file");
  }
  EXPECT_EQ(faultOfFile(folder_ / "none.txt"), "No such file or directory");
  EXPECT_FALSE(writeByUnlinkAndCreate(folder_ / "none/a.txt", "x", 0644, reason_));
  EXPECT_EQ(reason_, "No such file or directory");
}

TEST_F(Files, ReadsFilesWhoseSizeTheSystemDoesNotSay) {
  const auto content = readTextFile("/proc/self/status", reason_);
  ASSERT_TRUE(content.has_value()) << reason_;
  EXPECT_NE(content->find("Pid:"), std::string::npos);
}

}  // namespace
}  // namespace mirevo
