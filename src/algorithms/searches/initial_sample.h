#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/earlier_results.h"
#include "common/parameter_set.h"
#include "common/settings/keyword_row.h"
#include "parameters/search_space.h"

namespace mirevo {

/// How the points of an initial sample are generated.
enum class SampleGeneration : std::int32_t {
  uniformRandom = 0,
  latinHypercube = 1,
  scrambledSobol = 2,
  maximinLatinHypercube = 3,
  fromFile = 4
};

struct InitialSampleSettings {
  bool includeInitialParameters = true;
  SampleGeneration generation = SampleGeneration::latinHypercube;
  std::string fileName;  ///< absolute; only for a sample from a file
  /// A result file of an earlier run, absolute, whose sets come behind the initial one; empty: none.
  std::string earlierFile = {};
  EarlierOrder earlierOrder = EarlierOrder::best;
  std::int32_t mostEarlierSets = 0;  ///< 0: as many as there is room for; a search without a population takes one
  std::size_t earlierSetCount = 0;   ///< that were found in the file
};

/// The section INITIAL_SAMPLE, and the seed of the run, which the uncertainty analysis sets, too.
struct InitialSampleSection {
  InitialSampleSettings& sample;
  std::int32_t& randomSeed;
};
const SettingSection<InitialSampleSection>& initialSampleSection();
/// The keyword of `fileName`.
inline constexpr std::string_view kInitialSampleFileKeyword = "Initial_Sample_File_Name";
inline constexpr std::string_view kEarlierFileKeyword = "Earlier_Result_File";
inline constexpr std::string_view kEarlierOrderKeyword = "Earlier_Result_Order";
inline constexpr std::string_view kEarlierSetsKeyword = "Earlier_Result_Sets";

/// The bounds that the searches keep to. The upper bound of an integer parameter is moved in a little: a point on it,
/// or below it by less than the tolerance of the integer rule, would become an integer beyond the bound of the
/// parameter.
SearchBounds searchBounds(const SearchSpace& space);

/// A sample that the setup gives, in setup order.
struct GivenSample {
  std::vector<ParameterSet> sets;        ///< search scale
  std::vector<ParameterSet> modelScale;  ///< the same as given
};

/// Draws `count` sets within the bounds; with `includeInitialParameters` the first is the initial set, followed by a
/// sample of count − 1. For a sample from a file `givenSets` are those of readInitialSample(); the first of them are
/// used. Throws FatalError when there are too few. Otherwise they come before those that are drawn.
std::vector<ParameterSet> drawInitialSample(const InitialSampleSettings& settings,
                                            std::span<const ParameterSet> givenSets, const SearchBounds& bounds,
                                            std::size_t count, UniformGenerator& random);

/// The number of sets at the beginning of such a sample that the setup gives, of which `givenSets` come from a file.
std::size_t givenSetCount(const InitialSampleSettings& settings, std::size_t givenSets, std::size_t count);

/// The value of parameter j on the search scale for one on the model scale; empty if it is outside the bounds. A value
/// that is past a bound by a rounding error only, as in a table printed by another program, is set to the bound.
std::optional<double> sampleValue(double value, std::size_t j, const SearchSpace& space);

/// Reads a sample: a header row with the names of the variable parameters in any order, then one set per row on the
/// model scale; blank lines and lines that start with `#` are skipped, and so is a byte-order mark. Columns are
/// separated by tabs, semicolons, commas or blanks: the first of these, in this order, that the header contains. Throws
/// FatalError ("Error: Initial sample file invalid") with file and line for names that are unknown, missing or
/// repeated, values that are not numbers or are outside their bounds, rows of a different length from the header, and a
/// file without rows.
GivenSample readInitialSample(std::string_view fileName, std::string_view text, const SearchSpace& space);

/// readInitialSample() of a file.
GivenSample loadInitialSample(const std::string& fileName, const SearchSpace& space);

}  // namespace mirevo
