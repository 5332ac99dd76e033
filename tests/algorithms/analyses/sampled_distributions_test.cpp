#include "algorithms/analyses/sampled_distributions.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

SearchSpace spaceOfParameters(std::size_t count) {
  SearchSpace space;
  for (std::size_t j = 0; j < count; ++j) {
    space.names.push_back(fmt::format("x{}", j + 1));
    space.lower.push_back(0.0);
    space.upper.push_back(1.0);
    space.transformation.push_back(TransformationType::none);
  }
  return space;
}

TEST(SampledDistributions, OfManyParametersThoseOfTheFirstAreListed) {
  const auto lines = [](std::size_t count) {
    const SearchSpace space = spaceOfParameters(count);
    return distributionLines(ParameterDistributions::uniform(space), space, "SECTION");
  };
  constexpr std::size_t kHead = 1;
  EXPECT_EQ(lines(50).size(), kHead + 50);
  EXPECT_THAT(lines(50).back(), testing::StartsWith("  PARAMETER_50: x50, "));
  const auto rest = [](const char* count) {
    return fmt::format("  and those of {}: see SECTION and the bounds of the parameters in the setup", count);
  };
  EXPECT_EQ(lines(51).size(), kHead + 51);
  EXPECT_EQ(lines(51).back(), rest("1 more parameter"));
  EXPECT_EQ(lines(2000).size(), kHead + 51);
  EXPECT_EQ(lines(2000).back(), rest("1950 more parameters"));
}

}  // namespace
}  // namespace mirevo
