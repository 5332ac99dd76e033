#include "platform/processes/side_command.h"

#include <optional>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "processes.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

class SideCommandTest : public testing::Test {
 protected:
  void start(const std::string& command, double mostSeconds = 250.0, double graceSeconds = 250.0) {
    std::string reason;
    ASSERT_TRUE(command_.start({command, folder_.path(), "input", {}, mostSeconds, graceSeconds}, reason)) << reason;
  }
  SideCommandEnd end() {
    std::optional<SideCommandEnd> end;
    EXPECT_TRUE(waitUntil([&] { return (end = command_.take()).has_value(); }));
    return end.value_or(SideCommandEnd{});
  }

  TemporaryFolder folder_;
  SideCommand command_;
};

TEST_F(SideCommandTest, OfItsOutputTheEndAloneIsKept) {
  struct Case {
    const char* command;
    std::size_t size;
    const char* end;
  };
  const Case cases[] = {
      // An output that is kept in a file, in memory or not, ends at the limit.
      {"ulimit -f 64; head -c 30000000 /dev/zero | tr '\\0' x; echo last", 2000, "xxxlast\n"},
      {"cat; echo; echo error >&2", 12, "input\nerror\n"},
      {"echo early; exec >&- 2>&-; sleep 0.1", 6, "early\n"},
      {"(setsid sh -c 'echo $$ >daemon; exec sleep 250' &); while [ ! -s daemon ]; do :; done; echo gone", 5, "gone\n"},
      {"true", 0, ""},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(each.command);
    start(each.command);
    const SideCommandEnd result = end();
    EXPECT_TRUE(result.isGood()) << result.text(0.0);
    EXPECT_EQ(result.output.size(), each.size);
    EXPECT_THAT(result.output, EndsWith(each.end));
  }
}

TEST_F(SideCommandTest, OneThatIgnoresSigtermIsKilledAfterItsGrace) {
  const std::string command = "trap '' TERM; echo $$ >pid; while :; do sleep 0.1; done";
  start(command, 0.1, 0.1);
  EXPECT_EQ(end().kind, SideCommandEnd::Kind::timedOut);
  // The grace of the command may be long: that of the last request counts.
  start(command);
  EXPECT_TRUE(waitUntil([this] { return folder_.exists("pid"); }));
  command_.stop(200.0);
  command_.stop(0.0);
  const SideCommandEnd result = end();
  EXPECT_EQ(result.kind, SideCommandEnd::Kind::stopped);
  EXPECT_LT(result.seconds, 100.0);
}

TEST_F(SideCommandTest, SigtermReachesIt) {
  folder_.write("script", "trap 'sleep 0.2; echo ended; exit 0' TERM; echo $$ >pid; while :; do sleep 0.05; done\n");
  start("sh script; true");  // the shell before the script ends at once
  EXPECT_TRUE(waitUntil([this] { return folder_.exists("pid"); }));
  command_.stop(250.0);
  const SideCommandEnd result = end();
  EXPECT_THAT(result.output, HasSubstr("ended\n"));
  EXPECT_LT(result.seconds, 100.0);
}

TEST_F(SideCommandTest, OneThatIsAbandonedIsEndedAllTheSame) {
  start("echo $$ >pid.part; mv pid.part pid; exec sleep 250");
  EXPECT_TRUE(waitUntil([this] { return folder_.exists("pid"); }));
  const int process = std::stoi(folder_.read("pid"));
  command_.abandon();
  EXPECT_FALSE(command_.isRunning());
  EXPECT_TRUE(waitUntil([process] { return !isRunning(process); }));
  start("true");
  EXPECT_TRUE(end().isGood());
}

}  // namespace
}  // namespace mirevo
