#include "import/pest_control.h"

#include <map>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "import/pest_prior.h"
#include "matchers.h"
#include "refusal.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

/// A short control file of version 1, with `edits` of the form {"text", "other text"}.
std::string controlFile(std::initializer_list<std::pair<std::string, std::string>> edits = {}) {
  std::string text = R"(pcf
* control data
restart estimation
2 2 1 1 2
1 1 single point 1 0 0
10.0 -3.0 0.3 0.03 10 lamforgive
10.0 10.0 0.001
0.1 noaui
5 0.005 4 4 0.005 4
1 1 1
* parameter groups
k relative 0.01 0.0 switch 2.0 parabolic
* parameter data
k1 log factor 1.0 0.01 100 k 1.0 0.0 1
'k 2' tied factor 2.0 0.0 10.0 k 1.0 0.0 1
'k 2' k1
* observation groups
head
* observation data
# a comment
h1 3.0 1.0 head
h2 12.0 2.0 head
* model command line
run model.exe 'a b'
* model input/output
in.tpl in.dat
out.ins out.dat
* prior information
p1 1.0 * log(k1)
& - 2 * k1 = 0.4 0.5 regul
* svd assist
whatever 1
++first(3) second(a b)
)";
  for (const auto& [from, to] : edits) {
    const std::size_t at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    text.replace(at, from.size(), to);
  }
  return text;
}

PestControl parse(const std::string& text, ImportNotes& notes, const std::map<std::string, std::string>& tables = {}) {
  const PestFileReader open = [&tables](const std::string& name, const SourcePlace& place) {
    const auto table = tables.find(name);
    if (table == tables.end()) failImport(place, "no such table");
    return table->second;
  };
  return parsePestControl("case.pst", text, open, notes);
}

std::string refusalOfControl(const std::string& text, const std::map<std::string, std::string>& tables = {}) {
  ImportNotes notes;
  return refusalOf([&] { parse(text, notes, tables); });
}

TEST(PestControl, ReadsAllOfVersionOne) {
  ImportNotes notes;
  const PestControl control = parse(controlFile(), notes);
  EXPECT_EQ(control.setting("noptmax")->value, "5");
  EXPECT_EQ(control.setting("noptmax")->place.text(), "case.pst:9");
  EXPECT_EQ(control.setting("numlam")->value, "10");
  EXPECT_EQ(control.setting("dpoint")->value, "point");
  ASSERT_EQ(control.parameters.size(), 2U);
  EXPECT_EQ(control.parameters[1].text("parnme"), "k 2");
  EXPECT_EQ(control.parameters[0].number("parubnd"), 100.0);
  ASSERT_EQ(control.ties.size(), 1U);
  EXPECT_EQ(control.ties[0].text("partied"), "k1");
  ASSERT_EQ(control.observations.size(), 2U);
  EXPECT_EQ(control.observations[1].place.line, 22U);
  ASSERT_EQ(control.commands.size(), 1U);
  EXPECT_EQ(control.commands[0].text, "run model.exe 'a b'");
  EXPECT_EQ(control.inputs.at(0).text("model_file"), "in.dat");
  EXPECT_EQ(control.outputs.at(0).text("pest_file"), "out.ins");
  ASSERT_EQ(control.priors.size(), 1U);
  EXPECT_EQ(control.priors[0].terms.at(1).factor, -2.0);
  EXPECT_EQ(control.priors[0].group, "regul");
  EXPECT_EQ(control.option("second")->value, "a b");
  EXPECT_EQ(control.others.size(), 2U) << "the heading of the section that is not read, and its line";
  EXPECT_EQ(notes.all().size(), 0U);
}

TEST(PestControl, SaysWhereAFileIsNotAsExpected) {
  const std::tuple<std::string, const char*> cases[] = {
      {"", "case.pst:1: expected \"pcf\" in the first line of a control file, found \"\""},
      {"# no\n\nptf ~\n", "case.pst:3: expected \"pcf\""},
      {"pcf version=3\n", "case.pst:1: expected \"pcf\" or \"pcf version=2\", found \"pcf version=3\""},
      {"pcf\n", "case.pst:1: expected the section \"* control data\", found the end of the file"},
      {"pcf\n1 2\n", "case.pst:2: expected a section, \"* control data\", found \"1 2\""},
      {controlFile({{"2 2 1 1 2", "3 2 1 1 2"}}),
       "case.pst:4: expected NPAR to be the number of lines of \"* parameter data\" before those of tied parameters, "
       "2"},
      {controlFile({{"h2 12.0 2.0 head\n", ""}}), "case.pst:4: expected NOBS to be the number"},
      {controlFile({{"1 1 single", "1 2 single"}}), "case.pst:5: expected NINSFLE to be the number"},
      {controlFile({{"2 2 1 1 2", "2 2 1 x 2"}}), "NPRIOR"},
      {controlFile({{"p1 1.0", "& 1.0"}}), "case.pst:29: expected a line of prior information before one"},
      {controlFile({{"++first(3)", "++first(3"}}), "case.pst:33: expected ) at the end of the option \"first\""},
  };
  for (const auto& [text, expected] : cases) EXPECT_THAT(refusalOfControl(text), HasSubstr(expected)) << text;
}

constexpr const char* kVersion2 = R"(pcf version=2
* control data keyword
noptmax 30   # as many
ies_num_reals 50
* parameter groups external
g.csv
* parameter data external
p.csv sep ; missing_values nan
* observation data
o1 1.5 1.0 g
* model command line
./model
* model input external
io.csv sep w
* model output
out.ins out.dat
* control sections of others
x
)";

TEST(PestControl, ReadsTheTablesOfVersionTwo) {
  const std::map<std::string, std::string> tables = {
      {"g.csv", "pargpnme,inctyp,derinc\nk,relative,0.02\n"},
      {"p.csv",
       "# made by a script\nNote;PARNME;partrans;parval1;parlbnd;parubnd;partied\n\"a;b\";k1;log;1;0.1;10;\n"
       ";k2;tied;2;0;10;k1\n"},
      {"io.csv", "pest_file  model_file\nin.tpl   'in put.dat'\n"}};
  ImportNotes notes;
  const PestControl control = parse(kVersion2, notes, tables);
  EXPECT_TRUE(control.isVersion2);
  EXPECT_EQ(control.setting("noptmax")->value, "30");
  EXPECT_EQ(control.parameterGroups.at(0).number("derinc"), 0.02);
  ASSERT_EQ(control.parameters.size(), 2U);
  EXPECT_EQ(control.parameters[1].place.text(), "p.csv:4");
  EXPECT_EQ(control.parameters[1].numberOr("scale", 1.0), 1.0);
  EXPECT_EQ(control.ties.at(0).text("partied"), "k1");
  EXPECT_EQ(control.inputs.at(0).text("model_file"), "in put.dat");
  EXPECT_EQ(control.outputs.at(0).text("pest_file"), "out.ins");
  EXPECT_EQ(notes.text(),
            "To be checked\n  case.pst:8: the option missing_values nan is not used\n\n"
            "Without a counterpart, and left out\n  p.csv:2: the columns note\n");

  EXPECT_THAT(refusalOfControl(kVersion2), HasSubstr("case.pst:6: no such table"));
  auto cut = tables;
  cut["p.csv"] = "parnme;parval1\nk1\n";
  EXPECT_THAT(refusalOfControl(kVersion2, cut), HasSubstr("p.csv:2: expected 2 cells as in the first line, found 1"));
}

TEST(PestPrior, IsReadTermByTerm) {
  const PestPrior prior = parsePestPrior({"c", 1}, "pi1  log(a) + 2.5*log( b_1 ) - c - 1e-2 * d = -0.5 2 regul_1");
  ASSERT_EQ(prior.terms.size(), 4U);
  EXPECT_EQ(prior.terms[0].factor, 1.0);
  EXPECT_TRUE(prior.terms[1].isLogarithm);
  EXPECT_EQ(prior.terms[1].parameter, "b_1");
  EXPECT_EQ(prior.terms[2].factor, -1.0);
  EXPECT_EQ(prior.terms[3].factor, -0.01);
  EXPECT_EQ(prior.value, -0.5);
  EXPECT_EQ(prior.weight, 2.0);
  const std::pair<const char*, const char*> cases[] = {
      {"pi1", "c:1: expected a name, an equation with = and a value"},
      {"pi1 1.0 * a = 1 2", "expected a value, a weight and a group behind the =, found \"1 2\""},
      {"pi1 = 1 2 g", "expected a term such as"},
      {"pi1 1.0 * log(a = 1 2 g", "expected ) behind the name in log("},
      {"pi1 a b = 1 2 g", "expected + or - before the next term, found \"b\""},
      {"pi1 2 = 1 2 g", "expected the name of a parameter, found \"2\""},
  };
  for (const auto& [line, expected] : cases) {
    EXPECT_THAT(refusalOf([&, line = line] { parsePestPrior({"c", 1}, line); }), HasSubstr(expected)) << line;
  }
}

}  // namespace
}  // namespace mirevo
