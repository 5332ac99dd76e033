/// A model whose result is minus the logarithm of a known density. Usage: density_model NAME, in the folder with
/// parameters.txt; writes result.txt.

#include <cstdio>
#include <string_view>
#include <vector>

#include "algorithms/bayes/known_densities.h"

int main(int argc, char** argv) {
  if (argc != 2) return 2;
  std::vector<double> values;
  std::FILE* const in = std::fopen("parameters.txt", "r");
  if (in == nullptr) return 1;
  for (double value = 0.0; std::fscanf(in, "%lf", &value) == 1;) values.push_back(value);
  std::fclose(in);
  for (const mirevo::testing::KnownDensity& density : mirevo::testing::knownDensities()) {
    if (density.name != std::string_view(argv[1]) || density.dimensions != values.size()) continue;
    std::FILE* const out = std::fopen("result.txt", "w");
    if (out == nullptr) return 1;
    std::fprintf(out, "%.17g\n", -density.lnDensity(values));
    return std::fclose(out) == 0 ? 0 : 1;
  }
  return 2;
}
