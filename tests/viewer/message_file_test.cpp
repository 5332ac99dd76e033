#include "viewer/message_file.h"

#include <gtest/gtest.h>

#include "temporary_folder.h"

namespace mirevo {
namespace {

class MessageFileTest : public ::testing::Test {
 protected:
  void readAll() {
    while (file_.readPiece(records_)) {
    }
  }
  const ProgressState& state() const { return records_.state(); }

  TemporaryFolder folder_;
  MessageFile file_{(folder_ / "basin._spi_")};
  ProgressRecords records_;
};

std::string evaluations(int count) {
  std::string text;
  for (int i = 0; i < count; ++i) text += "MESSAGEvaluation of parameter set No. 1 completed: OK\n";
  return text;
}

TEST_F(MessageFileTest, AFileThatComesGrowsAndGoesIsFollowed) {
  readAll();
  EXPECT_FALSE(state().hasRecords);
  folder_.write("basin._spi_", "MESSAGTitle: A\nMESSAGTitle: B");
  readAll();
  EXPECT_EQ(state().title, "A");
  folder_.write("basin._spi_", "MESSAGTitle: A\nMESSAGTitle: BC\n" + evaluations(30000));
  readAll();
  EXPECT_EQ(state().title, "BC");
  EXPECT_EQ(state().done, 30000);
  std::filesystem::remove((folder_ / "basin._spi_"));
  readAll();
  EXPECT_EQ(state().done, 30000);
}

TEST_F(MessageFileTest, AnotherRunIsNoticedWhetherItsFileIsShorterOrHasOutgrownTheOld) {
  for (const int count : {1, 5, 50}) {
    folder_.write("basin._spi_", "MESSAGRun started 2026-01-01 00:00:00 +0000 on a, process 1\n" + evaluations(5));
    readAll();
    EXPECT_EQ(state().origin.process, 1);
    EXPECT_EQ(state().done, 5);
    folder_.write("basin._spi_", "MESSAGRun started 2026-01-01 00:00:00 +0000 on a, process 2\n" + evaluations(count));
    readAll();
    EXPECT_EQ(state().origin.process, 2);
    EXPECT_EQ(state().done, count);
  }
}

TEST_F(MessageFileTest, AFolderInItsPlaceIsNoFile) {
  std::filesystem::create_directories((folder_ / "basin._spi_"));
  readAll();
  EXPECT_FALSE(state().hasRecords);
}

}  // namespace
}  // namespace mirevo
