#include "run/setup/keyword_table.h"

#include <cstdlib>
#include <set>

#include <gtest/gtest.h>

#include "common/files.h"
#include "run/setup/setup_reference.h"
#include "run/setup/setup_value.h"

namespace mirevo {
namespace {

TEST(KeywordTable, IsSound) {
  std::set<std::string> seen;
  for (const KeywordRow& row : keywordTable()) {
    const std::string name = std::string(row.section) + " " + std::string(row.name);
    EXPECT_TRUE(seen.insert(name).second) << name << " stands twice";
    EXPECT_NE(findSection(row.section), nullptr) << name;
    EXPECT_EQ(findKeyword(row.section, row.name), &row) << name << ": a section's rows must stand side by side";
    EXPECT_FALSE(row.meaning.empty()) << name;
    if (row.isRequired() || row.isLeftOutByDefault()) continue;
    const SetupValue value = defaultSetupValue(row);
    const auto* integer = std::get_if<std::int32_t>(&value);
    const auto* real = std::get_if<double>(&value);
    EXPECT_TRUE(integer == nullptr || row.range.contains(*integer)) << name;
    EXPECT_TRUE(real == nullptr || row.range.contains(*real)) << name;
  }
}

// The settings structs carry defaults, too: for callers that read no setup.
TEST(KeywordTable, DefaultsAreThoseOfTheSettings) {
  RunConfig config;
  const RunConfig untouched;
  for (const KeywordRow& row : keywordTable()) {
    const bool isOfSearch = row.section.starts_with("OPTIMISATION_ALGORITHM/");
    if (isOfSearch && !row.isRequired() && !row.isLeftOutByDefault()) row.store(config, 0, defaultSetupValue(row));
  }
  const OptimisationConfig& read = config.optimisation;
  const OptimisationConfig& own = untouched.optimisation;
  EXPECT_EQ(read.dds.perturbation, own.dds.perturbation);
  EXPECT_EQ(read.pse.reflectionProbability, own.pse.reflectionProbability);
  EXPECT_EQ(read.pse.contractionProbability, own.pse.contractionProbability);
  EXPECT_EQ(read.stopping.loopsConvergence, own.stopping.loopsConvergence);
  EXPECT_EQ(read.stopping.minChange, own.stopping.minChange);
  EXPECT_EQ(read.surrogate.samplingRate, own.surrogate.samplingRate);
  EXPECT_EQ(read.surrogate.neighbourhoodSize, own.surrogate.neighbourhoodSize);
  EXPECT_EQ(read.surrogate.initialGenerations, own.surrogate.initialGenerations);
  EXPECT_EQ(read.initialSample.generation, own.initialSample.generation);
}

TEST(KeywordTable, NamesOfItemSectionsLoseTheirNumber) {
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
      << "the keyword table has changed: MIREVO_WRITE_DOCS=1 build/release/run_tests "
         "--gtest_filter=SetupReference.* writes the page anew";
}

}  // namespace
}  // namespace mirevo
