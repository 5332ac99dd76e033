#include "run/setup/setup_warnings.h"

#include <gmock/gmock.h>

#include "matchers.h"

namespace mirevo {
namespace {

TEST(UnusedParameterWarnings, FollowDependentParametersFromTheTemplatesOn) {
  std::vector<ModelParameter> parameters;
  const auto add = [&parameters](const char* name, ParameterType type, const char* equation = "") {
    parameters.emplace_back();
    parameters.back().name = name;
    parameters.back().parameterType = type;
    parameters.back().equation = equation;
  };
  add("direct", ParameterType::variable);
  add("througha", ParameterType::variable);
  add("fixed", ParameterType::fixed);
  add("lost", ParameterType::variable);
  add("first", ParameterType::dependent, "througha * 2");
  add("second", ParameterType::dependent, "first + fixed");
  add("nowhere", ParameterType::dependent, "lost + 1");
  const std::vector<ParameterTemplate> templates(1, ParameterTemplate("t", "!\n!direct! !second!", parameters));
  EXPECT_THAT(unusedParameterWarnings(parameters, templates),
              ElementsAre(StartsWith("the variable parameter \"lost\" stands in no template")));
}

}  // namespace
}  // namespace mirevo
