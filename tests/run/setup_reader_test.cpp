#include "run/setup_reader.h"

#include <gmock/gmock.h>

#include "run/setup_fixture.h"

namespace mirevo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using SetupReaderTest = SetupFixture;

TEST_F(SetupReaderTest, FillsTheConfigurationOfAnOptimisation) {
  const RunConfig config = read();
  EXPECT_EQ(config.setupName, "setup");
  EXPECT_EQ(config.setupFolder, folder_);
  EXPECT_EQ(config.title, "Upper catchment") << "trailing blanks";
  EXPECT_EQ(config.batchItems.at(0).batchFileName, folder_ + "/model/run.sh") << "backslash";
  EXPECT_EQ(config.baseFolder, folder_ + "/model");
  ASSERT_EQ(config.parameters.size(), 3U);
  EXPECT_THAT(config.parameters[0].keyLines, ElementsAre("soil", "depth"));
  EXPECT_EQ(config.parameters[0].transformationType, TransformationType::logarithmic);
  EXPECT_EQ(config.parameters[0].lowerBound, 100.0) << "an integer where a real is wanted";
  EXPECT_EQ(config.parameters[1].initialValue, 0.31) << "D exponent";
  EXPECT_EQ(config.parameters[2].idValue, 1.5e-35);
  EXPECT_EQ(config.constraints.at(0).rightEquation, "Depth");
  EXPECT_EQ(config.period.start, (DateRecord{2001, 1, 31}));
  EXPECT_EQ(config.period.end, (DateRecord{2003, 12, 31, 24})) << "a date between quotes";
  EXPECT_EQ(config.measures.at(0).simulation.itemNo, 2);
  EXPECT_EQ(config.measures.at(0).observation.fileName, folder_ + "/gauge.csv");
  EXPECT_EQ(config.measures.at(1).measurementNo, 3);
  EXPECT_THAT(config.objectives.at(0).measures, ElementsAre(0U));
  EXPECT_FALSE(config.objectives[0].standardDeviation.has_value());
  EXPECT_EQ(config.measureFile, folder_ + "/model/measures.txt");
  EXPECT_EQ(config.optimisation.pse.populationSize, 20);
  EXPECT_EQ(config.optimisation.simplex.pointCount, 5);
  EXPECT_EQ(config.randomSeed, -77);
  EXPECT_EQ(config.simultaneousSimulations, 4);
  EXPECT_EQ(config.plannedEvaluations(), 500);
}

TEST_F(SetupReaderTest, PlansTheEvaluationsOfEachTask) {
  const struct {
    std::vector<Edit> edits;
    int planned;
  } cases[] = {
      {{{"Option = 2", "Option = 0"}, {"Scenario_Type = 1", "Scenario_Type = 0"}}, 1},
      {{{"Option = 2", "Option = 0"}}, 1},
      {{{"Option = 2", "Option = 1"}}, 5},
      {{{"Option = 2", "Option = 1"}, {"Differencing = 1", "Differencing = 0"}}, 3},
      {{{"Option = 2", "Option = 3"}}, 200},
      {{{"Option = 2", "Option = 4"}}, 0},
  };
  for (const auto& row : cases) EXPECT_EQ(read(row.edits).plannedEvaluations(), row.planned) << row.edits[0].to;
}

}  // namespace
}  // namespace mirevo
