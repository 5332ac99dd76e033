#include "run/access/setup_schema.h"

#include <cstdlib>
#include <set>

#include <gtest/gtest.h>

#include "algorithms/searches/dds.h"
#include "algorithms/searches/pse.h"
#include "common/files.h"
#include "run/access/setup_value.h"
#include "run/setup/run_keywords.h"
#include "run/setup/setup_reference.h"
#include "run/tasks/optimisation_task.h"

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

/// Fills settings with the defaults of their keywords.
template <class Settings>
Settings withDefaults(const BoundSection& section, Settings& settings) {
  for (const KeywordRow& row : section.row->keywords) {
    if (!row.isRequired() && !row.isLeftOutByDefault()) row.store(section.settings, defaultSetupValue(row));
  }
  return settings;
}

// The settings structs carry defaults, too: for callers that read no setup.
TEST(SetupSchema, DefaultsAreThoseOfTheSettings) {
  StoppingCriteria stopping{.loopsConvergence = -1, .minChange = -1};
  withDefaults({stoppingSection(), stopping}, stopping);
  EXPECT_EQ(stopping.loopsConvergence, StoppingCriteria{}.loopsConvergence);
  EXPECT_EQ(stopping.minChange, StoppingCriteria{}.minChange);
  SurrogateSettings surrogate{-1, -1, SurrogateModelType{-1}, -1};
  SurrogateSection filled{surrogate};
  withDefaults({surrogateSection(), filled}, surrogate);
  EXPECT_EQ(surrogate.samplingRate, SurrogateSettings{}.samplingRate);
  EXPECT_EQ(surrogate.neighbourhoodSize, SurrogateSettings{}.neighbourhoodSize);
  EXPECT_EQ(surrogate.modelType, SurrogateSettings{}.modelType);
  EXPECT_EQ(surrogate.initialGenerations, SurrogateSettings{}.initialGenerations);
  PseMethod pse;
  pse.settings = {0, -1.0, -1.0};
  withDefaults(pse.section(), pse.settings);
  EXPECT_EQ(pse.settings.reflectionProbability, PseSettings{}.reflectionProbability);
  EXPECT_EQ(pse.settings.contractionProbability, PseSettings{}.contractionProbability);
  DdsMethod dds;
  dds.settings.perturbation = -1.0;
  withDefaults(dds.section(), dds.settings);
  EXPECT_EQ(dds.settings.perturbation, DdsSettings{}.perturbation);
}

TEST(SetupSchema, NamesOfItemSectionsLoseTheirNumber) {
  const struct {
    const char* name;
    const char* pattern;
  } cases[] = {{"PARAMETER_1", "PARAMETER_n"},        {"PARAMETER_120", "PARAMETER_n"},
               {"PARAMETER_01", "PARAMETER_01"},      {"PARAMETER_", "PARAMETER_"},
               {"PARAMETER_1a", "PARAMETER_1a"},      {"SIMBATCH", "SIMBATCH"},
               {"OUTPUT_MEASURES", "OUTPUT_MEASURES"}};
  for (const auto& row : cases) EXPECT_EQ(itemPattern(row.name), row.pattern);
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

}  // namespace
}  // namespace mirevo
