#include "run/results/validation_table.h"

#include <cmath>

#include <gmock/gmock.h>

namespace mirevo {
namespace {

TEST(ValidationTable, TheBestTenthHoldsEachSetOnce) {
  std::vector<OutputMeasure> measures(2);
  measures[0].interfaceType = InterfaceType::measureFile;
  measures[1].name = "flow";
  const std::vector<ValidationPeriod> periods{{"early"}, {"late"}};
  std::vector<JudgedEvaluation> evaluations;
  for (int i = 1; i <= 21; ++i) {
    evaluations.push_back({i, 0.5 * i, {1.0 * i}, {-1.0, 0.5 * i}, {10.0 * i, i == 2 ? NAN : 100.0 * i}});
  }
  evaluations.push_back(evaluations.front());  // the final model run
  evaluations.back().number = 22;
  evaluations.push_back({23, NAN, {0.0}, {0.0, 0.0}, {0.0, 0.0}});
  const ValidationTable table = validationTable(measures, periods, evaluations, 1);
  EXPECT_EQ(table.tenth, 3U);
  EXPECT_EQ(table.count, 21U);
  EXPECT_THAT(
      validationLines(table),
      testing::ElementsAre(
          "Calibration and validation, evaluation 1 and the best tenth, 3 of 21 different sets by their aggregates:",
          "   Output measure                 Calibration          early           late",
          "   flow                                   0.5             10            100",
          "     least of the best tenth              0.5             10            100",
          "     median of the best tenth               1             20            200",
          "     largest of the best tenth            1.5             30            300"));
  evaluations[0].pairs = {{7, 0}, {3, 4}};
  evaluations[1].pairs = {{7, 0}, {5, 2}};
  const char* const kLack =
      "flow in late: of 3 of 7 observations in evaluation 1, of 3 to 5 in the best tenth; "
      "in 2 of 2 evaluations some have no simulated value";
  EXPECT_THAT(validationTable(measures, periods, evaluations, 1).lacks, testing::ElementsAre(kLack));
  evaluations[0].pairs.clear();
  EXPECT_THAT(validationTable(measures, periods, evaluations, 1).lacks,
              testing::ElementsAre(
                  testing::HasSubstr("that is not known in evaluation 1, which an earlier run made, of 5 in ")));
  for (JudgedEvaluation& evaluation : evaluations) evaluation.aggregate = 0.0;
  EXPECT_EQ(validationTable(measures, periods, evaluations, 1).tenth, 0U) << "no evaluation is better than another";
  EXPECT_TRUE(validationLines(validationTable(measures, periods, evaluations, 99)).empty());
}

}  // namespace
}  // namespace mirevo
