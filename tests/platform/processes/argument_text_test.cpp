#include "platform/processes/argument_text.h"

#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(ArgumentText, SplitsAsAShellDoes) {
  const std::tuple<const char*, std::vector<std::string>> cases[] = {
      {"", {}},
      {"  \t ", {}},
      {"-q  in.txt\tout.txt ", {"-q", "in.txt", "out.txt"}},
      {"'two words' \"and three more\"", {"two words", "and three more"}},
      {"--name='a b'c", {"--name=a bc"}},
      {"'' \"\"", {"", ""}},
      {R"(a\ b \\ \')", {"a b", "\\", "'"}},
      {R"("say \"it\" \$HOME \n")", {R"(say "it" $HOME \n)"}},
      {R"('no \ escape')", {R"(no \ escape)"}},
      {"$HOME *.txt `ls` ~ # ; &", {"$HOME", "*.txt", "`ls`", "~", "#", ";", "&"}},
  };
  for (const auto& [text, expected] : cases) {
    std::string reason;
    const auto words = splitArguments(text, reason);
    ASSERT_TRUE(words.has_value()) << text << ": " << reason;
    EXPECT_EQ(*words, expected) << text;
  }
}

TEST(ArgumentText, SaysWhereAQuoteIsOpen) {
  const std::pair<const char*, const char*> cases[] = {
      {"-a 'in.txt", "expected a closing ' for the one at character 4"},
      {"\"a\" \"b\\\"", "expected a closing \" for the one at character 5"},
      {"a\\", "expected a character after the backslash at the end"},
  };
  for (const auto& [text, expected] : cases) {
    std::string reason;
    EXPECT_FALSE(splitArguments(text, reason).has_value()) << text;
    EXPECT_EQ(reason, expected);
  }
}

}  // namespace
}  // namespace mirevo
