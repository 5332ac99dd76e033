#include "run/command_line.h"

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(CommandLine, SwitchesAreNotCountedAndTheLastOrdinaryArgumentWins) {
  std::vector<std::string> hundredSwitches(100, "//x");
  hundredSwitches.push_back("late.kdx");
  const struct {
    std::vector<std::string> arguments;
    int count;
    std::string_view setup;
    bool viewer;
  } cases[] = {
      {{}, 1, "", false},
      {{"a.kdx"}, 2, "a.kdx", false},
      {{"a.kdx", "b.kdx"}, 3, "b.kdx", false},
      {{"//qmon"}, 1, "", true},
      {{"//other", "//QMon"}, 1, "", true},
      {{"a.kdx", "//QMON"}, 2, "a.kdx", true},
      {{"//qmonitor", "/a.kdx"}, 2, "/a.kdx", false},
      {{"a.kdx   "}, 2, "a.kdx", false},
      {{"a b.kdx"}, 2, "a b.kdx", false},
      {{"a.kdx", "  "}, 3, "", false},
      {{"/"}, 2, "/", false},
      {hundredSwitches, 1, "", false},
  };
  for (const auto& c : cases) {
    const CommandLine commandLine(c.arguments);
    SCOPED_TRACE(c.arguments.empty() ? "no argument" : c.arguments.front());
    EXPECT_EQ(commandLine.countArguments(), c.count);
    EXPECT_EQ(commandLine.setupFileName(), c.setup);
    EXPECT_EQ(commandLine.wantsProgressViewer(), c.viewer);
  }
}

}  // namespace
}  // namespace mirevo
