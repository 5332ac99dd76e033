#include "platform/processes/argument_text.h"

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(ArgumentText, SplitsAsAShellDoes) {
  const struct {
    const char* text;
    std::vector<std::string> words;
  } cases[] = {
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
  for (const auto& c : cases) {
    std::string reason;
    const auto words = splitArguments(c.text, reason);
    ASSERT_TRUE(words.has_value()) << c.text << ": " << reason;
    EXPECT_EQ(*words, c.words) << c.text;
  }
}

TEST(ArgumentText, SaysWhereAQuoteIsOpen) {
  const struct {
    const char* text;
    const char* reason;
  } cases[] = {
      {"-a 'in.txt", "expected a closing ' for the one at character 4"},
      {"\"a\" \"b\\\"", "expected a closing \" for the one at character 5"},
      {"a\\", "expected a character after the backslash at the end"},
  };
  for (const auto& c : cases) {
    std::string reason;
    EXPECT_FALSE(splitArguments(c.text, reason).has_value()) << c.text;
    EXPECT_EQ(reason, c.reason);
  }
}

}  // namespace
}  // namespace mirevo
