// What is found in the files of a run: reasons of failures, and the covariance in the lines of a sensitivity analysis.
#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/text.h"
#include "report/covariance_lines.h"
#include "report/failure_reasons.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kFailures = R"(# Failed evaluations of basin

Evaluation No. 3
   run.sh exited with code 3
   a = 1
   Last output:
   | one
   | two

Evaluation No. 7 (results not readable)
   /x/basin_Process2/out.csv: Evaluation No. 1
   a = 2

Evaluation No. 12
   /x/basin_Process17/out.csv: Evaluation No. 4
   a = 3

Evaluation No. 13
)";

TEST(FailureReasons, AreGroupedWhereTheyDifferInNumbersAlone) {
  const auto reasons = readFailureReasons(kFailures, "basin");
  ASSERT_EQ(reasons.size(), 2U);  // of the last one the reason was not written yet
  EXPECT_EQ(reasons[0].count, 2);
  EXPECT_EQ(reasons[0].reason, "/x/basin_Process2/out.csv: Evaluation No. 1");
  EXPECT_EQ(reasons[0].example, "Evaluation 7: /x/basin_Process2/out.csv: Evaluation No. 1");
  EXPECT_EQ(reasons[1].count, 1);
  EXPECT_EQ(reasons[1].example, "Evaluation 3: run.sh exited with code 3\none\ntwo");
  EXPECT_THAT(readFailureReasons(kFailures, "other"), IsEmpty());
  EXPECT_THAT(readFailureReasons("", "basin"), IsEmpty());
}

std::vector<std::string> covarianceLines() {
  std::vector<std::string> lines;
  for (const std::string_view line : splitLines(R"(Normal termination
Parameter covariance: 10 observations, 2 parameters, 8 degrees of freedom
Warning: Parameter snow, melt is left out of the covariance matrix: its column is zero
Standard error of a residual: 0.5

Parameter (model scale)          Value Std. deviation     95 % lower     95 % upper
Correlation of it                    1            0.5           -1.5            2.5
k                                2e-05          1e-06            NaN              4

Covariance (search scale) Correlation of it              k
Correlation of it                      0.25            0.1
k                                       0.1              1

Correlation       Correlation of it              k
Correlation of it                 1           -0.2
k                              -0.2              1)")) {
    lines.emplace_back(line);
  }
  return lines;
}

TEST(CovarianceLines, AreReadBackByTheParametersNames) {
  const std::vector<std::string> names{"Correlation of it", "snow, melt", "k"};
  const auto lines = covarianceLines();
  const auto report = findCovariance(lines, names);
  ASSERT_TRUE(report.has_value());
  EXPECT_THAT(report->names, ElementsAre("Correlation of it", "k"));
  EXPECT_THAT(report->leftOut, ElementsAre("snow, melt"));
  EXPECT_THAT(report->estimate, ElementsAre(1.0, 2e-5));
  EXPECT_THAT(report->upper95, ElementsAre(2.5, 4.0));
  EXPECT_TRUE(std::isnan(report->lower95[1]));
  EXPECT_THAT(report->correlation, ElementsAre(ElementsAre(1.0, -0.2), ElementsAre(-0.2, 1.0)));
  for (std::size_t count = 0; count < lines.size(); ++count) {  // cut off anywhere: all of it or nothing
    EXPECT_FALSE(findCovariance(std::span(lines).first(count), names).has_value()) << count;
  }
}

}  // namespace
}  // namespace mirevo
