#include "run/tasks/distribution_reading.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "run/setup_fixture.h"
#include "run/tasks/uncertainty_task.h"

namespace mirevo {
namespace {

class DistributionReading : public SetupFixture {
 protected:
  DistributionReading() {
    folder_.write("sample.dat", "# of three gauges\n0.2 0.4\n\n0.25\t0.3\n");
    folder_.write("bad.dat", "0.2\nabc\n");
    folder_.write("table.dat", "# a table\nNumber\tRate\n1\t0.2\n2\t0.5\n3\t0.6\n");
    folder_.write("same.dat", "1 1 1 1 2\n");
    folder_.write("cor.dat",
                  "# Correlation\nParameter\tRate\tOther\tDepth\nRate\t1\t0.1\t-0.6\nOther\t0.1\t1\tNaN\n"
                  "Depth\t-0.6\tNaN\t1\n");
    folder_.write("half.dat", "Parameter\tRate\tDepth\nRate\t1\t-0.6\nDepth\t0.6\t1\n");
    folder_.write("nan.dat", "Parameter\tRate\tDepth\nRate\t1\tNaN\nDepth\tNaN\t1\n");
    folder_.write("none.dat", "1\t0.5\n0.5\t1\n");
    folder_.write("open.dat", "Parameter\tRate\tDepth\nRate\t1\t0.3\nDepth\t0.3\t1");
    folder_.write("short.dat", "Parameter\tRate\tDepth\nRate\t1\t0.3\nDepth\t0.3\n");
    folder_.write("alone.dat", "Parameter\tRate\nRate\t1\n");
    folder_.write("twice.dat", "Parameter\tRate\tDepth\nRate\t1\t0.3\nRate\t1\t0.5\nDepth\t0.3\t1\n");
    folder_.write("cut.dat", "x\ty\n1\t2\n3\n2\t4");
  }

  /// The setup of an uncertainty analysis with `keywords` in the section of the second parameter, Rate, which is
  /// logarithmic from 0.1 to 1, and `correlations` in a section of that name.
  std::string withDistribution(const std::string& keywords, const std::string& correlations = {}) const {
    std::string text = edited("Option = 2 => 3 & Lower_Bound = 0.0 => Lower_Bound = 0.1\nTransformation_Type = 1");
    const std::string old = "Mean_Value = 0.5\n      Standard_Deviation = 0.1\n";
    text.replace(text.find(old), old.size(), keywords + "\n");
    const std::size_t end = text.find("[/UNCERTAINTY_ESTIMATION]");
    if (!correlations.empty()) text.insert(end, "[CORRELATIONS]\n" + correlations + "\n[/CORRELATIONS]\n");
    return text;
  }

  ParameterDistributions readText(const std::string& text) {
    RunLog log;
    const RunConfig config = readSetup(folder_ / "setup.kdx", text, log);
    return dynamic_cast<const UncertaintyTask&>(*config.task).settings.distributions;
  }
};

std::string pair(const std::string& first, const std::string& second, const std::string& value) {
  return "TqSEKdxListItemCount = 1\n[PAIR_1]\nFirst_Parameter = '" + first + "'\nSecond_Parameter = '" + second +
         "'\nCorrelation = " + value + "\n[/PAIR_1]";
}

TEST_F(DistributionReading, EveryKindIsReadOnBothScales) {
  struct Case {
    std::string keywords;
    double p;
    double x;  ///< of Rate, on the model scale
  };
  const double z = 1.6448536269514722;
  const Case cases[] = {
      {"Mean_Value = -1\nStandard_Deviation = 0.2", 0.95, std::exp(-1 + 0.2 * z)},
      {"Distribution = 'Truncated Normal'\nDistribution_Scale = 'model'\nMean_Value = 0.1\nStandard_Deviation = 0.05",
       0.5, 0.1 + 0.05 * 0.6744897501960817},
      {"Distribution = 'lognormal'\nDistribution_Scale = 'model'\nLog_Mean = -1\nLog_Standard_Deviation = 0.2", 0.95,
       std::exp(-1 + 0.2 * z)},
      {"Distribution = 'uniform'\nDistribution_Scale = 'model'", 0.5, 0.55},
      {"Distribution = 'uniform'\nDistribution_Scale = 'search'", 0.5, std::sqrt(0.1)},
      {"Distribution = 'log-uniform'\nDistribution_Scale = 'model'\nMaximum_Value = 0.4", 0.5, 0.2},
      {"Distribution = 'triangular'\nDistribution_Scale = 'model'\nMode_Value = 0.1\nMaximum_Value = 0.5", 0.75, 0.3},
      {"Distribution = 'beta'\nDistribution_Scale = 'model'\nAlpha = 1\nBeta = 2\nMinimum_Value = 0\nMaximum_Value = 1",
       0.75, 0.5},
      {"Distribution = 'discrete'\nDistribution_Scale = 'model'\nValues = 0.3, 0.7, 0.5\nWeights = 1, 2, 1", 0.9, 0.7},
      {"Distribution = 'values'\nDistribution_Scale = 'model'\nValues_File = 'sample.dat'", 0.5, 0.275},
      {"Distribution = 'values'\nDistribution_Scale = 'model'\nValues_File = 'table.dat'\nValues_Column = 'Rate'", 0.25,
       0.35}};
  for (const auto& [keywords, p, x] : cases) {
    SCOPED_TRACE(keywords);
    const std::string text = withDistribution(keywords);
    ASSERT_EQ(failureOf(text), "");
    const ParameterDistributions distributions = readText(text);
    ASSERT_EQ(distributions.size(), 2U);
    EXPECT_NEAR(std::exp(distributions.setAt(std::vector{0.5, p})[1]), x, 1e-12);
    EXPECT_EQ(distributions.setAt(std::vector{0.5, p})[0], 6);
  }
  EXPECT_THAT(logOfText(withDistribution("Distribution = 'uniform'\nDistribution_Scale = 'model'\nAlpha = 3")),
              HasSubstr("Alpha: not read: Distribution = 'uniform' does not use it"));
}

TEST_F(DistributionReading, RefusesWhatCannotBe) {
  const std::string model = "\nDistribution_Scale = 'model'\n";
  struct Case {
    std::string keywords;
    std::string message;
    std::string detail;
  };
  const Case cases[] = {
      {"Distribution = 'gamma'", "Unable to read keyword", "Distribution: expected one of the names 'normal'"},
      {"Mean_Value = 1", "Unable to read keyword", "Standard_Deviation: the keyword is missing"},
      {"Mean_Value = 1\nStandard_Deviation = 0", "Standard deviation in uncertainty estimation invalid", ""},
      {"Distribution = 'uniform'", "Scale of the distribution missing",
       "Distribution_Scale: expected 'model' or 'search', as Rate is logarithmic"},
      {"Mean_Value = 1\nStandard_Deviation = 1" + model,
       "Distribution of a logarithmic parameter has values that are not above 0", "expected 'truncated normal'"},
      {"Distribution = 'beta'\nAlpha = 1" + model, "Unable to read keyword", "Beta: the keyword is missing"},
      {"Distribution = 'beta'\nAlpha = 0\nBeta = 1" + model, "Shape of the distribution invalid",
       "Alpha: expected greater than 0, found 0"},
      {"Distribution = 'uniform'\nMinimum_Value = 2" + model, "Limits of the distribution invalid",
       "expected a minimum below the maximum, found 2 and 1, one of them the parameter's bound"},
      {"Distribution = 'uniform'\nMinimum_Value = -1" + model, "Limits of the distribution invalid",
       "expected a minimum of at least 0, as there is no logarithm of others, found -1"},
      {"Distribution = 'log-uniform'\nMinimum_Value = 0" + model, "Limits of the distribution invalid",
       "expected a minimum above 0"},
      {"Distribution = 'truncated normal'\nMean_Value = 90\nStandard_Deviation = 1" + model,
       "Limits of the distribution invalid", "the normal distribution has no values from 0.1 to 1"},
      {"Distribution = 'triangular'\nMode_Value = 3" + model, "Mode of the distribution invalid",
       "expected 0.1 to 1, found 3"},
      {"Distribution = 'discrete'\nValues = 1, -1" + model, "Values of the distribution invalid",
       "expected values above 0, as Rate is logarithmic, found -1"},
      {"Distribution = 'discrete'\nValues = 1, 2\nWeights = 1" + model, "Weights of the distribution invalid",
       "expected 2, one for each value, found 1"},
      {"Distribution = 'discrete'\nValues = 1, 2\nWeights = 1, -1" + model, "Weights of the distribution invalid",
       "expected 0 or more, found -1"},
      {"Distribution = 'discrete'\nValues = 1, 2\nWeights = 0, 0" + model, "Weights of the distribution invalid", ""},
      {"Distribution = 'values'\nValues_File = 'absent.dat'" + model, "Unable to open absent.dat", "Values_File: "},
      {"Distribution = 'values'\nValues_File = 'bad.dat'" + model, "Values of the distribution invalid",
       "bad.dat:2: expected a number, found \"abc\""},
      {"Distribution = 'values'\nValues_File = 'table.dat'\nValues_Column = 'Rat'" + model,
       "Values of the distribution invalid", "did you mean \"Rate\"?"},
      {"Distribution = 'values'\nValues_File = 'cut.dat'\nValues_Column = 'x'" + model,
       "Values of the distribution invalid",
       "cut.dat:3: expected 2 cells separated by tabs, as in the header row, found 1"},
      {"Distribution = 'values'\nValues_File = 'same.dat'" + model, "Values of the distribution invalid",
       "too many of the values are equal"}};
  for (const auto& [keywords, message, detail] : cases) {
    const std::string error = failureOf(withDistribution(keywords));
    EXPECT_THAT(error, StartsWith("Error: " + message)) << keywords;
    EXPECT_THAT(error, AllOf(HasSubstr(detail), HasSubstr("\nsetup.kdx:"))) << keywords;
  }
}

TEST_F(DistributionReading, CorrelationsComeFromAFileAndFromPairs) {
  const std::string normal = "Mean_Value = 0.5\nStandard_Deviation = 0.1";
  const auto correlation = [&](const std::string& keywords) {
    const std::string text = withDistribution(normal, keywords);
    EXPECT_EQ(failureOf(text), "") << keywords;
    const auto copula = readText(text).copula();
    return copula ? copula->correlations()[0][1] : 0.0;
  };
  EXPECT_EQ(correlation(pair("Depth", "rate", "0.25")), 0.25);
  EXPECT_EQ(correlation("Correlation_File = 'cor.dat'"), -0.6);
  EXPECT_EQ(correlation("Correlation_File = 'open.dat'"), 0.3) << "a last line without an end";
  EXPECT_EQ(correlation("Correlation_File = 'cor.dat'\n" + pair("Rate", "Depth", "0.1")), 0.1);
  EXPECT_EQ(correlation(pair("Rate", "Depth", "0")), 0.0);
  EXPECT_DOUBLE_EQ(correlation("Correlation_Type = 'rank'\n" + pair("Rate", "Depth", "0.5")), 2 * std::sin(M_PI / 12));
  struct Case {
    std::string keywords;
    std::string message;
    std::string detail;
  };
  const Case cases[] = {
      {pair("Depht", "Rate", "0.2"), "Unknown parameter in correlations", "found \"Depht\", did you mean \"Depth\"?"},
      {pair("Rate", "Rate", "0.2"), "Correlation of parameters invalid", "expected another parameter than Rate"},
      {pair("Depth", "Rate", "1.2"), "Correlation of parameters invalid", "expected -1 to 1, found 1.2"},
      {pair("Depth", "Rate", "1"), "Correlations of the parameters are not positive definite",
       "the smallest eigenvalue of their matrix is 0"},
      {"TqSEKdxListItemCount = 2\n[PAIR_1]\nFirst_Parameter = 'Depth'\nSecond_Parameter = 'Rate'\nCorrelation = "
       "0.5\n[/PAIR_1]\n[PAIR_2]\nFirst_Parameter = 'Rate'\nSecond_Parameter = 'Depth'\nCorrelation = "
       "-0.5\n[/PAIR_2]",
       "Correlation of parameters given twice", " have 0.5 at setup.kdx:"},
      {"Correlation_File = 'absent.dat'", "Unable to open absent.dat", ""},
      {"Correlation_File = 'none.dat'", "Correlation file invalid", "such as \"Depth\"; found none of them"},
      {"Correlation_File = 'short.dat'", "Correlation file invalid", "short.dat:3: expected 3 cells separated by tabs"},
      {"Correlation_File = 'alone.dat'", "Correlation file invalid", "such as \"Depth\"; found \"Rate\" alone"},
      {"Correlation_File = 'twice.dat'", "Correlation file invalid", "\"Rate\" is the name of several rows"},
      {"Correlation_File = 'half.dat'", "Correlation file invalid",
       "Rate and Depth: expected 0.6, as in the other half of the table, found -0.6"},
      {"Correlation_File = 'nan.dat'", "Correlation file invalid",
       "Depth and Rate: expected a correlation, from -1 to 1, found \"NaN\""}};
  for (const auto& [keywords, message, detail] : cases) {
    const std::string error = failureOf(withDistribution(normal, keywords));
    EXPECT_THAT(error, StartsWith("Error: " + message)) << keywords;
    EXPECT_THAT(error, AllOf(HasSubstr(detail), HasSubstr("\nsetup.kdx:"))) << keywords;
  }
}

}  // namespace
}  // namespace mirevo
