#include "common/files.h"

#include <filesystem>
#include <fstream>
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

class Files : public testing::Test {
 protected:
  Files() : folder_(std::filesystem::temp_directory_path() / ("mirevo_files_" + std::to_string(::getpid()))) {
    std::filesystem::create_directories(folder_);
  }
  ~Files() override { std::filesystem::remove_all(folder_); }
  std::string path(const char* name) const { return (folder_ / name).string(); }

  std::filesystem::path folder_;
  std::string reason_;
};

TEST_F(Files, ReplacesAFileByANewOneWithTheModeAskedFor) {
  std::ofstream(path("a.txt")) << "an old and longer content";
  ASSERT_EQ(::link(path("a.txt").c_str(), path("b.txt").c_str()), 0);
  ASSERT_TRUE(writeByUnlinkAndCreate(path("a.txt"), "new", 0754, reason_)) << reason_;
  EXPECT_EQ(readTextFile(path("a.txt"), reason_), "new");
  EXPECT_EQ(readTextFile(path("b.txt"), reason_), "an old and longer content") << "the old file itself was written";
  struct stat status {};
  ASSERT_EQ(::stat(path("a.txt").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0754U);
}

TEST_F(Files, SaysTheSystemsReason) {
  EXPECT_FALSE(readTextFile(path("none.txt"), reason_).has_value());
  EXPECT_EQ(reason_, "No such file or directory");
  EXPECT_FALSE(readTextFile(folder_.string(), reason_).has_value());
  EXPECT_EQ(reason_, "Is a directory");
  ASSERT_EQ(::mkfifo(path("pipe").c_str(), 0600), 0);
  for (const std::string& endless : {path("pipe"), std::string("/dev/zero")}) {
    EXPECT_FALSE(readTextFile(endless, reason_).has_value());
    EXPECT_EQ(reason_, "Not a regular file");
    EXPECT_EQ(faultOfFile(endless), "Not a regular file");
  }
  EXPECT_EQ(faultOfFile(path("none.txt")), "No such file or directory");
  EXPECT_FALSE(writeByUnlinkAndCreate(path("none/a.txt"), "x", 0644, reason_));
  EXPECT_EQ(reason_, "No such file or directory");
}

TEST_F(Files, ReadsFilesWhoseSizeTheSystemDoesNotSay) {
  const auto content = readTextFile("/proc/self/status", reason_);
  ASSERT_TRUE(content.has_value()) << reason_;
  EXPECT_NE(content->find("Pid:"), std::string::npos);
}

}  // namespace
}  // namespace mirevo
