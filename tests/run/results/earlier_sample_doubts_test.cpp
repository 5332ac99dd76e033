#include "run/results/earlier_sample_doubts.h"

#include <cmath>
#include <optional>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;

ModelParameter boundedParameter(const std::string& name, double lower, double upper) {
  ModelParameter parameter;
  parameter.name = name;
  parameter.parameterType = ParameterType::variable;
  parameter.lowerBound = lower;
  parameter.upperBound = upper;
  return parameter;
}

/// Of a run with Rate from -5 to 5 and Depth from 0 to 1.
RestartSettings settingsThen() {
  RestartSettings then;
  int number = 0;
  for (const auto& [name, lower, upper] : {std::tuple{"'Rate '", "-5", "5"}, std::tuple{"'Depth'", "0", "1"}}) {
    const std::string section = "MODEL_PARAMETERS/PARAMETER_" + std::to_string(++number);
    then.settings.push_back({section, "Lower_Bound", lower});
    then.settings.push_back({section, "Upper_Bound", upper});
    then.settings.push_back({section, "Parameter_Name", name});
  }
  return then;
}

TEST(EarlierSampleDoubts, OtherBoundsAreToldWithTheSetsOutsideThem) {
  EarlierSample earlier;
  EvaluationResult result;
  for (const double rate : {-4.5, -4.0, 3.0}) earlier.sample.add(std::vector{rate, 0.5}, result);
  const struct {
    double lower;
    double upper;
    bool isKnown;
    bool isOfDistributions;
    const char* expected;
  } cases[] = {
      {-5.0, 5.0, true, true, ""},
      {-4.0, 5.0, true, true,
       "The run that made r.dat had other bounds: Rate from -5 to 5, in this setup from -4 to 5. 1 of its 3 sets lies "
       "outside the bounds of this setup. "},
      {-4.0, 2.0, true, false,
       "The run that made r.dat had other bounds: Rate from -5 to 5, in this setup from -4 to 2. 2 of its 3 sets lie "
       "outside "},
      {-8.0, 5.0, true, true,
       "The run that made r.dat had other bounds: Rate from -5 to 5, in this setup from -8 to 5. 0 of its 3 sets lie "},
      {-8.0, 5.0, true, false, ""},
      {-4.0, 5.0, false, true, "r.dat: 1 of its 3 sets lies outside the bounds of this setup. "},
      {-8.0, 5.0, false, true, ""},
  };
  for (const auto& one : cases) {
    RunConfig config;
    config.parameters = {boundedParameter("Rate", one.lower, one.upper), boundedParameter("Depth", 0.0, 1.0)};
    earlier.isOfDistributions = one.isOfDistributions;
    const std::string text =
        otherBoundsText("r.dat", one.isKnown ? std::optional(settingsThen()) : std::nullopt, config, earlier);
    EXPECT_THAT(text, StartsWith(one.expected));
    EXPECT_EQ(text.empty(), one.expected[0] == '\0') << text;
  }
}

TEST(EarlierSampleDoubts, SetsThatTheSetupWouldNotMakeAreTold) {
  EvaluatedSample sample;
  EvaluationResult result;
  for (const double steps : {1.0, 2.5, 3.0, 4.0}) sample.add(std::vector{steps, std::exp(steps)}, result);
  result.failure = EvaluationFailure{};
  sample.add(std::vector{5.0, 1.0}, result);  // one that failed was not judged
  RunConfig config;
  config.parameters = {boundedParameter("Steps", 0.0, 9.0), boundedParameter("Rate", 0.1, 99.0)};
  config.parameters[1].transformationType = TransformationType::logarithmic;
  EXPECT_THAT(otherSetsTexts("r.dat", config, Feasibility(), sample), IsEmpty());
  config.parameters[0].transformationType = TransformationType::integer;
  const Feasibility lessThan35(
      [](std::span<const double> set) { return set[1] < 3.5 ? std::nullopt : std::optional<std::string>("too much"); });
  EXPECT_THAT(
      otherSetsTexts("r.dat", config, lessThan35, sample),
      ElementsAre(
          StartsWith("r.dat: 1 of its 5 sets would not be made by a run of this setup, with values between"),
          StartsWith(
              "r.dat: 1 of its 5 sets would not be made by a run of this setup, as they violate a constraint (too")));
}

TEST(EarlierSampleDoubts, AnUnfinishedRunAndManyFailuresAreTold) {
  EvaluatedSample sample;
  EvaluationResult result;
  for (int i = 0; i < 20; ++i) {
    result.failure.reset();
    if (i < 2) result.failure.emplace();
    sample.add(std::vector{0.0}, result);
  }
  RunRecord record;
  record.plannedEvaluations = 200;
  record.stage = RunStage::finished;
  EXPECT_THAT(unfinishedRunTexts("r.dat", record, sample), IsEmpty()) << "a tenth may fail";
  EXPECT_THAT(unfinishedRunTexts("r.dat", std::nullopt, sample), IsEmpty()) << "nothing is known of its end";
  record.stage = RunStage::failed;
  EXPECT_THAT(unfinishedRunTexts("r.dat", record, sample),
              ElementsAre("The run that made r.dat is not finished, it ended with an error: what is said is said of 20 "
                          "evaluations of 200 planned"));
  record.stage.reset();
  result.failure.emplace();
  sample.add(std::vector{0.0}, result);
  EXPECT_THAT(unfinishedRunTexts("r.dat", record, sample),
              ElementsAre(HasSubstr("it was cut off, or still goes on"),
                          StartsWith("3 of the 21 evaluations in r.dat failed, more than the tenth ")));
}

}  // namespace
}  // namespace mirevo
