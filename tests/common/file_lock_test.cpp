#include "common/file_lock.h"

#include <filesystem>
#include <sys/wait.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(FileLock, KeepsOthersFromItsNumbersAndLeavesNoFile) {
  const TemporaryFolder folder;
  const std::string path = folder / "a._lock_";
  FileLock first;
  FileLock neighbour;
  ASSERT_TRUE(first.take(path, {1, 3}, 0.0));
  ASSERT_TRUE(neighbour.take(path, {4, 1}, 0.0));
  FileLock second;
  for (const FileLock::Range range : {FileLock::Range{1, 3}, {0, 2}, {3, 1}, {0, 9}}) {
    EXPECT_FALSE(second.take(path, range, 0.0)) << range.first;
    EXPECT_THAT(second.holder(), ::testing::StartsWith(" (process "));
  }
  EXPECT_TRUE(FileLock::isHeld(path));
  first.release();
  EXPECT_TRUE(folder.exists("a._lock_")) << "the neighbour's lock is on it";
  EXPECT_TRUE(second.take(path, {1, 1}, 0.0));
  second.release();
  neighbour.release();
  EXPECT_FALSE(folder.exists("a._lock_"));
  EXPECT_FALSE(FileLock::isHeld(path));
}

/// What a killed program has left, and a file that was removed and made again while the lock was held.
TEST(FileLock, AFileAloneLocksNothingAndThatOfAnotherIsNotRemoved) {
  const TemporaryFolder folder;
  const std::string path = folder.write("a._lock_", "process 1 on node\n");
  EXPECT_FALSE(FileLock::isHeld(path));
  FileLock first;
  ASSERT_TRUE(first.take(path, {}, 0.0));
  std::filesystem::remove(path);
  FileLock second;
  ASSERT_TRUE(second.take(path, {}, 0.0));
  first.release();
  EXPECT_TRUE(FileLock::isHeld(path));
}

TEST(FileLock, WhereNoFileCanBeLockedASocketOfTheMachineTakesItsPart) {
  const TemporaryFolder folder;
  const std::string path = folder / "a._lock_";
  std::filesystem::create_directory(path);  // cannot be opened to write to, whoever tries
  FileLock first;
  ASSERT_TRUE(first.take(path, {}, 0.0));
  EXPECT_THAT(first.warning(), ::testing::HasSubstr(path + " cannot be locked: Is a directory. "));
  FileLock second;
  EXPECT_FALSE(second.take(path, {}, 0.0));
  first.release();
  EXPECT_TRUE(second.take(path, {}, 0.0));
}

}  // namespace
}  // namespace mirevo
