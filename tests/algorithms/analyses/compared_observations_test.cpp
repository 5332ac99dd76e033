#include "algorithms/analyses/compared_observations.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

EvaluationResult runOf(int number, std::size_t pairs) {
  EvaluationResult result;
  result.number = number;
  if (pairs > 0) result.pairs.push_back({.measure = 1, .count = pairs});
  return result;
}

TEST(ComparedObservations, OfRunsThatAreTakenTogetherAreToldWhereTheyDiffer) {
  const std::vector<std::string> measures{"level", "flow"};
  EvaluationResult failed = runOf(2, 7);
  failed.fail({});
  // The third run has the pairs of the first.
  const std::vector<EvaluationResult> same{runOf(1, 40), failed, runOf(3, 0)};
  EXPECT_THAT(mixedObservations(same, measures), IsEmpty());
  EXPECT_THAT(mixedObservations({}, measures), IsEmpty());
  std::vector<EvaluationResult> mixed = same;
  mixed.push_back(runOf(4, 20));
  EXPECT_THAT(mixedObservations(mixed, measures),
              ElementsAre("flow: 1 of 3 runs is judged by other observations than the first successful run (evaluation "
                          "4 has 20 pairs of simulated and observed values, the first successful run 40), and what "
                          "depends on the parameters may be which observations are used. A model that stops early "
                          "should count as failed"));
}

}  // namespace
}  // namespace mirevo
