#include "algorithms/bayes/posterior_words.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

TEST(PosteriorWords, DoNotTellSizesThatRoundingMakes) {
  EXPECT_EQ(rHatText(1.0123), "1.01");
  EXPECT_EQ(rHatText(1.0123, 4), "1.012");
  EXPECT_EQ(rHatText(1.3e7, 4), "over 1000");
  EXPECT_EQ(rHatText(INFINITY, 4), "not finite: chains stand still");
}

TEST(PosteriorWords, SayWhatIsWorstAndWhatToDo) {
  const double nan = std::nan("");
  const ConvergenceLimits limits{1.05, 400.0};
  const std::vector<DimensionFigures> good{{"a", 1.01, 500.0, 0.2}, {"b", 1.05, 400.0, 1.2}};
  EXPECT_EQ(convergenceWords(good, limits).state, Convergence::reached);
  EXPECT_THAT(adviceWords(good, limits, {}), IsEmpty()) << "nothing is to be done";

  const std::vector<DimensionFigures> few{{"a", 1.01, 399.0, 0.2}, {"b", 1.0, 20.0, 1.2}, {"c", 1.0, 900.0, 1.0}};
  const ConvergenceWords ofFew = convergenceWords(few, limits);
  EXPECT_EQ(ofFew.state, Convergence::fewDraws);
  EXPECT_THAT(ofFew.findings,
              ElementsAre(HasSubstr(
                  "R-hat is at most 1.05 for all parameters, but the effective sample size is below 400 for b "
                  "(20), a (399). Means")));

  const std::vector<DimensionFigures> apart{
      {"a", 1.2, 9.0, 0.2}, {"b", 1.0, 20.0, 0.95}, {"c", nan, nan, 0.4}, {"d", 1.7e15, 900.0, 0.95}};
  const ConvergenceWords ofApart = convergenceWords(apart, limits);
  EXPECT_EQ(ofApart.state, Convergence::apart);
  EXPECT_THAT(ofApart.findings,
              ElementsAre(HasSubstr("above 1.05 for c (not known), d (over 1000), a (1.2), and the effective sample "
                                    "size is below 400 for b (20). The quantiles")));
  const std::vector<std::vector<double>> matrix{
      {1.0, 0.1, -0.95, 0.2}, {0.1, 1.0, nan, 0.69}, {-0.95, nan, 1.0, 0.0}, {0.2, 0.69, 0.0, 1.0}};
  EXPECT_THAT(
      adviceWords(apart, limits, matrix),
      ElementsAre(HasSubstr("b cannot be told"), HasSubstr("d cannot be told"), HasSubstr("a and c trade off")));

  EXPECT_FALSE(acceptanceWords(nan));
  EXPECT_FALSE(acceptanceWords(0.05));
  EXPECT_TRUE(acceptanceWords(0.049));
  // A prior of orders of magnitude counts by its logarithms: 1 to 10 of 1 to 1000 is a third. A uniform one does not.
  const std::vector<double> narrow{1.0, 5.0, 10.0};
  EXPECT_NEAR(narrowingOf(narrow, std::vector<double>{1.0, 31.6, 1000.0}), 1.0 / 3.0, 1e-12);
  EXPECT_NEAR(narrowingOf(narrow, std::vector<double>{1.0, 500.0, 1000.0}), 9.0 / 999.0, 1e-12);
  EXPECT_NEAR(narrowingOf(narrow, std::vector<double>{-8.0, 31.6, 1000.0}), 9.0 / 1008.0, 1e-12);
  EXPECT_NEAR(narrowingOf(std::vector<double>{2.0, 2.5, 3.0}, std::vector<double>{2.0, 4.0, 8.0}), 1.0 / 6.0, 1e-12);
  EXPECT_TRUE(std::isnan(narrowingOf(narrow, std::vector<double>{4.0, 4.0, 4.0})));
}

}  // namespace
}  // namespace mirevo
