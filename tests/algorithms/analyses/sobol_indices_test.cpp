#include "algorithms/analyses/sobol_indices.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/analyses/sobol_report.h"
#include "algorithms/analyses/sobol_settings.h"
#include "algorithms/sobol_functions.h"

namespace mirevo {
namespace {

constexpr double kNoValue = std::numeric_limits<double>::quiet_NaN();

/// Values of a function for a design; `fails(i, set)` tells which runs fail.
struct SobolDesignRun {
  SobolDesign design;
  UnitProblem problem;
  ReplicateBootstrap bootstrap{0, none()};
  std::vector<ParameterSet> sets;
  std::vector<double> values;

  SobolDesignRun(const SobolFunction& function, std::size_t rows, bool hasSecondOrder = false,
                 std::vector<SobolFactor> groups = {})
      : problem(function.first.size()) {
    if (!groups.empty()) problem.factors = std::move(groups);
    design = {rows, problem.factors.size(), hasSecondOrder};
    UniformGenerator random(1);
    bootstrap = ReplicateBootstrap(500, random);
    sets = sobolSets(design, problem.factors, problem.distributions, random);
    for (const ParameterSet& set : sets) values.push_back(function.value(set));
  }
  SobolIndices indices() const { return sobolIndices(design, values, bootstrap, bootstrap.size()); }

  static UniformGenerator& none() {
    static UniformGenerator random(1);
    return random;
  }
};

void expectIndices(const SobolIndices& found, const SobolFunction& function, double tolerance) {
  for (std::size_t j = 0; j < function.first.size(); ++j) {
    EXPECT_NEAR(found.first[j].value, function.first[j], tolerance) << function.name << " S" << j + 1;
    EXPECT_NEAR(found.total[j].value, function.total[j], tolerance) << function.name << " ST" << j + 1;
    EXPECT_NEAR(found.interactions[j].value, function.total[j] - function.first[j], 2 * tolerance) << j + 1;
  }
}

TEST(SobolDesign, ExchangesTheColumnsOfOneFactorBetweenTheTwoMatrices) {
  const UnitProblem problem(3);
  const std::vector<SobolFactor> factors{{"x1 and x3", {0, 2}}, {"x2", {1}}};
  const SobolDesign design{.rows = 40, .factors = 2, .hasSecondOrder = true};
  UniformGenerator random(5);
  const std::vector<ParameterSet> sets = sobolSets(design, factors, problem.distributions, random);
  ASSERT_EQ(sets.size(), 240U);
  for (std::size_t row = 0; row < 40; ++row) {
    const ParameterSet& a = sets[design.ofA(row)];
    const ParameterSet& b = sets[design.ofB(row)];
    EXPECT_EQ(sets[design.ofAWithB(row, 0)], (ParameterSet{b[0], a[1], b[2]}));
    EXPECT_EQ(sets[design.ofAWithB(row, 1)], (ParameterSet{a[0], b[1], a[2]}));
    EXPECT_EQ(sets[design.ofBWithA(row, 0)], (ParameterSet{a[0], b[1], a[2]}));
    EXPECT_EQ(sets[design.ofBWithA(row, 1)], (ParameterSet{b[0], a[1], b[2]}));
    EXPECT_NE(a, b);
  }
}

// Two blocks by hand: f of A, B, A with B's column 1, A with B's column 2.
TEST(SobolIndices, AreTheEstimatorsOfSaltelliAndJansen) {
  const SobolDesign design{.rows = 2, .factors = 2};
  const std::vector<double> values{1, 4, 3, 2, /**/ 6, 1, 2, 5};
  UniformGenerator random(1);
  const ReplicateBootstrap bootstrap(10, random);
  const SobolIndices found = sobolIndices(design, values, bootstrap, 10);
  EXPECT_DOUBLE_EQ(found.mean, 3.0);
  EXPECT_DOUBLE_EQ(found.variance, (4.0 + 1.0 + 9.0 + 4.0) / 4.0);
  EXPECT_DOUBLE_EQ(found.first[0].value, (1.0 * 2.0 + -2.0 * -4.0) / 2.0 / 4.5);
  EXPECT_DOUBLE_EQ(found.first[1].value, (1.0 * 1.0 + -2.0 * -1.0) / 2.0 / 4.5);
  EXPECT_DOUBLE_EQ(found.total[0].value, (4.0 + 16.0) / 4.0 / 4.5);
  EXPECT_DOUBLE_EQ(found.total[1].value, (1.0 + 1.0) / 4.0 / 4.5);
  EXPECT_DOUBLE_EQ(found.sumOfFirst.value, found.first[0].value + found.first[1].value);
}

// Tolerances of about three standard errors, as the benchmark sobol_coverage has them.
TEST(SobolIndices, OfPublishedFunctionsAreTheirs) {
  expectIndices(SobolDesignRun(ishigami(), 8192).indices(), ishigami(), 0.03);
  expectIndices(SobolDesignRun(gFunctionOfEight(), 8192).indices(), gFunctionOfEight(), 0.015);
  // The values as they are printed in the literature.
  EXPECT_NEAR(ishigami().first[0], 0.3139, 5e-5);
  EXPECT_NEAR(ishigami().total[0], 0.5576, 5e-5);
  EXPECT_NEAR(ishigami().total[2], 0.2437, 5e-5);
  EXPECT_NEAR(gFunctionOfEight().first[0], 0.7162, 5e-5);
  EXPECT_NEAR(gFunctionOfEight().total[1], 0.2422, 5e-5);
}

TEST(SobolIndices, OfSecondOrderAndGroups) {
  const SobolIndices pairs = SobolDesignRun(ishigami(), 4096, true).indices();
  expectIndices(pairs, ishigami(), 0.03);
  EXPECT_NEAR(pairs.second[0].value, 0.0, 0.03);              // x1, x2
  EXPECT_NEAR(pairs.second[1].value, 0.5576 - 0.3139, 0.03);  // x1, x3
  EXPECT_NEAR(pairs.second[2].value, 0.0, 0.03);              // x2, x3
  EXPECT_GT(pairs.second[1].lower, 0.15);

  const SobolIndices groups = SobolDesignRun(ishigami(), 4096, false, {{"x1, x3", {0, 2}}, {"x2", {1}}}).indices();
  EXPECT_NEAR(groups.first[0].value, 1.0 - 0.4424, 0.03);
  EXPECT_NEAR(groups.total[0].value, 1.0 - 0.4424, 0.03);
  EXPECT_NEAR(groups.sumOfFirst.value, 1.0, 0.02);
}

// A failed run, for which other programs take a value of a real one, or drop the whole analysis.
TEST(SobolIndices, OfADesignWhoseRunsFailedLeaveOutTheTermsThatNeedThem) {
  SobolDesignRun run(gFunctionOfEight(), 4096);
  const SobolIndices whole = run.indices();
  UniformGenerator random(9);
  for (double& value : run.values) {
    if (random.next() < 0.1) value = kNoValue;
  }
  const SobolIndices found = run.indices();
  expectIndices(found, gFunctionOfEight(), 0.03);
  EXPECT_NEAR(static_cast<double>(found.first[0].blocks), 4096 * 0.729, 100.0);
  EXPECT_NEAR(static_cast<double>(found.total[0].blocks), 4096 * 0.81, 100.0);
  double narrower = 0.0;
  double wider = 0.0;
  for (std::size_t j = 0; j < 4; ++j) {
    narrower += whole.total[j].upper - whole.total[j].lower;
    wider += found.total[j].upper - found.total[j].lower;
  }
  EXPECT_GT(wider, narrower);

  // One run alone: the index of its parameter has a block less, and all others stay as they are.
  SobolDesignRun single(ishigami(), 64);
  const SobolIndices before = single.indices();
  single.values[single.design.ofAWithB(5, 1)] = kNoValue;
  const SobolIndices after = single.indices();
  EXPECT_EQ(after.first[1].blocks, 63U);
  EXPECT_NE(after.first[1].value, before.first[1].value);
  for (const std::size_t j : {0U, 2U}) {
    EXPECT_EQ(after.first[j].value, before.first[j].value);
    EXPECT_EQ(after.total[j].value, before.total[j].value);
    EXPECT_EQ(after.total[j].upper, before.total[j].upper);
    EXPECT_EQ(after.first[j].blocks, 64U);
  }
  // A run of B serves first-order indices alone.
  single.values[single.design.ofB(7)] = kNoValue;
  EXPECT_EQ(single.indices().total[0].blocks, 64U);
  EXPECT_EQ(single.indices().first[0].blocks, 63U);
}

TEST(SobolIndices, AreNotThereWithoutVariationOrRuns) {
  SobolDesignRun run(ishigami(), 64);
  for (double& value : run.values) value = 0.1 + 0.2;
  const SobolIndices constant = run.indices();
  EXPECT_TRUE(constant.isConstant);
  EXPECT_TRUE(std::isnan(constant.first[0].value));
  EXPECT_TRUE(std::isnan(constant.total[2].upper));
  run.values.assign(run.values.size(), kNoValue);
  EXPECT_TRUE(std::isnan(run.indices().first[0].value));
  EXPECT_EQ(run.indices().valueCount, 0U);
}

// 95 % means 95 %; the benchmark sobol_coverage has more of it.
TEST(SobolIndices, LimitsHoldTheIndexIn95OfAHundredDesigns) {
  const SobolFunction function = ishigami();
  int covered = 0;
  constexpr int kRepetitions = 120;
  for (int seed = 1; seed <= kRepetitions; ++seed) {
    const UnitProblem problem(3);
    const SobolDesign design{.rows = 256, .factors = 3};
    UniformGenerator random(seed);
    const ReplicateBootstrap bootstrap(300, random);
    std::vector<double> values;
    for (const ParameterSet& set : sobolSets(design, problem.factors, problem.distributions, random)) {
      values.push_back(function.value(set));
    }
    const SobolIndices found = sobolIndices(design, values, bootstrap, bootstrap.size());
    for (std::size_t j = 0; j < 3; ++j) {
      covered += found.first[j].lower <= function.first[j] && function.first[j] <= found.first[j].upper ? 1 : 0;
      covered += found.total[j].lower <= function.total[j] && function.total[j] <= found.total[j].upper ? 1 : 0;
    }
  }
  EXPECT_GE(covered, 6 * kRepetitions * 90 / 100);
  EXPECT_LE(covered, 6 * kRepetitions * 99 / 100);
}

TEST(SobolReport, SaysWhatCanBeFixedAndWhatInteracts) {
  const SobolDesignRun run(gFunctionOfEight(), 256);
  SobolFindings findings;
  findings.design = run.design;
  findings.factors = run.problem.factors;
  for (const SobolFactor& factor : findings.factors) findings.parameters.push_back(factor.name);
  findings.outputs.push_back(sobolOutput(run.design, run.values, run.bootstrap, "measure", "flow"));
  findings.runCount = run.values.size();
  std::string text;
  for (const std::string& line : formatSobol(findings, "basin_Sobol.dat")) text += line + "\n";
  EXPECT_THAT(text, ::testing::HasSubstr("256 blocks of 10 model runs for 8 parameters"));
  EXPECT_THAT(text, ::testing::ContainsRegex("Can be fixed, .* below 0.05: x3 .*x4 .*x5"));
  EXPECT_THAT(text, ::testing::ContainsRegex("Interact with others, .*: x[12] "));
  EXPECT_THAT(text, ::testing::ContainsRegex("First-order indices estimated below 0: x[0-9]"));
  EXPECT_THAT(text, ::testing::HasSubstr("An index cannot be negative"));
  EXPECT_THAT(text, ::testing::HasSubstr("\n   The first 128 of the 256 blocks"));
  const std::vector<std::size_t> stages{32, 64, 128, 256};
  for (std::size_t i = 0; i < stages.size(); ++i) EXPECT_EQ(findings.outputs[0].stages[i].rows, stages[i]);

  const std::vector<DataTable> tables = sobolTables(findings);
  ASSERT_EQ(tables.size(), 2U);
  EXPECT_EQ(tables[0].rows.size(), 8U * 3 + 2);
  EXPECT_EQ(tables[1].rows.size(), 8U * 2 * 4);
  findings.failedCount = findings.runCount / 10;
  EXPECT_THAT(sobolWarnings(findings), ::testing::Contains(::testing::HasSubstr("10 % of the model runs failed")));
}

struct SobolTexts {
  std::string log;
  std::string warnings;
  std::string problem;  ///< of the last index of the table
};

SobolTexts textsOf(const SobolDesignRun& run) {
  SobolFindings findings;
  findings.design = run.design;
  findings.factors = run.problem.factors;
  for (const SobolFactor& factor : findings.factors) findings.parameters.push_back(factor.name);
  findings.outputs.push_back(sobolOutput(run.design, run.values, run.bootstrap, "objective", "fit"));
  findings.runCount = run.values.size();
  SobolTexts texts;
  for (const std::string& line : formatSobol(findings, "basin_Sobol.dat")) texts.log += line + "\n";
  for (const std::string& warning : sobolWarnings(findings)) texts.warnings += warning + "\n";
  texts.problem = std::get<std::string>(sobolTables(findings).front().rows.back().back());
  return texts;
}

/// x1 + x2 / 2, and `height` more where x3 is above `from`: x3 is that of a corner.
SobolFunction corner(double from, double height) {
  const auto value = [=](std::span<const double> x) { return x[0] + 0.5 * x[1] + (x[2] > from ? height : 0.0); };
  return {"corner", value, {0.0, 0.0, 0.0}, {0.0, 0.0, 0.0}};
}

TEST(SobolReport, IsNotSureOfWhatNoPointHasMet) {
  const SobolTexts texts = textsOf(SobolDesignRun(corner(0.9999, 300.0), 64));
  EXPECT_THAT(texts.log, ::testing::HasSubstr("Can be fixed, as the upper limit of the total index is below 0.05: x3 "
                                              "(no effect in any block)\n   What acts in less than 4.6 % of the space "
                                              "may have gone unseen in 64 blocks (95 %)"));
  EXPECT_THAT(texts.log, ::testing::Not(::testing::HasSubstr("nan")));
}

TEST(SobolReport, TheTableSaysWhyAnIndexOrItsLimitsAreMissing) {
  SobolDesignRun run(corner(0.9999, 0.0), 64);
  EXPECT_EQ(textsOf(run).problem, "");
  const std::vector<double> whole = run.values;
  run.values[run.design.ofAWithB(7, 1)] = 1.0e12;
  EXPECT_THAT(textsOf(run).problem, ::testing::StartsWith("no limits, 1 of the 64 blocks makes more than 90 %"));
  run.values = whole;
  for (std::size_t row = 0; row < 64; ++row) run.values[run.design.ofAWithB(row, 2)] = std::nan("");
  EXPECT_EQ(textsOf(run).problem, "no block of the design has all runs that the index needs");
  EXPECT_THAT(textsOf(run).log, ::testing::HasSubstr("Not known, as too few blocks have results for limits: x3\n"));
  EXPECT_THAT(textsOf(run).log, ::testing::Not(::testing::HasSubstr("Undecided")));
  run.values.assign(whole.size(), 3.0);
  EXPECT_EQ(textsOf(run).problem, "no parameter has an influence, all runs have the same value");
  run.values.assign(whole.size(), std::nan(""));
  EXPECT_EQ(textsOf(run).problem, "no indices, too few runs succeeded");
}

// The limits of a bootstrap know nothing of the next point in the corner.
TEST(SobolReport, SaysNothingOfIndicesThatAreThoseOfAFewRuns) {
  SobolDesignRun run(corner(0.9999, 0.0), 64);
  const SobolIndices whole = run.indices();
  EXPECT_EQ(whole.dominatingBlocks, 0U);
  EXPECT_FALSE(std::isnan(whole.total[0].upper));
  run.values[run.design.ofAWithB(7, 1)] = 1.0e12;
  const SobolIndices found = run.indices();
  EXPECT_EQ(found.dominatingBlocks, 1U);
  EXPECT_EQ(found.farthestSet, run.design.ofAWithB(7, 1));
  EXPECT_TRUE(std::isnan(found.total[0].upper));
  const SobolTexts texts = textsOf(run);
  EXPECT_THAT(texts.log,
              ::testing::HasSubstr("Which parameters can be fixed is not said, and there are no limits: 1 of "
                                   "the 64 blocks makes more than 90 % of the variance"));
  EXPECT_THAT(texts.log, ::testing::Not(::testing::HasSubstr("Can be fixed, ")));
  EXPECT_THAT(texts.warnings, ::testing::HasSubstr(fmt::format("The farthest value is that of evaluation No. {}",
                                                               run.design.ofAWithB(7, 1) + 1)));
  EXPECT_THAT(texts.warnings, ::testing::Not(::testing::HasSubstr("Sample_Size")));
  // Four blocks are a sample, if a small one.
  for (const std::size_t row : {12U, 23U, 34U}) run.values[run.design.ofA(row)] = -1.0e12;
  EXPECT_EQ(run.indices().dominatingBlocks, 0U);
}

TEST(SobolIndices, HaveTheSameLimitsWhereTheirBootstrapSamplesDoNotFitIntoMemoryAtOnce) {
  const SobolDesignRun run(gFunctionOfEight(), 32, true);
  const SobolIndices whole = run.indices();
  for (const std::size_t atOnce : {1U, 7U, 20U, 53U}) {
    const SobolIndices found =
        sobolIndices(run.design, run.values, run.bootstrap, run.bootstrap.size(), true, atOnce * run.bootstrap.size());
    for (const auto part :
         {&SobolIndices::first, &SobolIndices::total, &SobolIndices::interactions, &SobolIndices::second}) {
      for (std::size_t i = 0; i < (whole.*part).size(); ++i) {
        EXPECT_EQ((found.*part)[i].lower, (whole.*part)[i].lower) << atOnce << " " << i;
        EXPECT_EQ((found.*part)[i].upper, (whole.*part)[i].upper) << atOnce << " " << i;
      }
    }
    EXPECT_EQ(found.sumOfFirst.lower, whole.sumOfFirst.lower);
    EXPECT_EQ(found.sumOfTotal.upper, whole.sumOfTotal.upper);
  }
}

TEST(SobolReport, WarnsOfADesignThatIsTooSmall) {
  const SobolDesignRun run(ishigami(), 32);
  SobolFindings findings;
  findings.design = run.design;
  findings.factors = run.problem.factors;
  findings.outputs.push_back(sobolOutput(run.design, run.values, run.bootstrap, "objective", "fit"));
  findings.runCount = run.values.size();
  EXPECT_THAT(sobolWarnings(findings), ::testing::ElementsAre(::testing::ContainsRegex(
                                           "too small to tell .* of fit are 0\\.[0-9]+ away.*Sample_Size = ")));
  const std::pair<double, const char*> widths[] = {
      {0.9, "Sample_Size = 4096 would bring them to about 0.1"},
      {30.0, "No Sample_Size worth running would bring them to 0.1: a few runs make most of the variance"},
      {1.0e23, "are 1e+23 away from them. No Sample_Size worth running"}};
  for (const auto& [width, expected] : widths) {
    SobolIndex& index = findings.outputs.front().indices.total.front();
    index.lower = 0.0;
    index.upper = 2.0 * width;
    EXPECT_THAT(sobolWarnings(findings), ::testing::ElementsAre(::testing::HasSubstr(expected)));
  }
}

TEST(SobolReport, HasNoIndicesOfValuesWithoutAFiniteVarianceAndNoInteractionsOfOneParameter) {
  const SobolFunction one{"one", [](std::span<const double> x) { return x[0]; }, {1.0}, {1.0}};
  for (const double scale : {1.0, 1.0e260, 1.0e-260}) {
    SobolDesignRun run(one, 32);
    for (double& value : run.values) value *= scale;
    SobolFindings findings;
    findings.design = run.design;
    findings.factors = run.problem.factors;
    findings.parameters = {findings.factors.front().name};
    findings.outputs.push_back(sobolOutput(run.design, run.values, run.bootstrap, "objective", "fit"));
    findings.runCount = run.values.size();
    std::string text;
    for (const std::string& line : formatSobol(findings, "basin_Sobol.dat")) text += line + "\n";
    EXPECT_THAT(text, ::testing::Not(::testing::HasSubstr("interactions explain")));
    EXPECT_THAT(text, ::testing::Not(::testing::HasSubstr("be fixed")));
    EXPECT_THAT(text,
                ::testing::HasSubstr("the only parameter that varies: its first-order and its total index are 1"));
    EXPECT_THAT(text, ::testing::Not(::testing::HasSubstr("nan")));
    const char* none = "fit: no indices, the variance of its values is not a finite number";
    EXPECT_EQ(text.find(none) != std::string::npos, scale != 1.0) << text;
    std::string warnings;
    for (const std::string& warning : sobolWarnings(findings)) warnings += warning;
    EXPECT_EQ(warnings.find(none) != std::string::npos, scale != 1.0) << warnings;
    EXPECT_EQ(warnings.find("too small"), std::string::npos) << "no larger design tells more of one parameter";
  }
}

TEST(SobolFactors, AreGroupsAndTheParametersInNone) {
  const std::vector<std::string> names{"Depth", "Rate", "Melt", "Lag"};
  SobolGroupProblem problem;
  const auto factors = sobolFactors(names, std::vector<std::string>{"soil: Melt, depth"}, problem);
  ASSERT_EQ(problem.text, "");
  ASSERT_EQ(factors.size(), 3U);
  EXPECT_EQ(factors[0].name, "soil");
  EXPECT_THAT(factors[0].parameters, ::testing::ElementsAre(2U, 0U));
  EXPECT_EQ(factors[1].name, "Rate");
  EXPECT_EQ(factors[2].name, "Lag");

  const std::vector<std::string> alike{"a", "A", "b"};
  const auto exact = sobolFactors(alike, std::vector<std::string>{"g: A, B"}, problem);
  ASSERT_EQ(problem.text, "");
  EXPECT_THAT(exact.back().parameters, ::testing::ElementsAre(1U, 2U)) << "exactly this name, else but for case";
  sobolFactors(std::vector<std::string>{"aB", "Ab"}, std::vector<std::string>{"g: ab"}, problem);
  EXPECT_EQ(problem.text, "\"ab\" may be each of \"aB\", \"Ab\", which differ by case alone: write one of them");

  // The last of the groups is the one that is refused.
  const std::pair<std::vector<std::string>, const char*> refused[] = {
      {{"Depth, Rate"}, "expected a name and its parameters, as in 'soil: Depth', found \"Depth, Rate\""},
      {{"soil: Dept, Rate"}, "there is no variable parameter \"Dept\"; did you mean 'Depth'?"},
      {{"soil: Depth", "snow: Depth, Melt"}, "parameter 'Depth' is in a group twice"},
      {{"soil: Depth", "soil: Melt"}, "there are two groups 'soil'"},
      {{"soil: Depth", "snow: Rate,"},
       "expected names of parameters behind ':', between commas, found none in \"snow: "
       "Rate,\""},
      {{"soil:"}, "expected names of parameters behind ':', between commas, found none in \"soil:\""},
      {{"soil: Rate", "Lag: Depth"}, "group 'Lag' has the name of a parameter that is not in it"},
  };
  for (const auto& [groups, expected] : refused) {
    EXPECT_THAT(sobolFactors(names, groups, problem), ::testing::IsEmpty());
    EXPECT_EQ(problem.text, expected);
    EXPECT_EQ(problem.group, groups.size() - 1);
  }
}

}  // namespace
}  // namespace mirevo
