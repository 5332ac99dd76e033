#include "algorithms/analyses/local_sensitivity.h"

#include <cmath>
#include <tuple>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "matchers.h"
#include "parameters/value_format.h"

namespace mirevo {
namespace {

/// Transformation, initial value and bounds on the search scale; an integer parameter's upper one above its largest
/// value.
using Parameter = std::tuple<TransformationType, double, double, double>;

SearchSpace spaceOf(const std::vector<Parameter>& parameters) {
  SearchSpace space;
  for (const auto& [type, initial, lower, upper] : parameters) {
    space.names.push_back(fmt::format("p{}", space.names.size() + 1));
    space.initial.push_back(initial);
    space.lower.push_back(lower);
    space.upper.push_back(upper);
    space.transformation.push_back(type);
  }
  return space;
}

constexpr auto kNone = TransformationType::none;
constexpr auto kLog = TransformationType::logarithmic;
constexpr auto kInteger = TransformationType::integer;
constexpr auto kForward = Differencing::forward;
constexpr auto kCentral = Differencing::central;
constexpr auto kOfRange = PerturbationOption::range;
constexpr auto kOfValue = PerturbationOption::value;

TEST(PlanPerturbations, TakesItsStepsInsideTheBounds) {
  // settings: differencing, option, fraction
  // minus: values of the parameter; equal: not perturbed
  // plus: values of the parameter; equal: not perturbed
  const std::tuple<const char*, Parameter, SensitivitySettings, double, double> cases[] = {
      {"forward, of the range", {kNone, 2, 0, 10}, {kForward, kOfRange, 0.1}, 2, 3},
      {"central, of the range", {kNone, 2, 0, 10}, {kCentral, kOfRange, 0.1}, 1, 3},
      {"of a negative value", {kNone, -2, -10, 10}, {kForward, kOfValue, 0.1}, -2, -1.8},
      {"up to the bound itself", {kNone, 9, 0, 10}, {kForward, kOfRange, 0.1}, 9, 10},
      {"inwards at the upper bound", {kNone, 10, 0, 10}, {kForward, kOfRange, 0.1}, 9, 10},
      {"central at the lower bound", {kNone, 0, 0, 10}, {kCentral, kOfRange, 0.1}, 0, 1},
      {"no room either way", {kNone, 4, 0, 10}, {kCentral, kOfRange, 0.8}, 4, 10},
      {"no room, more below", {kNone, 6, 0, 10}, {kCentral, kOfRange, 0.8}, 0, 6},
      {"up to both bounds but for rounding", {kNone, 0.3, 0.1, 0.5}, {kCentral, kOfRange, 0.5}, 0.1, 0.5},
      {"the same of a logarithm",
       {kLog, 0, std::log(0.1), std::log(10)},
       {kCentral, kOfRange, 0.5},
       -std::log(10),
       std::log(10)},
      {"equal bounds", {kNone, 3, 3, 3}, {kCentral, kOfRange, 0.1}, 3, 3},
      {"equal bounds, of the value", {kNone, 3, 3, 3}, {kForward, kOfValue, 0.1}, 3, 3},
      {"value 0", {kNone, 0, -1, 1}, {kForward, kOfValue, 0.1}, 0, 0},
      {"logarithmic, of the range", {kLog, 0, -2, 2}, {kCentral, kOfRange, 0.25}, -1, 1},
      {"logarithmic, of the value", {kLog, 0, -2, 2}, {kCentral, kOfValue, 0.5}, -std::log(1.5), std::log(1.5)},
      {"integer, at least one", {kInteger, 5, 0, 11}, {kCentral, kOfRange, 0.01}, 4, 6},
      {"integer, rounded", {kInteger, 5, 0, 11}, {kCentral, kOfRange, 0.26}, 2, 8},
      {"integer at its largest value", {kInteger, 10, 0, 11}, {kForward, kOfRange, 0.01}, 9, 10},
      {"integer, two steps to the bound", {kInteger, 1.3, 0.3, 4.3}, {kForward, kOfRange, 0.6, false, true}, 1.3, 3.3},
      {"integer of five values", {kInteger, 2, 1, 6}, {kForward, kOfRange, 0.01}, 2, 2},
      {"integer of five values, asked for", {kInteger, 2, 1, 6}, {kForward, kOfRange, 0.01, false, true}, 2, 3},
      {"integer of six values", {kInteger, 2, 1, 7}, {kForward, kOfRange, 0.01}, 2, 3},
      {"integer of one value", {kInteger, 4, 4, 5}, {kForward, kOfRange, 0.01}, 4, 4},
  };
  for (const auto& [what, parameter, settings, minus, plus] : cases) {
    const auto& [type, initial, lower, upper] = parameter;
    const SearchSpace space = spaceOf({{kNone, 7, 0, 14}, parameter});
    const PerturbationPlan plan = planPerturbations(settings, space, space.initial);
    EXPECT_EQ(plan.sets[0], space.initial);
    const ParameterDifference& difference = plan.differences[1];
    EXPECT_DOUBLE_EQ(plan.sets[difference.minus][1], minus) << what;
    EXPECT_DOUBLE_EQ(plan.sets[difference.plus][1], plus) << what;
    EXPECT_EQ(difference.problem.empty(), minus < plus) << what;
    EXPECT_EQ(!difference.warnings.empty(),
              settings.differencing == kCentral && minus < plus && (minus == initial || plus == initial))
        << what;
    EXPECT_TRUE(lower < upper || hasRoomForStep(settings, space, 1)) << what;
    EXPECT_DOUBLE_EQ(difference.width, plus - minus) << what;
    EXPECT_EQ(plan.sets[difference.minus][0], 7.0) << what;
    EXPECT_EQ(plan.sets[difference.plus][0], 7.0) << what;
  }
}

TEST(PlanPerturbations, TakesTheOtherSideOfAConstraint) {
  const SearchSpace space = spaceOf({{kNone, 2, 0, 10}});
  // The largest and the least value that can be run; minus, plus and the warning, empty for none.
  const std::tuple<SensitivitySettings, double, double, double, double, std::string> cases[] = {
      {{kForward, kOfRange, 0.1}, 2.5, 0, 1, 2, "the step up cannot be run: the difference is that of the other"},
      {{kForward, kOfRange, 0.1}, 10, 1.5, 2, 3, ""},
      {{kCentral, kOfRange, 0.1}, 2.5, 0, 1, 2, "the step up cannot be run: the difference is one-sided (no)"},
      {{kCentral, kOfRange, 0.1}, 10, 1.5, 2, 3, "the step down cannot be run: the difference is one-sided (no)"},
      {{kCentral, kOfRange, 0.1}, 2.5, 1.5, 1, 3, ""}};  // neither can be run, and both fail
  for (const auto& [settings, most, least, minus, plus, warning] : cases) {
    const auto feasibility = feasibleWhere([&](const auto& x) { return x[0] <= most && x[0] >= least; }, "no");
    const PerturbationPlan plan = planPerturbations(settings, space, space.initial, {}, feasibility);
    EXPECT_EQ(plan.sets[plan.differences[0].minus][0], minus);
    EXPECT_EQ(plan.sets[plan.differences[0].plus][0], plus);
    ASSERT_EQ(plan.differences[0].warnings.empty(), warning.empty());
    for (const std::string& text : plan.differences[0].warnings) EXPECT_THAT(text, ::testing::StartsWith(warning));
  }
}

TEST(PlanPerturbations, NamesWhatHasASingleValueAndAStepThatRoundsAway) {
  // The integer's bounds may be 3 and 3.5: the space has the largest value and 1.
  const SearchSpace space = spaceOf({{kNone, 3, 3, 3}, {kInteger, 3, 3, 4}, {kNone, 1e18, 0, 2e18}});
  const PerturbationPlan plan = planPerturbations({kForward, kOfValue, 1e-17}, space, space.initial);
  EXPECT_EQ(plan.differences[0].problem, "its bounds are equal");
  EXPECT_EQ(plan.differences[1].problem, "its bounds leave a single value");
  EXPECT_EQ(plan.differences[2].problem, "the perturbation is too small to change its value");
}

/// A model that returns what it reads from fields of nine characters has the derivative 1.
TEST(LocalSensitivity, DividesByTheStepAsWritten) {
  const ParameterFields fields{{9, 9}};
  FunctionEvaluator evaluator([](const ParameterSet& p) {
    EvaluationResult result;
    result.measureValues = {*valueAsWritten(p[0], 9) + std::log(*valueAsWritten(std::exp(p[1]), 9))};
    return result;
  });
  const SearchSpace space = spaceOf({{kNone, 0.30103, 0, 1}, {kLog, std::log(0.0271828), -9, 0}});
  const AnalysisNames names{space.names, {"y"}, {}};
  for (const Differencing differencing : {kForward, kCentral}) {
    for (const double fraction : {0.1, 0.0371, 0.0031}) {
      const LocalSensitivity found = localSensitivity({differencing, kOfValue, fraction}, space, evaluator, fields);
      EXPECT_NEAR(found.measures.derivatives[0][0], 1.0, 1e-9) << fraction;
      EXPECT_NEAR(found.measures.derivatives[1][0], 1.0, 1e-9) << fraction;
    }
  }
  // 0.30103 (1 + 0.0031) is 0.301963193, which the field cuts after its fourth digit.
  EXPECT_THAT(formatSensitivity(localSensitivity({kForward, kOfValue, 0.0031}, space, evaluator, fields), names),
              Contains("Warning: Parameter p1: in its field of 9 characters 0.30103 is written as \"3.010E-01\" and "
                       "0.301963193 as \"3.019E-01\"; the difference is that of the values as written"));
  EXPECT_EQ(planPerturbations({kForward, kOfValue, 1e-4}, space, space.initial, fields).differences[0].problem,
            "in its field of 9 characters 0.30103 is written as \"3.010E-01\" and 0.301060103 as \"3.010E-01\"");
}

// The model reads a dependent parameter; or its fields keep different parts of the step.
TEST(LocalSensitivity, DividesByWhatTheFieldsOfDependentParametersKeepOfTheStep) {
  constexpr double kStart = 0.0123456;
  const SearchSpace space = spaceOf({{kNone, kStart, 0, 1}});
  const auto tenfold = [](double a) { return 10.0 * a; };
  const auto extreme = [](double a) { return (a - kStart) * (a - kStart); };
  const std::string asWritten = "; the difference is that of the values as written";
  struct Case {
    int ownWidth;
    double (*equation)(double a);
    int width;
    bool readsDependent;
    double fraction;
    double derivative;
    std::string text;  ///< of a problem, if there is no derivative
  };
  const Case cases[] = {
      {0, tenfold, 9, true, 1e-3, 10,
       "in the field of 9 characters of the dependent parameter d 0.123332544 is written as \"1.233E-01\" and "
       "0.123579456 as \"1.235E-01\"" +
           asWritten},
      {0, tenfold, 9, true, 1e-4, NAN,
       "in the field of 9 characters of the dependent parameter d 0.12344365439999999 is written as \"1.234E-01\" and "
       "0.1234683456 as \"1.234E-01\""},
      {0, tenfold, 20, true, 1e-4, 10, ""},
      {9, tenfold, 9, true, 1e-3, 10, asWritten},  // both keep the same part
      {9, tenfold, 20, true, 1e-3, 10,
       "in its field of 9 characters 0.0123332544 is written as \"1.233E-02\" and 0.0123579456 as \"1.235E-02\"; the "
       "fields that change with the parameter keep different parts of its step"},
      {20, extreme, 9, false, 1e-3, 1, ""},
  };
  for (const Case& each : cases) {
    FunctionEvaluator evaluator([&](const ParameterSet& p) {
      EvaluationResult result;
      result.measureValues = {each.readsDependent ? *valueAsWritten(each.equation(p[0]), each.width)
                                                  : *valueAsWritten(p[0], each.ownWidth)};
      return result;
    });
    const ParameterFields fields{{each.ownWidth}, {{"d", each.width}}, [&](std::span<const double> set) {
                                   return std::vector<double>{each.equation(set[0])};
                                 }};
    const LocalSensitivity found = localSensitivity({kCentral, kOfValue, each.fraction}, space, evaluator, fields);
    const ParameterDifference& difference = found.plan.differences[0];
    const double derivative = found.measures.derivatives[0][0];
    if (std::isnan(each.derivative)) {
      EXPECT_TRUE(std::isnan(derivative));
      EXPECT_EQ(difference.problem, each.text);
      continue;
    }
    EXPECT_NEAR(derivative, each.derivative, 1e-9) << each.text;
    EXPECT_EQ(difference.warnings.size(), each.text.empty() ? 0U : 1U) << each.text;
    for (const std::string& warning : difference.warnings) EXPECT_THAT(warning, HasSubstr(each.text));
  }
}

/// Measures x² + 3y and e^z; objective functions 2y and z.
EvaluationResult evaluate(const ParameterSet& p) {
  return {.measureValues = {p[0] * p[0] + 3.0 * p[1], std::exp(p[2])},
          .objectiveValues = {2.0 * p[1] + 0.1 * p[0], p[2]}};
}

/// An evaluator of this problem by which the sets that `fails` names fail.
FunctionEvaluator failingWhere(bool (*fails)(const ParameterSet&),
                               const EvaluationFailure& failure = {
                                   EvaluationFailure::Kind::timedOut, "the batch ran out of time", {}}) {
  return FunctionEvaluator([fails, failure](const ParameterSet& p) {
    EvaluationResult result = evaluate(p);
    if (!fails(p)) return result;
    result.measureValues = {kFailedRunValue, kFailedRunValue};
    result.objectiveValues = result.measureValues;
    result.failure = failure;
    return result;
  });
}

const SearchSpace kThreeParameters = spaceOf({{kNone, 2, 0, 4}, {kNone, 1, 0, 10}, {kLog, 1, 0, 2}});
const AnalysisNames kNamesOfThree{kThreeParameters.names, {"bias", "peak"}, {"low", "high"}};

TEST(LocalSensitivity, HasDerivativesScaledCompositeAndRanking) {
  FunctionEvaluator evaluator(evaluate);
  const LocalSensitivity central = localSensitivity({kCentral, kOfRange, 0.1}, kThreeParameters, evaluator);
  ASSERT_EQ(evaluator.batches.size(), 1U);
  EXPECT_EQ(evaluator.batches[0].size(), 7U);
  EXPECT_EQ(evaluator.batches[0][0], kThreeParameters.initial);
  EXPECT_NEAR(central.measures.derivatives[0][0], 4.0, 1e-13);  // central differences of a square are exact
  EXPECT_NEAR(central.measures.derivatives[1][0], 3.0, 1e-13);
  EXPECT_NEAR(central.measures.derivatives[2][1], std::exp(1.0) * std::sinh(0.2) / 0.2, 1e-13);
  EXPECT_NEAR(central.measures.scaled[0][0], 4.0 * 4.0 / 7.0, 1e-13);
  EXPECT_NEAR(central.objectives.scaled[1][0], 2.0 * 10.0 / 2.2, 1e-13);
  EXPECT_NEAR(central.objectives.composite[1], 20.0 / 2.2 / std::sqrt(2.0), 1e-13);
  EXPECT_THAT(central.ranking, ElementsAre(1, 2, 0));

  const LocalSensitivity forward = localSensitivity({kForward, kOfValue, 0.1}, kThreeParameters, evaluator);
  EXPECT_EQ(evaluator.batches[1].size(), 4U);
  EXPECT_NEAR(forward.measures.derivatives[0][0], 4.2, 1e-13);
  EXPECT_NEAR(forward.objectives.scaled[1][0], 2.0 / 2.2, 1e-13);  // an elasticity
  EXPECT_NEAR(forward.objectives.scaled[2][1], 1.0, 1e-13);
}

TEST(LocalSensitivity, LeavesAFailedRunsColumnOutByNameOrUsesTheOtherSide) {
  FunctionEvaluator failing = failingWhere([](const ParameterSet& p) { return p[1] != 1.0; });
  const LocalSensitivity forward = localSensitivity({kForward, kOfRange, 0.1}, kThreeParameters, failing);
  EXPECT_TRUE(std::isnan(forward.measures.derivatives[1][0]));
  EXPECT_NEAR(forward.measures.derivatives[0][0], 4.4, 1e-13);
  EXPECT_THAT(forward.ranking, ElementsAre(2, 0, 1));
  EXPECT_THAT(
      formatSensitivity(forward, kNamesOfThree),
      AllOf(Contains("Warning: Parameter p2 has no derivatives: evaluation 3 failed: the batch ran out of time"),
            Contains("     3. p2                          NaN")));
  FunctionEvaluator ended = failingWhere([](const ParameterSet& p) { return p[1] != 1.0; },
                                         {EvaluationFailure::Kind::notMade, "the run ended before", {}});
  EXPECT_EQ(localSensitivity({kForward, kOfRange, 0.1}, kThreeParameters, ended).plan.differences[1].problem,
            "evaluation 3 was not made: the run ended before");

  FunctionEvaluator failingAbove = failingWhere([](const ParameterSet& p) { return p[0] > 2.0; });
  const LocalSensitivity central = localSensitivity({kCentral, kOfRange, 0.1}, kThreeParameters, failingAbove);
  EXPECT_NEAR(central.measures.derivatives[0][0], 3.6, 1e-13);
  EXPECT_NEAR(central.measures.derivatives[1][0], 3.0, 1e-13);
  EXPECT_THAT(
      formatSensitivity(central, kNamesOfThree),
      Contains("Warning: Parameter p1: evaluation 3 failed: the batch ran out of time: the difference is one-sided"));
}

TEST(LocalSensitivity, SaysWhatChangesNoMeasure) {
  // The output of the first parameter is rounded, the second one is at its optimum, the third one has no effect.
  FunctionEvaluator evaluator([](const ParameterSet& p) {
    EvaluationResult result;
    result.measureValues = {std::round(10.0 * p[0]) + (p[1] - 1.0) * (p[1] - 1.0)};
    return result;
  });
  const SearchSpace space = spaceOf({{kNone, 2, 0, 4}, {kNone, 1, 0, 10}, {kNone, 1, 0, 10}});
  const auto said = [&](double fraction, std::size_t j) {
    return localSensitivity({kCentral, kOfRange, fraction}, space, evaluator).plan.differences[j].warnings;
  };
  EXPECT_THAT(said(0.01, 0), ElementsAre(StartsWith("no output measure changes with its step: ")));
  EXPECT_THAT(said(0.1, 0), ::testing::IsEmpty());
  EXPECT_THAT(said(0.01, 1), ::testing::IsEmpty());
  EXPECT_THAT(said(0.1, 2), ::testing::SizeIs(1));
}

// At the optimum the derivative of the error is 0 for the parameter that matters most.
TEST(LocalSensitivity, RanksByTheObservationsWhereThereAreSome) {
  FunctionEvaluator evaluator([](const ParameterSet& p) {
    EvaluationResult result;
    result.objectiveValues = {1.0 + (p[0] - 2.0) * (p[0] - 2.0) + 0.25 * p[1]};
    result.aggregate = result.objectiveValues[0];
    return result;
  });
  const SearchSpace space = spaceOf({{kNone, 2, 0, 4}, {kNone, 1, 0, 10}});
  LocalSensitivity result = localSensitivity({kCentral, kOfRange, 0.1}, space, evaluator);
  EXPECT_THAT(result.ranking, ElementsAre(1, 0));
  // Two weighted observations; the third, which is missing, does not count.
  takeObservations({{0.5, -0.5, NAN}, {1, 4, 1}, {{3, 2, 9}, {0, 0.1, 9}}}, result);
  EXPECT_THAT(result.ofObservations, ElementsAre(DoubleEq(4 * std::sqrt((9.0 + 16.0) / 2)), DoubleEq(std::sqrt(2.0))));
  EXPECT_THAT(result.ranking, ElementsAre(0, 1));
  const AnalysisNames names{space.names, {}, {"error"}};
  EXPECT_THAT(formatSensitivity(result, names),
              AllOf(Contains(HasSubstr("Composite scaled sensitivity of the observations")),
                    Contains(StartsWith("Warning: evaluation 4 fits better than the base set: its aggregate is 1, not "
                                        "1.25;"))));
}

TEST(LocalSensitivity, SaysOnceThatOthersFitBetter) {
  LocalSensitivity sensitivity;
  sensitivity.results.resize(5);
  const double aggregates[] = {4, 3, 2, 1, 5};
  for (std::size_t i = 0; i < 5; ++i) {
    sensitivity.results[i].number = static_cast<int>(i) + 1;
    sensitivity.results[i].aggregate = aggregates[i];
  }
  sensitivity.results[0].pairs = {{.measure = 0, .count = 10}};
  sensitivity.results[3].pairs = {{.measure = 0, .count = 9}};
  const auto warnings = [&] {
    std::vector<std::string> found;
    for (const std::string& line : formatSensitivity(sensitivity, {})) {
      if (line.starts_with("Warning")) found.push_back(line.substr(0, line.find(';')));
    }
    return found;
  };
  EXPECT_THAT(warnings(), ElementsAre("Warning: 2 evaluations fit better than the base set, evaluation 3 best: its "
                                      "aggregate is 2, not 4"));
  sensitivity.results[2].pairs = {{.measure = 0, .count = 11}};
  EXPECT_THAT(warnings(),
              ElementsAre("Warning: evaluation 2 fits better than the base set: its aggregate is 3, not 4"));
}

// The first measure is larger by 100 for each pair.
TEST(LocalSensitivity, ComparesMeasuresOfTheSameObservationsOnly) {
  const SearchSpace space = spaceOf({{kNone, 2, 0, 4}});
  const std::vector<OutputMeasure> measures{{.name = "flow"}, {.name = "level"}, {.name = "peak"}};
  const std::vector<ObjectiveFunction> objectives{{.name = "both", .measures = {0, 1}},
                                                  {.name = "third", .measures = {2}}};
  // differencing, pairs of flow in the base run and in those above and below, the derivative of flow, the warning
  const std::tuple<Differencing, std::size_t, std::size_t, std::size_t, double, std::string> cases[] = {
      {kCentral, 9, 9, 9, 1, ""},
      {kCentral, 9, 8, 9, 1,
       "its differences of \"flow\" and of objective functions with it are one-sided: evaluation 3 has 8 pairs of "
       "simulated and observed values, the base run 9"},
      {kCentral, 8, 9, 9, 1, ""},
      {kCentral, 9, 8, 7, NAN,
       "it has no derivatives of \"flow\" and of objective functions with it: evaluation 2 has 7"},
      {kForward, 9, 8, 9, NAN,
       "it has no derivatives of \"flow\" and of objective functions with it: evaluation 2 has 8"},
      {kForward, 8, 9, 9, NAN,
       "it has no derivatives of \"flow\" and of objective functions with it: evaluation 2 has 9"},
  };
  for (const auto& [differencing, base, above, below, derivative, warning] : cases) {
    FunctionEvaluator evaluator([&](const ParameterSet& p) {
      const std::size_t count = p[0] > 2 ? above : p[0] < 2 ? below : base;
      EvaluationResult result;
      result.measureValues = {p[0] + 100.0 * static_cast<double>(count), 2 * p[0], 3 * p[0]};
      result.objectiveValues = {result.measureValues[0] + 2 * p[0], 3 * p[0]};
      if (p[0] == 2 || count != base) result.pairs = {{.measure = 0, .count = count}, {.measure = 1, .count = 5}};
      return result;
    });
    const LocalSensitivity found =
        localSensitivity({differencing, kOfRange, 0.1}, space, evaluator, {}, {}, objectives, measures);
    EXPECT_NEAR(found.measures.derivatives[0][1], 2, 1e-12);
    EXPECT_NEAR(found.objectives.derivatives[0][1], 3, 1e-12);
    EXPECT_EQ(found.plan.differences[0].warnings.size(), warning.empty() ? 0U : 1U) << base << above << below;
    for (const std::string& text : found.plan.differences[0].warnings) EXPECT_THAT(text, StartsWith(warning));
    if (std::isnan(derivative)) {
      EXPECT_TRUE(std::isnan(found.measures.derivatives[0][0]) && std::isnan(found.objectives.derivatives[0][0]));
      EXPECT_THAT(found.objectives.problems[0][0], StartsWith("evaluation 2 has")) << base << above << below;
      continue;
    }
    EXPECT_NEAR(found.measures.derivatives[0][0], 1, 1e-12) << base << above << below;
    EXPECT_NEAR(found.objectives.derivatives[0][0], 3, 1e-12) << base << above << below;
    EXPECT_EQ(found.objectives.problems[0][0], "");
  }
}

TEST(LocalSensitivity, OfAFailedBaseSetHasCentralDerivativesOnly) {
  FunctionEvaluator evaluator = failingWhere([](const ParameterSet& p) { return p[0] == 2.0 && p[1] == 1.0; });
  const SearchSpace space = spaceOf({{kNone, 2, 0, 4}, {kNone, 1, 1, 10}, {kLog, 1, 1, 1}});
  const LocalSensitivity result = localSensitivity({kCentral, kOfRange, 0.1}, space, evaluator);
  EXPECT_NEAR(result.measures.derivatives[0][0], 4.0, 1e-13);
  EXPECT_TRUE(std::isnan(result.measures.derivatives[1][0]));  // one-sided at its bound
  EXPECT_EQ(result.plan.differences[2].problem, "its bounds are equal");
  EXPECT_TRUE(std::isnan(result.measures.scaled[0][0]));
  EXPECT_FALSE(linearise(result.plan, std::vector<std::vector<double>>(4), std::vector<double>{1.0}, {}).has_value());
}

TEST(Linearise, LeavesTheColumnOfAFailedSetUnknown) {
  const SearchSpace space = spaceOf({{kNone, 2, 0, 4}, {kNone, 1, 0, 10}});
  const PerturbationPlan plan = planPerturbations({kForward, kOfRange, 0.5}, space, space.initial);
  const std::vector<std::vector<double>> simulated = {{1, 2}, {2, 6}, {}};
  const auto model = linearise(plan, simulated, std::vector<double>{0.5, 2.5}, {1.0, 4.0});
  ASSERT_TRUE(model.has_value());
  EXPECT_THAT(model->residuals, ElementsAre(0.5, -0.5));
  EXPECT_THAT(model->jacobian[0], ElementsAre(0.5, 2.0));
  EXPECT_TRUE(std::isnan(model->jacobian[1][0]) && std::isnan(model->jacobian[1][1]));
}

TEST(Linearise, SaysWhereAPerturbedRunHasNoValue) {
  LocalSensitivity sensitivity;
  const SearchSpace space = spaceOf({{kNone, 2, 0, 4}});
  sensitivity.plan = planPerturbations({kCentral, kOfRange, 0.25}, space, space.initial);
  sensitivity.results.resize(3);
  const std::vector<std::vector<double>> simulated{{5, 5, 5, 5}, {3, 2, NAN, 3}, {6, NAN, NAN, NAN}};
  const auto model = linearise(sensitivity.plan, simulated, std::vector<double>{1, 1, 1, NAN}, {});
  EXPECT_EQ(model->jacobian[0][0], 1.5);
  EXPECT_EQ(model->jacobian[0][1], 3.0);
  takeObservations(*model, sensitivity);
  EXPECT_THAT(sensitivity.plan.differences[0].warnings,
              ElementsAre("one of its two runs has no value at 1 of 3 observations: the differences there are those of "
                          "the other run and the base run"));
  sensitivity.plan.differences[0].widthBelow = 0.0;  // as written
  const std::vector<double> column = differenceColumns(sensitivity.plan, simulated)[0];
  EXPECT_EQ(column[0], 1.5);
  EXPECT_TRUE(std::isnan(column[1]) && std::isnan(column[2]));
}

}  // namespace
}  // namespace mirevo
