#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/distributions/distribution.h"
#include "common/settings/keyword_row.h"
#include "parameters/search_space.h"

namespace mirevo {

enum class DistributionKind : std::int32_t {
  normal,
  truncatedNormal,
  lognormal,
  uniform,
  logUniform,
  triangular,
  beta,
  discrete,
  values
};
enum class DistributionScale : std::int32_t { model, search };
/// Without codes: names only, in the order of the enumerators.
inline constexpr CodeName kDistributionNames[] = {
    {std::nullopt, "normal"},  {std::nullopt, "truncated normal"}, {std::nullopt, "lognormal"},
    {std::nullopt, "uniform"}, {std::nullopt, "log-uniform"},      {std::nullopt, "triangular"},
    {std::nullopt, "beta"},    {std::nullopt, "discrete"},         {std::nullopt, "values"}};
inline constexpr CodeName kDistributionScaleNames[] = {{std::nullopt, "model"}, {std::nullopt, "search"}};

inline constexpr std::string_view kDistributionKeyword = "Distribution";
inline constexpr std::string_view kValuesFileKeyword = "Values_File";
inline constexpr std::string_view kValuesColumnKeyword = "Values_Column";

/// What a setup gives for the distribution of a parameter; which of it counts depends on the kind.
struct DistributionSettings {
  DistributionKind kind = DistributionKind::normal;
  std::optional<DistributionScale> scale;
  double mean = 0.0;
  double standardDeviation = 0.0;
  double logMean = 0.0;
  double logStandardDeviation = 0.0;
  std::optional<double> minimum;  ///< empty: the lower bound of the parameter
  std::optional<double> maximum;
  double mode = 0.0;
  double alpha = 0.0;
  double beta = 0.0;
  std::vector<double> values;   ///< those in `valuesFile`, if that is where they are
  std::vector<double> weights;  ///< one for each value; empty: all the same
  std::string valuesFile;
  std::string valuesColumn;  ///< the file is a table, and this one of its columns; empty: it holds numbers alone
};

/// A section PARAMETER_n with distributions.
struct DistributionSectionFacts {
  std::string_view path;  ///< "UNCERTAINTY_ESTIMATION/PARAMETER_n"
  std::string_view readWhen;
  std::string_view meaning;
  std::string_view deviationRefusal;  ///< for a standard deviation that is not above 0
};
/// Its keywords for the schema of setups.
SectionRow distributionRow(const DistributionSectionFacts& facts);
/// Those that a kind of distribution has, with those that it needs as required ones.
SettingSection<DistributionSettings> distributionSection(const DistributionSectionFacts& facts, DistributionKind kind);

/// The kind of a value of the keyword Distribution.
DistributionKind distributionKind(const SetupValue& value);

/// Why parameter j cannot have the distribution; empty if it can. The values of a file are there.
std::optional<SettingRefusal> validateDistribution(const DistributionSettings& settings, const SearchSpace& space,
                                                   std::size_t j);
/// The valid distribution of parameter j, on the search scale.
DistributionPointer searchDistribution(const DistributionSettings& settings, const SearchSpace& space, std::size_t j);

}  // namespace mirevo
