#include "platform/kdx/kdx.h"

#include <tuple>
#include <utility>

#include <gtest/gtest.h>

#include "common/calendar.h"

namespace mirevo {
namespace {

/// "line:column: message" of a text that is no KDX; "valid" for one that is.
std::string diagnosis(std::string_view text) {
  const auto result = parseKdx("test.kdx", text);
  const auto* error = std::get_if<KdxSyntaxError>(&result);
  if (error == nullptr) return "valid";
  return std::to_string(error->position.line) + ":" + std::to_string(error->position.column) + ": " + error->message;
}

KdxDocument parse(std::string_view text) {
  auto result = parseKdx("test.kdx", text);
  if (const auto* error = std::get_if<KdxSyntaxError>(&result)) ADD_FAILURE() << error->message;
  return std::get<KdxDocument>(std::move(result));
}

TEST(Kdx, NamesTheFirstPlaceThatIsWrongAndWhatWasExpected) {
  const std::pair<std::string, const char*> cases[] = {
      {"[A]\n  Title  'x'\n[/A]", "2:10: expected '=' after keyword \"Title\""},
      {"[A]\nx =\n", "2:4: expected a value after '=', found the end of the line"},
      {"[A]\nx = // 3\n", "2:5: expected a value after '=', found the end of the line"},
      {"[A]\nx = 1,\n2\n", "2:7: expected a value after ',', found the end of the line"},
      {"[A]\nx = 1 2\n", "2:7: expected ',' or the end of the line after a value, found \"2\""},
      {"[A]\nx = 'a' 'b'\n",
       "2:9: expected ',' or the end of the line after a value, found \"'b'\"; write a quote inside a text twice, or "
       "put the text between quotes of the other kind"},
      {"[A]\nx = hello\n", "2:5: expected a number, a date or a text between quotes, found \"hello\""},
      {"[A]\nx = 01.02.2001\n",
       "2:5: expected a number, a date or a text between quotes, found \"01.02.2001\"; a date is written as "
       "2001-01-31"},
      {"[A]\nx = -inf\n", "2:5: expected a number, a date or a text between quotes, found \"-inf\""},
      {"[A]\nx = 1e999\n", "2:5: expected a number, a date or a text between quotes, found \"1e999\""},
      {"[A]\nx = 2001-01-31 12\n", "2:5: expected a number, a date or a text between quotes, found \"2001-01-31 12\""},
      {"[A]\nx = 'open\n'", "2:5: expected a closing ' before the end of the line"},
      {"[A]\nx = \"it's\n", "2:5: expected a closing \" before the end of the line"},
      {std::string("[A]\nx = 'a\0b'\n", 13), "2:7: expected a text without control characters, found character 0"},
      {"[A]\n# note\n", "2:1: expected a section or a keyword, found \"# note\"; a comment begins with //"},
      {"[A]\n= 3\n", "2:1: expected a section or a keyword, found \"= 3\""},
      {"x = 3\n", "1:1: expected a section before keyword \"x\""},
      {"[]\n", "1:2: expected the name of a section, found \"]\""},
      {"[A\n[/A]", "1:3: expected ']' after section name \"A\", found the end of the line"},
      {"[A]\n[B]\n[/A]\n[/B]", "3:1: expected \"[/B]\" to close the section opened at line 2, found \"[/A]\""},
      {"[a]\n[/A]", "2:1: expected \"[/a]\" to close the section opened at line 1, found \"[/A]\""},
      {"[/A]", "1:1: expected no \"[/A]\": no section is open"},
      {"[A]\n[B]\n[/B]\n", "4:1: expected \"[/A]\" to close the section opened at line 1, found the end of the file"},
      {"\xEF\xBB\xBF[A", "1:3: expected ']' after section name \"A\", found the end of the file"},
      {"[A]\r\nx = 1\r\ny 2\r\n[/A]\r\n", "3:3: expected '=' after keyword \"y\""},
      {"", "valid"},
      {"[A][B][/B][/A]", "valid"},
  };
  for (const auto& [text, expected] : cases) EXPECT_EQ(diagnosis(text), expected) << text;
}

TEST(Kdx, ReadsEveryKindOfValueWithItsPlace) {
  const KdxDocument document = parse(
      "\xEF\xBB\xBF// comment\r\n[Target]\r\n"
      "  I = -7, +2147483647, 2147483648 // beyond 32 bits\r\n"
      "  R = 1.5D-035,.5,5.,1e2\r\n"
      "  S = 'it''s // no comment, \"true\"', \"C:\\dir\"//comment\r\n"
      "  D = 2001-01-31, 2001-1-31 12:30, 2001-01-31T24:00:15, '2001-01-31'\r\n"
      "[/Target]\r\n");
  const KdxSection* target = document.root.section("Target");
  ASSERT_NE(target, nullptr);
  const auto& integers = target->keyword("I")->values;
  EXPECT_EQ(std::get<std::int32_t>(integers.at(0).value), -7);
  EXPECT_EQ(std::get<std::int32_t>(integers.at(1).value), 2147483647);
  EXPECT_EQ(std::get<double>(integers.at(2).value), 2147483648.0) << "digits beyond 32 bits are a real";
  EXPECT_EQ(integers[2].position.line, 3);
  EXPECT_EQ(integers[2].position.column, 24);
  const double reals[] = {1.5e-35, 0.5, 5.0, 100.0};
  for (std::size_t i = 0; i < 4; ++i) EXPECT_EQ(std::get<double>(target->keyword("R")->values.at(i).value), reals[i]);
  const auto& texts = target->keyword("S")->values;
  EXPECT_EQ(std::get<std::string>(texts.at(0).value), "it's // no comment, \"true\"");
  EXPECT_EQ(std::get<std::string>(texts.at(1).value), "C:\\dir");
  const auto& dates = target->keyword("D")->values;
  EXPECT_EQ(std::get<DateRecord>(dates.at(0).value), (DateRecord{2001, 1, 31}));
  EXPECT_EQ(std::get<DateRecord>(dates.at(1).value), (DateRecord{2001, 1, 31, 12, 30}));
  EXPECT_EQ(std::get<DateRecord>(dates.at(2).value), (DateRecord{2001, 1, 31, 24, 0, 15}));
  EXPECT_EQ(std::get<std::string>(dates.at(3).value), "2001-01-31") << "between quotes it stays a text";
}

// Beyond a few entries a section is searched by an index.
TEST(Kdx, TellsSectionsAndKeywordsOfOneNameApartInShortAndLongSections) {
  for (const int count : {14, 16, 17, 40}) {
    std::string text = "[T]\n";
    for (int i = 0; i < count; ++i)
      text.append("k").append(std::to_string(i % 3)).append(" = ").append(std::to_string(i)).append("\n[S]\n[/S]\n");
    const KdxDocument document = parse(text + "[s]n = 1\n[/s][/T][U][/U]");
    const KdxSection& target = *document.root.section("T");
    EXPECT_EQ(target.keywordCount("k0"), (count + 2) / 3);
    EXPECT_EQ(std::get<std::int32_t>(target.keyword("k1", 5)->values[0].value), 13);
    EXPECT_EQ(target.keyword("k1", (count + 1) / 3 + 1), nullptr);
    EXPECT_EQ(target.keyword("k1", 0), nullptr);
    EXPECT_EQ(target.keyword("none"), nullptr);
    EXPECT_EQ(target.section("S", 0), nullptr);
    EXPECT_EQ(target.section("S", count), target.sections()[target.sections().size() - 2].get());
    EXPECT_EQ(target.section("s"), target.sections().back().get()) << "names are compared with case";
    EXPECT_EQ(std::get<std::int32_t>(target.section("s")->keyword("n")->values[0].value), 1);
    EXPECT_NE(document.root.section("U"), nullptr);
    EXPECT_EQ(target.section("S", count + 1), nullptr);
  }
}

TEST(Kdx, BoundsNestingAndTheLengthOfMessages) {
  const auto nested = [](std::size_t depth) {
    std::string text;
    for (std::size_t i = 0; i < depth; ++i) text += "[A]";
    for (std::size_t i = 0; i < depth; ++i) text += "[/A]";
    return text;
  };
  EXPECT_EQ(diagnosis(nested(100)), "valid");
  EXPECT_EQ(diagnosis(nested(101)), "1:301: expected at most 100 sections inside each other");
  EXPECT_EQ(diagnosis("[A]\nx = " + std::string(100000, 'y')),
            "2:5: expected a number, a date or a text between quotes, found \"" + std::string(60, 'y') + "...\"");
  EXPECT_EQ(diagnosis("[A]\nx = " + std::string(59, 'y') + "\xC3\xA4\xC3\xA4"),
            "2:5: expected a number, a date or a text between quotes, found \"" + std::string(59, 'y') + "...\"")
      << "no half characters";
}

TEST(Kdx, DatesAreTakenApartAndNotJudged) {
  const std::tuple<const char*, const char*> cases[] = {{" 2001-13-99 99:99:99 ", "2001-13-99 99:99:99"},
                                                        {"2001-1-2", "2001-01-02 00:00"},
                                                        {"0000-00-00T00:00", "0000-00-00 00:00"},
                                                        {"2001-01-31  7:05", "2001-01-31 07:05"},
                                                        {"201-01-31", "no date"},
                                                        {"20010-01-31", "no date"},
                                                        {"2001-01-31T", "no date"},
                                                        {"2001-01-31 12:3", "no date"},
                                                        {"2001-01-31 12:30:5", "no date"},
                                                        {"2001-01-31 12:30:05Z", "no date"},
                                                        {"2001/01/31", "no date"},
                                                        {"-2001-01-31", "no date"},
                                                        {"", "no date"}};
  for (const auto& [text, formatted] : cases) {
    const auto date = parseKdxDate(text);
    EXPECT_EQ(date ? formatDate(*date) : "no date", formatted) << text;
  }
}

}  // namespace
}  // namespace mirevo
