#include "run/access/setup_schema.h"

#include <cstdlib>
#include <set>
#include <utility>

#include <gtest/gtest.h>

#include "common/files.h"
#include "common/text.h"
#include "run/access/setup_value.h"
#include "run/setup/keyword_help.h"
#include "run/setup/run_keywords.h"
#include "run/setup/setup_reference.h"

namespace mirevo {
namespace {

TEST(SetupSchema, EveryRowIsSound) {
  std::set<std::string> seen;
  for (const SectionRow* section : setupSchema().sections()) {
    EXPECT_EQ(setupSchema().findSection(section->path), section) << section->path << " is there twice";
    for (const KeywordRow& row : section->keywords) {
      const std::string name = std::string(section->path) + " " + std::string(row.name());
      EXPECT_TRUE(seen.insert(name).second) << name << " is there twice";
      EXPECT_FALSE(row.facts.meaning.empty()) << name;
      EXPECT_EQ(row.type == KeywordType::code, !row.facts.codes.empty()) << name;
      EXPECT_TRUE(row.facts.refusal.empty() || !row.facts.range.text().empty()) << name << " can refuse nothing";
      for (const CodeName& code : row.facts.codes) {
        EXPECT_TRUE(!code.code || row.facts.range.contains(*code.code) || row.facts.refusal.empty()) << name;
      }
      if (row.isRequired() || row.isLeftOutByDefault()) continue;
      const SetupValue value = defaultSetupValue(row);
      const auto* integer = std::get_if<std::int32_t>(&value);
      const auto* real = std::get_if<double>(&value);
      EXPECT_TRUE(integer == nullptr || row.facts.range.text().empty() || row.facts.range.contains(*integer)) << name;
      EXPECT_TRUE(real == nullptr || row.facts.range.text().empty() || row.facts.range.contains(*real)) << name;
    }
  }
}

TEST(SetupSchema, NamesOfItemSectionsLoseTheirNumber) {
  const std::pair<const char*, const char*> cases[] = {
      {"PARAMETER_1", "PARAMETER_n"},        {"PARAMETER_120", "PARAMETER_n"}, {"PARAMETER_01", "PARAMETER_01"},
      {"PARAMETER_", "PARAMETER_"},          {"PARAMETER_1a", "PARAMETER_1a"}, {"SIMBATCH", "SIMBATCH"},
      {"OUTPUT_MEASURES", "OUTPUT_MEASURES"}};
  for (const auto& [name, pattern] : cases) EXPECT_EQ(itemPattern(name), pattern);
}

TEST(SetupReference, TheManualSaysWhatTheProgramReads) {
  const std::string path = std::string(MIREVO_SOURCE_DIR) + "/docs/setup-reference.md";
  std::string reason;
  if (std::getenv("MIREVO_WRITE_DOCS") != nullptr) {
    ASSERT_TRUE(writeByUnlinkAndCreate(path, setupReference(), 0644, reason)) << reason;
  }
  EXPECT_EQ(readTextFile(path, reason).value_or(reason), setupReference())
      << "a keyword row has changed: MIREVO_WRITE_DOCS=1 build/release/run_tests "
         "--gtest_filter=SetupReference.* writes the page anew";
}

TEST(KeywordHelp, EveryKeywordIsFoundByItsNameWithMoreOrLessOfItsSection) {
  for (const std::string& name : keywordNames()) {
    const std::string help = keywordHelp(name);
    EXPECT_TRUE(help.starts_with(name + "\n  Meaning: ")) << help;
    EXPECT_EQ(help.find(']'), std::string::npos) << "a link stays: " << help;
    for (const std::string_view line : splitLines(help)) EXPECT_TRUE(line == name || line.size() <= 80U) << line;
    const std::string inTwo = name.substr(name.find('/') + 1);
    EXPECT_NE(("\n" + keywordHelp(toLowerAscii(inTwo))).find("\n" + name + "\n"), std::string::npos) << inTwo;
  }
  EXPECT_EQ(keywordHelp("parameter_7/initial_value"), keywordHelp("MODEL_PARAMETERS/PARAMETER_n/Initial_Value"));
  EXPECT_NE(keywordHelp("Weight").find("\n\n"), std::string::npos) << "two sections have it";
  EXPECT_TRUE(keywordHelp("STOPPING_CRITERIA").find("STOPPING_CRITERIA/Max_No_Evaluations\n") != std::string::npos);
  for (const char* unknown : {"", "/", "Value", "SIMPARAM/Title"}) EXPECT_EQ(keywordHelp(unknown), "") << unknown;
  EXPECT_EQ(namesLike("SIMPARAM/Titel"), std::vector<std::string>{"Title"});
  EXPECT_EQ(namesLike("e").size(), 4U);
  EXPECT_EQ(namesLike("max_no_evaluation").front(), "OPTIMISATION_ALGORITHM/STOPPING_CRITERIA/Max_No_Evaluations");
}

}  // namespace
}  // namespace mirevo
