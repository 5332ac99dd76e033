#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/numbers/uniform_generator.h"
#include "common/parameter_set.h"
#include "common/settings/keyword_row.h"
#include "parameters/search_space.h"

namespace mirevo {

/// How the points of an initial sample come about.
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
  std::string fileName;  ///< absolute; of a sample from a file
};

/// The section INITIAL_SAMPLE, and the seed of the run that it shares with the uncertainty analysis.
struct InitialSampleSection {
  InitialSampleSettings& sample;
  std::int32_t& randomSeed;
};
const SettingSection<InitialSampleSection>& initialSampleSection();
/// The keyword of `fileName`.
inline constexpr std::string_view kInitialSampleFileKeyword = "Initial_Sample_File_Name";

/// The bounds that the searches keep to. The upper bound of an integer parameter is drawn in a little: a point that lay
/// on it, or within the tolerance of the integer rule below it, would become an integer beyond the parameter's bound.
SearchBounds searchBounds(const SearchSpace& space);

/// Draws `count` sets within the bounds; with `includeInitialParameters` the first is the initial set, and the others
/// are the sample of count − 1. `givenSets` is what readInitialSample() returned, for a sample from a file; its first
/// sets are used. Throws FatalError when it holds too few.
std::vector<ParameterSet> drawInitialSample(const InitialSampleSettings& settings,
                                            std::span<const ParameterSet> givenSets, const SearchBounds& bounds,
                                            std::size_t count, UniformGenerator& random);

/// Reads a sample: lines that are blank or start with `#` are skipped; a header row of the variable parameters' names
/// in any order; then one set a row, on the model scale. Columns are separated by tabs, semicolons, commas or blanks,
/// whichever of these stands first in that order in the header. Returns the sets on the search scale, in setup order.
/// Throws FatalError ("Error: Initial sample file invalid") with file and line for names that are unknown, missing or
/// repeated, values that are no numbers or outside their bounds, rows of another length than the header, and no row at
/// all.
std::vector<ParameterSet> readInitialSample(std::string_view fileName, std::string_view text, const SearchSpace& space);

/// readInitialSample() of a file.
std::vector<ParameterSet> loadInitialSample(const std::string& fileName, const SearchSpace& space);

}  // namespace mirevo
