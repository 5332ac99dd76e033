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

TEST(CommandLine, TheLastQuestionCountsUnlessTheLastArgumentIsAFile) {
  using Arguments = std::vector<std::string>;
  const std::tuple<Arguments, std::string_view, std::string_view, const char*> cases[] = {
      {{"--help"}, "--help", "", ""},
      {{"--help", "a.kdx"}, "", "", ""},
      {{"--help", "b.kdx"}, "--help", "", "Ignored: \"b.kdx\"; --help is answered, and nothing is run"},
      {{"x", "--keyword", "//y"},
       "--keyword",
       "",
       "Ignored: \"x\", \"//y\"; --keyword is answered, and nothing is run"},
      {{"-h"}, "--help", "", ""},
      {{"--keyword", "Title"}, "--keyword", "Title", ""},
      {{"--keyword", "--version"},
       "--version",
       "",
       "Ignored: \"--keyword\"; --version is answered, and nothing is run"},
      {{"--keyword", "a.kdx"}, "", "", ""},
      {{"--help", " "}, "", "", ""},
      {{"help"}, "", "", ""},
      {{}, "", "", ""},
  };
  for (const auto& [arguments, name, keyword, ignored] : cases) {
    const auto question = CommandLine(arguments).question([](const std::string& file) { return file == "a.kdx"; });
    SCOPED_TRACE(arguments.empty() ? "no argument" : arguments.back());
    ASSERT_EQ(question.has_value(), !name.empty());
    if (!question) continue;
    EXPECT_EQ(question->name, name);
    EXPECT_EQ(question->keyword, keyword);
    EXPECT_EQ(question->ignored, ignored[0] == '\0' ? Arguments{} : Arguments{ignored});
  }
}

TEST(CommandLine, CommandsAreGivenAnywhereUnlessTheLastArgumentIsAFileOfThatName) {
  using Arguments = std::vector<std::string>;
  struct Case {
    Arguments arguments;
    std::string_view name;
    std::string_view argument;
    const char* ignored;
    const char* mistyped;
  };
  const Case cases[] = {
      {{"--check", "a.kdx"}, "--check", "a.kdx", "", ""},
      {{"a.kdx ", "--check"}, "--check", "a.kdx", "", ""},
      {{"--check"}, "--check", "", "", ""},
      {{"--check", " "}, "--check", "", "", ""},
      {{"--new"}, "", "", "", ""},  // a file
      {{"a.kdx", "--new"}, "", "", "", ""},
      {{"--new", "basin", "//qmon"}, "--new", "basin", "Ignored: \"//qmon\"; no run is made", ""},
      {{"--check", "a.kdx", "b.kdx"}, "--check", "b.kdx", "Ignored: \"a.kdx\"; no run is made", ""},
      {{"--chek", "a.kdx"}, "", "", "", "--check"},
      {{"--CHECK", "a.kdx"}, "", "", "", "--check"},
      {{"--mew", "a.kdx"}, "", "", "", "--new"},
      {{"--mew"}, "", "", "", ""},
      {{"-n", "--nodes", "a.kdx"}, "", "", "", ""},
  };
  for (const Case& each : cases) {
    const CommandLine commandLine(each.arguments);
    SCOPED_TRACE(each.arguments.front() + " " + each.arguments.back());
    const auto command = commandLine.command([](const std::string& file) { return file == "--new"; });
    ASSERT_EQ(command.has_value(), !each.name.empty());
    if (command) {
      EXPECT_EQ(command->name, each.name);
      EXPECT_EQ(command->argument, each.argument);
      EXPECT_EQ(command->ignored, each.ignored[0] == '\0' ? Arguments{} : Arguments{each.ignored});
      continue;
    }
    const auto mistyped = commandLine.mistypedCommand();
    EXPECT_EQ(mistyped ? mistyped->second : "", each.mistyped);
  }
}

TEST(CommandLine, WhatHasNoEffectIsNamed) {
  const std::pair<std::vector<std::string>, const char*> cases[] = {
      {{"a.kdx", "//QMON"}, ""},
      {{"//foo", "a.kdx", "//bar"}, "Ignored: \"//foo\", \"//bar\"; the only switch is //qmon\n"},
      {{"-n", "4", "a.kdx"}, "Ignored: \"-n\", \"4\"; the setup file is the last argument, \"a.kdx\"\n"},
      {{"a.kdx", "a.kdx"}, "Ignored: \"a.kdx\"; the setup file is the last argument, \"a.kdx\"\n"},
      {{"//x", "a.kdx", "b.kdx"},
       "Ignored: \"//x\"; the only switch is //qmon\nIgnored: \"a.kdx\"; the setup file is the last argument, "
       "\"b.kdx\"\n"},
  };
  for (const auto& [arguments, sentences] : cases) {
    std::string found;
    for (const std::string& sentence : CommandLine(arguments).ignored()) found += sentence + "\n";
    EXPECT_EQ(found, sentences);
  }
}

}  // namespace
}  // namespace mirevo
