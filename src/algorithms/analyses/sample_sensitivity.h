#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/analyses/evaluated_sample.h"
#include "algorithms/analyses/uncertainty.h"
#include "common/data_table.h"
#include "parameters/search_space.h"

namespace mirevo {

/// How an output of a sample depends on one of its parameters.
struct SampleDependence {
  double rankCorrelation = 0.0;  ///< Spearman; NaN where the output or the parameter is constant
  /// First-order sensitivity index, the share of the output's variance that the parameter explains by itself, with its
  /// 95 % limits; NaN for a sample that is too small, and of a parameter with one value. The estimate has no bias at 0,
  /// and so may be below it.
  double firstOrder = 0.0;
  double lower = 0.0;
  double upper = 0.0;
  bool isVaried = true;  ///< it has more than one value: else there is no index
};

/// One output of the runs that succeeded and have a value of it.
struct OutputDependence {
  std::string kind;  ///< "measure" or "objective"
  std::string name;
  std::size_t count = 0;                     ///< runs
  bool isConstant = false;                   ///< all have the same value
  bool hasVariance = true;                   ///< one that is a number and not 0, as indices need
  std::vector<SampleDependence> parameters;  ///< in setup order
};

struct SampleSensitivity {
  std::size_t failedCount = 0;            ///< left out
  std::vector<OutputDependence> outputs;  ///< measures, then objective functions
};

/// A sample with fewer runs has no first-order indices.
inline constexpr std::size_t kLeastForIndices = 100;

/// Why an output has no indices whose values are so large, or differ so little, that squares of differences leave the
/// range of numbers.
inline constexpr std::string_view kNoFiniteVariance =
    "the variance of its values is not a finite number: they are as large as 1e150, or as small as 1e-150";

/// What a sample tells of its parameters without a further model run. First-order indices are those of Plischke (2012),
/// doi:10.1016/j.envsoft.2012.03.004 (the outputs, in the order of a parameter's values, are projected on the first
/// six cosines), of a parameter with up to seven values the correlation ratio of classes (Plischke, Borgonovo and Smith
/// 2013, doi:10.1016/j.ejor.2012.11.047). Differing from these, the bias is taken off as from Kelley's epsilon squared
/// (1935, doi:10.1073/pnas.21.9.554), the share that as many freedoms explain of noise. The limits are normal, with the
/// standard deviation of 200 bootstrap samples, or of fewer where 10^10 operations would not do. `seed`: of the run.
SampleSensitivity sampleSensitivity(const EvaluatedSample& sample, const AnalysisNames& names, std::int32_t seed);
SampleSensitivity sampleSensitivity(const UncertaintyOutcome& outcome, const SearchSpace& space,
                                    const AnalysisNames& names, std::int32_t seed);

/// As a table for programs.
DataTable sampleSensitivityTable(const SampleSensitivity& sensitivity, const AnalysisNames& names, bool areCorrelated);

/// As lines of text for the log: the parameters that each objective function, or without one each measure, depends on
/// most. `file` is the name of the one with the table; `areCorrelated`: the parameters were not drawn independently.
std::vector<std::string> formatSampleSensitivity(const SampleSensitivity& sensitivity, const AnalysisNames& names,
                                                 std::string_view file, bool areCorrelated);

}  // namespace mirevo
