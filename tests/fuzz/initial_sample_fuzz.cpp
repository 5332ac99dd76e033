// Any text as a sample file: whole sets within their bounds, or a FatalError that names the file.

#include <cmath>
#include <cstdint>
#include <string_view>

#include "algorithms/searches/initial_sample.h"
#include "common/fatal_error.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using mirevo::TransformationType;
  static const mirevo::SearchSpace space{
      {"a", "b 1", "n"},
      {1.0, 0.0, 1.0},
      {-2.0, std::log(0.5), 0.0},
      {3.0, std::log(2.0), 5.0},
      {TransformationType::none, TransformationType::logarithmic, TransformationType::integer}};
  try {
    const auto read = mirevo::readInitialSample("s.txt", {reinterpret_cast<const char*>(data), size}, space);
    require(!read.sets.empty() && read.sets.size() == read.modelScale.size());
    for (const mirevo::ParameterSet& set : read.sets) {
      require(set.size() == space.size());
      for (std::size_t i = 0; i < set.size(); ++i) require(set[i] >= space.lower[i] && set[i] <= space.upper[i]);
    }
  } catch (const mirevo::FatalError& error) {
    require(error.message() == "Error: Initial sample file invalid" && error.detail().starts_with("s.txt"));
  }
  return 0;
}
