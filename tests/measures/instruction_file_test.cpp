#include "measures/instruction_file.h"

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

using ::testing::DoubleEq;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::Pointwise;

/// The numbers that instructions read from a listing, or why they cannot.
std::pair<std::vector<double>, std::string> readWith(const std::string& instructions, const std::string& listing) {
  std::string reason;
  const auto file = InstructionFile::parse("i.ins", instructions, reason);
  if (!file) return {{}, reason};
  const auto values = file->read("out.lst", listing, reason);
  return {values.value_or(std::vector<double>()), reason};
}

constexpr const char* kListing =
    "RUN OF A MODEL   v2\n"
    "\n"
    "TIME =  10.5 days   Inflow:12.25m3/s\n"
    "node  head   flow\n"
    "   1  3.50E+01,  -1.25D-02\n"
    "   2  36.1,,7\n"
    "1236.5678495.123-900.999     2.2\n"
    "TIME =  20.5 days   Outflow: 1\n"
    "TIME =  20.5 days   Inflow: 13 m3/s\n";

TEST(InstructionFile, ReadsWhatEachInstructionSays) {
  const std::tuple<const char*, std::vector<double>> cases[] = {
      {"l3 ~=~ !t! ~Inflow:~ !q! ~m3~", {10.5, 12.25}},  // a number ends where the marker behind it begins
      {"~TIME~ !dum! !t!", {10.5}},                      // dum may be anything
      {"~TIME~ ~Inflow: ~ !q!", {13}},                   // goes on to a line that has both
      {"~head~\nl1 !dum! !h! !q!\nL1 w w !h2!", {35, -0.0125, 36.1}},
      {"~head~\nl1 w !dum! !h!\n& !q!", {35, -0.0125}},  // a line that goes on
      {"l7 [a]1:8 [b]9:16 [c]17:24 !d!", {1236.567, 8495.123, -900.999, 2.2}},
      {"l5 (a)8:9 (b)17:40", {35, -0.0125}},  // any column of the number, or blanks before it
      {"l5 t4 !a!", {35}},
      {"l6 ~,,~ !a!", {7}},
      {"~TIME~ !dum! !A_1!\n~TIME~ !dum! !a_2!", {10.5, 20.5}},  // the next line with it
  };
  for (const auto& [lines, expected] : cases) {
    const auto [values, reason] = readWith(std::string("pif ~\r\n") + lines + "\n\n", kListing);
    EXPECT_THAT(values, Pointwise(DoubleEq(), expected)) << lines << ": " << reason;
  }
}

TEST(InstructionFile, SaysWhereAListingIsNotAsItSays) {
  const std::pair<const char*, const char*> cases[] = {
      {"l99 !a!", "out.lst:9:36: expected 90 lines more, found the end of the file (i.ins:2:1)"},
      {"~heads~ !a!", "out.lst:9:36: expected \"heads\" in a line from 1 on, found the end of the file (i.ins:2:1)"},
      {"l1 ~model~ !a!", "out.lst:1:1: expected \"model\", found \"RUN OF A MODEL   v2\" (i.ins:2:4)"},
      {"~=~ !a! !b!", "out.lst:3:14: expected a number, found \"days\" (the number \"b\" at i.ins:2:9)"},
      {"l6 !dum! !a! !b!", "out.lst:6:12: expected a number, found \",7\" (the number \"b\" at i.ins:2:14)"},
      {"l5 [a]20:60 [b]61:70",
       "out.lst:5:27: expected a number, found the end of the line (the number \"b\" at i.ins:2:13)"},
      {"l7 [a]9:20", "out.lst:7:9: expected a number, found \"8495.123-900\" (the number \"a\" at i.ins:2:4)"},
      {"l5 w w w w !a!", "expected blanks and something behind them"},
      {"l5 t8 !a!", "out.lst:5:9: t8 is within the number \"3.50E+01\": expected a column before its first digit"},
      {"l5 t80 !a!", "expected a line of 80 columns or more, found 26"},
      // Markers that cut a number
      {"~Inflow:1~ !q!",
       "out.lst:3:29: the marker in front of the number ends within \"Inflow:12.25m3/s\": expected one that leaves it "
       "whole (the number \"q\" at i.ins:2:12)"},
      {"l5 w w !h! ~E+~", "out.lst:5:7: the marker behind the number begins within \"3.50E+01\""},
      {"l5 ~3.50E~ !h!", "the marker in front of the number ends within \"3.50E+01\""},
      {"l5 ~3.50E+~ !h!", "the marker in front of the number ends within \"3.50E+01\""},
      {"l7 !dum! !d! ~2~", "out.lst:7:30: expected a number, found \"2.2\""},  // nothing is left of it
  };
  for (const auto& [lines, expected] : cases) {
    const auto [values, reason] = readWith(std::string("pif ~\n") + lines, kListing);
    EXPECT_TRUE(values.empty()) << lines;
    EXPECT_THAT(reason, HasSubstr(expected)) << lines;
  }
}

TEST(InstructionFile, TellsOfColumnsThatCutANumber) {
  // The columns, and what is said of them; nothing where others go on with the number, or no number goes on.
  const std::pair<const char*, const char*> cases[] = {
      {"l7 [a]1:8 [b]9:16 [c]17:24", ""},
      {"l7 [a]1:8",
       "out.lst:7:1: the columns 1:8 cut \"1236.5678495.123-900.999\", of which \"1236.567\" is read "
       "(i.ins:2:4)"},
      {"l7 [b]9:16", "out.lst:7:9: the columns 9:16 cut"},
      {"l7 [c]17:24", ""},  // from its sign on
      {"l7 [c]18:24", "out.lst:7:18: the columns 18:24 cut"},
      {"l7 [d]28:33", ""},
      {"l5 [a]7:10", "of which \"3.50\" is read"},  // without its exponent
      {"l5 [a]7:14", ""},
      {"l5 [a]19:26", "out.lst:5:19: the columns 19:26 cut \"-1.25D-02\", of which \"1.25D-02\" is read"},
      {"l3 [t]8:11\nl2 [h]8:10", "is read (i.ins:2:4); so do 1 more"},
      {"l7 [dum]1:18 !c!", "of which \"1236.5678495.123-9\" is read"},
      {"l7 [dum]1:18 [d]29:33", ""},
  };
  for (const auto& [lines, expected] : cases) {
    std::string reason;
    std::vector<std::string> doubts;
    const auto file = InstructionFile::parse("i.ins", std::string("pif ~\n") + lines, reason);
    ASSERT_TRUE(file) << reason;
    EXPECT_TRUE(file->read("out.lst", kListing, reason, nullptr, &doubts)) << lines << ": " << reason;
    doubts.resize(1);
    EXPECT_THAT(doubts.front(), *expected == 0 ? ::testing::Matcher<std::string>("") : HasSubstr(expected)) << lines;
  }
}

TEST(InstructionFile, TellsOfNumbersThatEndAtACommaBetweenDigits) {
  // Of a listing of one line what is said; nothing where the comma can only separate.
  const std::tuple<const char*, const char*, const char*> cases[] = {
      {"l1 w !x!", "sum 1,234.5",
       "out.lst:1:5: of \"1,234.5\" only \"1\" is read, as a comma ends a number: if it marks thousands or decimals, "
       "let "
       "the model write numbers without; if it separates, read on behind it, as with !dum! (i.ins:2:6)"},
      {"~sum~ !x!", "sum -12,345,678", "of \"-12,345,678\" only \"-12\" is read"},
      {"~sum~ (x)5:9", "sum 1,234.5 m", "of \"1,234.5\" only \"1\" is read"},
      {"~sum~ !x! w !y!", "sum 3,14 2,71", "of \"3,14\" only \"3\" is read, as a comma ends a number"},
      {"~sum~ !x! w !y!", "sum 3,14 2,71", "(i.ins:2:7); so are 1 more read"},
      {"~sum~ !x! !y!", "sum 1,234.5", ""},
      {"~sum~ !x! !dum!", "sum 1,234.5", ""},
      {"~sum~ !dum! !x!", "sum 1,234.5", ""},
      {"~sum~ !x! ~,~", "sum 1,234.5", ""},
      {"~sum~ !x!", "sum 1.5,234", ""},
      {"~sum~ !x!", "sum 1,23,4", ""},
      {"~sum~ !x!", "sum 2001,7,31", ""},
      {"~sum~ !x!", "sum 1, 234.5", ""},
      {"~sum~ !x!", "sum 1,,234", ""},
  };
  for (const auto& [lines, listing, expected] : cases) {
    std::string reason;
    std::vector<std::string> doubts;
    const auto file = InstructionFile::parse("i.ins", std::string("pif ~\n") + lines, reason);
    ASSERT_TRUE(file) << reason;
    EXPECT_TRUE(file->read("out.lst", listing, reason, nullptr, &doubts)) << lines << ": " << reason;
    EXPECT_EQ(doubts.size(), *expected == 0 ? 0U : 1U) << listing;
    EXPECT_THAT(doubts.empty() ? std::string() : doubts.front(), HasSubstr(expected)) << listing;
  }
}

TEST(InstructionFile, RefusesWhatIsNoInstruction) {
  const std::pair<const char*, const char*> cases[] = {
      {"", "i.ins: it is empty: expected \"pif ~\" in its first line"},
      {"ptf ~\nl1 !a!", "i.ins:1:1: expected \"pif\" and the delimiter of markers, as in \"pif ~\", found \"ptf ~\""},
      {"pif !\nl1 !a!", "i.ins:1:1: expected a delimiter of markers that is no letter"},
      {"pif ~\n\n", "i.ins: no instruction reads a number"},
      {"pif ~\n!a!", "i.ins:2:1: expected a line to begin with a marker between ~ and ~, with a number of lines"},
      {"pif ~\n& l1", "i.ins:2:1: expected a line before one that goes on with &"},
      {"pif ~\nl1 !a!\n&", "i.ins:3:2: expected an instruction behind &"},
      {"pif ~\nl1 l2 !a!", "i.ins:2:4: expected a number of lines at the beginning of a line only"},
      {"pif ~\nl0 !a!", "i.ins:2:1: expected a number from 1 behind l, found \"l0\""},
      {"pif ~\nl1 ~mark !a!", "i.ins:2:4: expected ~ at the end of the marker"},
      {"pif ~\nl1 ~~ !a!", "i.ins:2:4: expected a marker with a text"},
      {"pif ~\nl1 !a", "i.ins:2:4: expected ! at the end of the name"},
      {"pif ~\nl1 [a]9:3", "i.ins:2:7: expected first and last column, as in 21:30, found \"9:3\""},
      {"pif ~\nl1 (a)9", "expected first and last column"},
      {"pif ~\nl1 !a! !A!", "i.ins:2:8: the name \"A\" is there twice"},
      {"pif ~\nl1 q7 !a!", "expected an instruction (a marker between ~ and ~, w, t with a column, !name!"},
  };
  for (const auto& [text, expected] : cases) {
    EXPECT_THAT(readWith(text, kListing).second, HasSubstr(expected)) << text;
  }
}

TEST(InstructionFile, FindsNamesWhateverTheirCase) {
  std::string reason;
  const auto file = InstructionFile::parse("i.ins", "pif @\nl1 !Head_1! !dum! [HEAD_2]1:3 !DUM! !q!\n", reason);
  ASSERT_TRUE(file) << reason;
  EXPECT_THAT(file->names(), ElementsAre("Head_1", "HEAD_2", "q"));
  EXPECT_EQ(file->placeOf("head_2"), 1U);
  EXPECT_EQ(file->placeOf("dum"), std::nullopt);
}

/// Files that others have written, with the outputs that they read.
class InstructionFileSamples : public ::testing::Test {
 protected:
  void SetUp() override {
    const char* const folder = std::getenv("MIREVO_IMPORT_SAMPLES");
    if (folder == nullptr || *folder == 0) GTEST_SKIP() << "MIREVO_IMPORT_SAMPLES names no folder of samples";
    folder_ = folder;
  }
  std::string text(const std::string& name) const {
    std::ostringstream content;
    content << std::ifstream(folder_ + "/" + name).rdbuf();
    EXPECT_FALSE(content.str().empty()) << name;
    return content.str();
  }
  std::vector<double> read(const std::string& instructions, const std::string& listing) const {
    std::string reason;
    const auto file = InstructionFile::parse(instructions, text(instructions), reason);
    if (!file) ADD_FAILURE() << reason;
    const auto values = file ? file->read(listing, text(listing), reason) : std::nullopt;
    EXPECT_TRUE(values) << reason;
    return values.value_or(std::vector<double>());
  }
  std::string folder_;
};

TEST_F(InstructionFileSamples, GiveTheValuesThatTheyAreKnownToGive) {
  // The values stand beside the listing, in the order of the instruction file.
  std::vector<double> expected;
  std::istringstream values(text("pest/tplins/out1.dat.obf"));
  std::string name;
  for (double value = 0; values >> name >> value;) expected.push_back(value);
  std::vector<double> found = read("pest/tplins/out1.dat.ins", "pest/tplins/out1_copy.dat");
  ASSERT_GE(found.size(), expected.size());
  EXPECT_EQ(found.back(), 123456789.987654321);
  found.resize(expected.size());
  EXPECT_THAT(found, Pointwise(::testing::DoubleNear(1e-3), expected));

  EXPECT_THAT(read("pest/secondary_marker/freyberg.mpenpt.ins", "pest/secondary_marker/freyberg.mpenpt_bak"),
              ElementsAre(2.0, 907.7018));
  for (const std::string number : {"1", "2"}) {
    const std::string front = "pest/secondary_marker/out" + number + ".dat";
    EXPECT_THAT(read(front + ".ins", front + "_bak"),
                ElementsAreArray({1962323.838381852, 1962323.838381852, 1962323.838381852, 1012443.579448908,
                                  1012443.579448908, 1012443.579448908}));
  }
  EXPECT_FALSE(read("pest/tplins/AOC_obs.txt.ins", "pest/tplins/AOC_obs_copy.txt").empty());
}

}  // namespace
}  // namespace mirevo
