#include "parameters/template_file.h"

#include <filesystem>
#include <tuple>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "parameters/template_doubts.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

std::vector<ModelParameter> parameters() {
  const auto make = [](std::string name, double id, double initial, double lower, double upper) {
    return ModelParameter{
        .initialValue = initial, .lowerBound = lower, .upperBound = upper, .idValue = id, .name = std::move(name)};
  };
  return {make("K", 1.0e-35, 0.5, 0.01, 100),  make("Manning channel", 1.5e-35, 0.03, 0.01, 0.2),
          make("a 1.1e-35", 1.1e-35, 1, 0, 2), make("K2  ", 1.2e-35, 50, 10, 99),
          make("no id", 0, 1, 0, 2),           make(" K", 1.2e-35, 1, 0, 2),
          make("größe", 1.9e-35, 1, 0, 2)};
}

std::string converted(const std::string& line) {
  const std::string text = ConvertIdTemplate("model.tpl", line + "\n", parameters());
  EXPECT_EQ(text.substr(0, 2), "!\n");
  return text.substr(2, text.size() - 3);
}

TEST(ConvertIdTemplate, ReplacesIdValues) {
  const std::tuple<const char*, const char*> cases[] = {
      {"no value here   ", "no value here"},
      {"x 1E-35 y", "x !K        ! y"},
      {"x 1.0E-035", "x !K        !"},
      {"x\t1.0e-35\ty", "x\t!K        !\ty"},
      {" 1.5e-035 1.5E-35 1.0E-035", " !Manning channel! !Manning channel! !K        !"},
      // The token in column 1 keeps its first character.
      {"1.5E-035 b", "1!Manning channel! b"},
      {" 1.5E-035 b", " !Manning channel! b"},
      // What follows the suffix stays; the exponent of three digits is taken before that of two.
      {"x 1.0E-035,2", "x !K        !,2"},
      {"x 1.0E-350", "x !K        !0"},
      // A name that looks like an ID value itself is not converted again.
      {"x 1.1e-35 1e-35", "x !a 1.1e-35! !K        !"},
      // The first of two parameters with one ID value; its name without trailing blanks.
      {"x 12E-036 1.2e-35", "x 12E-036 !K2       !"},
      {"x 1.9e-35", "x !größe    !"},
      {"x 0e-35", "x !no id    !"},
      {"1.0E-0", "1.0E-0"},
  };
  for (const auto& [line, expected] : cases) EXPECT_EQ(converted(line), expected) << line;
}

TEST(ConvertIdTemplate, RefusesUndefinedIdValues) {
  const std::tuple<const char*, const char*> cases[] = {{"x 2.0E-035", "2.0E-035"},
                                                        {"see table-35", "table-35"},
                                                        {"e-35", "e-35"},
                                                        {"x 1e-35,1.5E-35", "1e-35,1.5E-35"},
                                                        {"1e-35,1.5e-35", "!,1.5e-35"},
                                                        {"x 99999999999e-35", "99999999999e-35"},
                                                        {"x k=1e-35", "k=1e-35"}};
  for (const auto& [line, token] : cases) {
    EXPECT_THAT(refusalOf([&] { converted(std::string("first line\n") + line); }),
                StartsWith(std::string("Error: Undefined parameter ID value ") + token +
                           " found in template file\nmodel.tpl:2:"));
  }
}

TEST(ConvertIdTemplate, KeepsLinesAndEndsThemAlike) {
  EXPECT_EQ(ConvertIdTemplate("t", "a \r\n\r\n  b\t\r\nlast", parameters()), "!\na\n\n  b\t\nlast\n");
  EXPECT_EQ(ConvertIdTemplate("t", "", parameters()), "!\n");
  EXPECT_EQ(ConvertIdTemplate("t", std::string(50000, 'x') + "   ", parameters()).size(), 50003);
  std::string many;
  for (int i = 0; i < 5000; ++i) many += " 1e-35";
  for (const auto& [text, line] : {std::pair{"a\n" + std::string(50001, 'x'), 2}, {many, 1}}) {
    EXPECT_EQ(refusalMessageOf([&, &content = text] { ConvertIdTemplate("t", content, parameters()); }),
              fmt::format("Error: Line {} of template file t is too long", line));
  }
}

TEST(ParameterTemplate, FillsPlaceholders) {
  const std::vector<double> values{12.5, 0, 1, 1e100, 5, 7, 9};
  const std::tuple<const char*, const char*> cases[] = {
      {"$\nplain   \n", "plain\n"},
      {"$", ""},
      {"$ is the delimiter\n$K    $", "   12.5\n"},
      {"  #\r\n#K    #!#no id#\r\n", "   12.5!      5\n"},
      {"\xEF\xBB\xBF!\n!K!", "12.\n"},
      {"!\n!K  !!K  !", " 12.5 12.5\n"},
      {"!\nx !Manning channel! y", "x                 0 y\n"},
      // Leading blanks of a name count, trailing ones do not.
      {"!\n! K ! !K !", "    7 12.5\n"},
      // Blanks behind a value go at the end of a line and stay before other text.
      {"!\n   !K                        !  \n!K                        !x",
       "                   12.5\n                12.5       x\n"},
      {"!\nx!K2        !", "x*\n"},
      // A width is one of characters, in a template in Latin-1, too.
      {"!\n!größe!|", "      9|\n"},
      {"!\n!gr\xF6\xDF"
       "e!|",
       "      9|\n"},
  };
  for (const auto& [text, expected] : cases) {
    EXPECT_EQ(ParameterTemplate("t", text, parameters()).fill(values), expected) << text;
  }
  EXPECT_THAT(ParameterTemplate("t", "!\n!no id! !K!\n!K !", parameters()).parametersNamed(), ElementsAre(0, 4));
}

TEST(ParameterTemplate, TakesATemplateOfPestAsItIs) {
  const std::string text = "ptf  #  \nk #k    # #  K2   #\n#\tMANNING Channel #\n";
  const ParameterTemplate form("in.tpl", text, parameters());
  EXPECT_EQ(form.fill(std::vector<double>{2.0 / 3.0, 0.03, 1, 12, 1, 1, 1}),
            "k .666667      12.0\n               0.03\n");
  EXPECT_THAT(templateDoubts(form, TemplateType::delimiter, text, parameters()), ::testing::IsEmpty());
  EXPECT_EQ(form.unwritableValue(std::vector<double>{1e300, 1, 1, 1, 1, 1, 1}, parameters()), "");
  EXPECT_THAT(form.unwritableValue(std::vector<double>(7, std::nan("")), parameters()),
              HasSubstr("the value NaN of parameter \"K\" cannot be written in its field, in.tpl:2"));
  EXPECT_THAT(refusalOf([] { ParameterTemplate("in.tpl", "ptf ~\n~q~\n", parameters()); }),
              HasSubstr("in.tpl:2:1: no parameter has the name \"q\""));
  EXPECT_THAT(refusalOf([] { ParameterTemplate("in.tpl", "ptf 5\n5K5\n", parameters()); }),
              HasSubstr("is a character of numbers"));
}

TEST(ParameterTemplate, RefusesWhatItCannotFill) {
  const std::tuple<std::string, const char*, const char*> cases[] = {
      {"", "Error: Delimiter not defined in template file t", "first line"},
      {"   \n!K!", "Error: Delimiter not defined in template file t", "first line"},
      {"1\n1K1", "Error: Delimiter not defined in template file t", "\"1\" is a character of numbers"},
      {"§\n§K§", "Error: Delimiter not defined in template file t", "single-byte"},
      {"!\n\nab !K", "Error: Parameter name  in template file  invalid", "t:3:4: the delimiter ! has no partner"},
      {"\xFF\xFE!", "Error: Unable to open template file t", "the file is UTF-16 text; save it as UTF-8"},
      {std::string("!\n!K!\0", 6), "Error: Unable to open template file t", "line 2 holds a zero byte (NUL)"},
      {"!\n!!", "Error: Parameter name  in template file  invalid", "t:2:1: no parameter"},
      {"!\n!   !", "Error: Parameter name  in template file  invalid", "t:2:1: no parameter"},
      {"!\n!K! !Maning channel !", "Error: Parameter name Maning channel in template file Maning channel invalid",
       "t:2:5: no parameter has the name \"Maning channel\", which is between two ! here\ndid you mean \"Manning "
       "channel\"?"},
      {"!\n!K\t !", "Error: Parameter name K\\t in template file K\\t invalid",
       "t:2:1: no parameter has the name \"K\\t\", which is between two ! here\nIt has a tab, written as \\t in"},
      {"!\n!k!", "Error: Parameter name k in template file k invalid", "did you mean \"K\"?"},
  };
  for (const auto& [text, message, detail] : cases) {
    EXPECT_THAT(refusalOf([&] { ParameterTemplate("t", text, parameters()); }),
                AllOf(StartsWith(message + std::string("\n")), HasSubstr(detail)));
  }
}

TEST(ParameterTemplate, WarnsOfNarrowPlaceholders) {
  const auto warnings = [](const std::string& lines, std::vector<ModelParameter> list = parameters()) {
    return ParameterTemplate("t", "!\n" + lines, list).narrowPlaceholderWarnings(list);
  };
  EXPECT_THAT(warnings("!K        ! !Manning channel! !K2  !"), ElementsAre());
  const auto narrow = warnings("a\n !K!");
  ASSERT_EQ(narrow.size(), 1);
  EXPECT_EQ(
      narrow[0],
      "t:3: the placeholder of parameter \"K\" is 3 characters wide and keeps fewer than four significant digits: "
      "0.5 is written as \"E-0\"; make it 9 wide, delimiters included, by blanks behind the name");
  EXPECT_THAT(warnings("!K     !"), ElementsAre(HasSubstr("make it 9 wide"))) << "8 columns: 1.23E-02";
  const ParameterTemplate converted("t", "!\n1!K        !", parameters(), true);
  EXPECT_THAT(converted.narrowPlaceholderWarnings(parameters()), ElementsAre(StartsWith("t:1: ")))
      << "the user's template has no delimiter line";
  EXPECT_THAT(warnings("1!K        !"), ElementsAre(HasSubstr("touched by \"1\"")));
  EXPECT_THAT(warnings("-!K        !0"), ElementsAre(HasSubstr("touched by \"-\"")));
  EXPECT_THAT(warnings("!K        !0"), ElementsAre(HasSubstr("touched by \"0\"")));

  using enum ParameterType;
  const auto with = [](ParameterType type, double lower, double upper,
                       TransformationType transformation = TransformationType::none) {
    std::vector<ModelParameter> list = parameters();
    list[0] = {lower, lower, upper, transformation, type, 1e-35, "K"};
    return list;
  };
  EXPECT_THAT(warnings("!K  !", with(variable, 1, 500, TransformationType::integer)), ElementsAre());
  EXPECT_THAT(warnings("!K!", with(fixed, 7, 0)), ElementsAre());
  EXPECT_THAT(warnings("!K  !", with(dependent, 7, 7)), ElementsAre(HasSubstr("make it 10 wide")));
  EXPECT_THAT(warnings("!K           !", with(variable, 1e-120, 1)), ElementsAre(HasSubstr("no width is enough")));
  EXPECT_THAT(warnings("!K   !", with(variable, -100, 100)), ElementsAre(HasSubstr("make it 10 wide")));
}

TEST(TemplateDoubts, NameWhatIsReadInAnotherWayThanMeant) {
  constexpr auto kNames = TemplateType::delimiter;
  constexpr auto kIds = TemplateType::numericId;
  const std::string same = "the parameter file is the same in every model run";
  // the warnings, in order, by a part of each
  const std::tuple<TemplateType, const char*, std::vector<std::string>> cases[] = {
      {kNames, "$\nk $K   $\n", {}},
      {kIds, "k 1e-35\n#\n50 % of K\n", {}},
      {kNames, "$\nx 7e-35 1e-30\nk $K   $\n", {}},
      {kNames,
       "$ delimits\nk $K   $\n",
       {"t:1: the first line holds the delimiter, \"$\", and does not reach the model: \"delimits\" behind it is "
        "ignored"}},
      {kNames, "k = !K  !\nx\n", {"\"= !K  !\" behind it is ignored; was a line for the delimiter forgotten?", same}},
      {kNames, "$\nk $K   $\n x 1.5E-035 y", {"t:3: the ID value 1.5E-035 is no placeholder here: FileType = 1"}},
      {kNames, "$\nk $K   $ #K2#\n", {"t:2: \"#K2#\" is copied as it is: the delimiter in the first line is $"}},
      {kNames, "$\nplain\n", {"t: there is no placeholder in it: " + same}},
      {kIds,
       "$\nk $K   $\n",
       {"t:2: \"$K   $\" is copied as it is: FileType = 0", "t: there is no ID value in it: " + same}},
      {kIds, "k 1e-35\nm $Manning channel$\n", {"t:2: \"$Manning channel$\" is copied"}},
  };
  for (const auto& [type, text, expected] : cases) {
    const std::string delimited = type == kIds ? ConvertIdTemplate("t", text, parameters()) : text;
    const ParameterTemplate made("t", delimited, parameters(), type == kIds);
    const std::vector<std::string> doubts = templateDoubts(made, type, text, parameters());
    ASSERT_EQ(doubts.size(), expected.size()) << text;
    for (std::size_t i = 0; i < doubts.size(); ++i) EXPECT_THAT(doubts[i], HasSubstr(expected[i]));
  }
  const auto hint = [](TemplateType type, const char* text) { return hintOnMisreadTemplate(type, text, parameters()); };
  EXPECT_THAT(hint(kNames, "roughness 1\nK 2\nr"), HasSubstr("\"r\", the first character of the first line"));
  EXPECT_THAT(hint(kNames, "1.0 2\nK 1.0"), HasSubstr("\"1\", the first character of the first line"));
  EXPECT_THAT(hint(kNames, "1.0 2\nK 1e-35"), HasSubstr("line 2 has the ID value 1e-35: FileType = 1"));
  EXPECT_THAT(hint(kIds, "!\n!K !"), HasSubstr("line 2 has \"!K !\": FileType = 0"));
  EXPECT_EQ(hint(kNames, "!\n!k !"), "");
}

TEST(WriteParameterFile, RewritesAnExistingFileAndKeepsItsMode) {
  const TemporaryFolder folder;
  const std::string path = folder.write("model.inp", "old and longer than what comes", 0640);
  const ParameterTemplate parameterTemplate("t", "!\nK = !K   !\n", parameters());
  const std::vector<double> values(6, 3.25);
  WriteParameterFile(path + "  ", parameterTemplate, values);
  EXPECT_EQ(folder.read("model.inp"), "K =   3.25\n");
  EXPECT_EQ(std::filesystem::status(path).permissions(), std::filesystem::perms{0640});
}

}  // namespace
}  // namespace mirevo
