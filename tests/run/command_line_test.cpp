#include "run/command_line.h"

#include <tuple>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(CommandLine, SwitchesAreNotCountedAndTheLastOrdinaryArgumentWins) {
  std::vector<std::string> hundredSwitches(100, "//x");
  hundredSwitches.push_back("late.kdx");
  const std::tuple<std::vector<std::string>, int, std::string_view, bool> cases[] = {
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
  for (const auto& [arguments, count, setup, viewer] : cases) {
    const CommandLine commandLine(arguments);
    SCOPED_TRACE(arguments.empty() ? "no argument" : arguments.front());
    EXPECT_EQ(commandLine.countArguments(), count);
    EXPECT_EQ(commandLine.setupFileName(), setup);
    EXPECT_EQ(commandLine.wantsProgressViewer(), viewer);
  }
}

}  // namespace
}  // namespace mirevo
