#include "run/setup/setup_warnings.h"

#include <gmock/gmock.h>

#include "matchers.h"

namespace mirevo {
namespace {

TEST(UnusedParameterWarnings, FollowDependentParametersFromTheTemplatesOn) {
  std::vector<ModelParameter> parameters;
  const auto add = [&parameters](const char* name, ParameterType type, const char* equation = "") {
    parameters.push_back({.parameterType = type, .name = name, .equation = equation});
  };
  add("direct", ParameterType::variable);
  add("througha", ParameterType::variable);
  add("fixed", ParameterType::fixed);
  add("lost", ParameterType::variable);
  add("first", ParameterType::dependent, "througha * 2");
  add("second", ParameterType::dependent, "first + fixed");
  add("nowhere", ParameterType::dependent, "lost + 1");
  const std::vector<ParameterTemplate> templates(1, ParameterTemplate("t", "!\n!direct! !second!", parameters));
  add("limit", ParameterType::fixed);
  add("share", ParameterType::dependent, "reserve / 2");
  add("reserve", ParameterType::fixed);
  const auto isUnused = [](const char* parameter) {
    return StartsWith(std::string("the ") + parameter + " is in no template");
  };
  std::vector<InternalConstraint> constraints{{"lost", "limit + share", LogicalOperator::less}};
  EXPECT_THAT(unusedParameterWarnings(parameters, constraints, templates),
              ElementsAre(isUnused("variable parameter \"lost\""), isUnused("dependent parameter \"nowhere\"")));
  constraints.clear();
  EXPECT_THAT(unusedParameterWarnings(parameters, constraints, templates),
              ElementsAre(isUnused("variable parameter \"lost\""), isUnused("dependent parameter \"nowhere\""),
                          isUnused("fixed parameter \"limit\""), isUnused("dependent parameter \"share\""),
                          isUnused("fixed parameter \"reserve\"")));
}

}  // namespace
}  // namespace mirevo
