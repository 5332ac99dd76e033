// How often the 95 % intervals of Sobol' indices hold the true index: 200 repetitions of a design with seeds of their
// own, for functions with known indices, sizes of the base sample, and a share of runs that fail at random; and how
// large the error would be if all points were of one net, which has no limits.
//
//   sobol_coverage [REPETITIONS]
#include <cmath>
#include <cstdlib>
#include <limits>

#include <fmt/format.h>

#include "algorithms/analyses/sobol_indices.h"
#include "algorithms/sobol_functions.h"

namespace mirevo::bench {
namespace {

/// Of one index over the repetitions.
struct Coverage {
  int covered = 0;
  double squares = 0.0;  ///< of the errors
  double errors = 0.0;
  double halfWidths = 0.0;
  double squaresOfOneNet = 0.0;

  void add(const SobolIndex& index, const SobolIndex& ofOneNet, double truth) {
    squaresOfOneNet += (ofOneNet.value - truth) * (ofOneNet.value - truth);
    covered += index.lower <= truth && truth <= index.upper ? 1 : 0;
    squares += (index.value - truth) * (index.value - truth);
    errors += index.value - truth;
    halfWidths += 0.5 * (index.upper - index.lower);
  }
};

void printRow(const std::string& title, const Coverage& one, double truth, int repetitions) {
  const double n = repetitions;
  fmt::print("{:<34} {:>8.4f} {:>8.4f} {:>9.4f} {:>9.4f} {:>7.1f} {:>9.4f}\n", title, truth, one.errors / n,
             std::sqrt(one.squares / n), one.halfWidths / n, 100.0 * one.covered / n,
             std::sqrt(one.squaresOfOneNet / n));
}

int measure(const SobolFunction& function, std::size_t rows, double failing, int repetitions) {
  const std::size_t k = function.first.size();
  const UnitProblem problem(k);
  const SobolDesign design{.rows = rows, .factors = k};
  std::vector<Coverage> first(k);
  std::vector<Coverage> total(k);
  for (int repetition = 1; repetition <= repetitions; ++repetition) {
    UniformGenerator random(repetition);
    const ReplicateBootstrap bootstrap(1000, random);
    const auto found = [&](const SobolDesign& of) {
      std::vector<double> values;
      for (const ParameterSet& set : sobolSets(of, problem.factors, problem.distributions, random)) {
        values.push_back(function.value(set));
      }
      for (double& value : values) {
        if (random.next() < failing) value = std::numeric_limits<double>::quiet_NaN();
      }
      return sobolIndices(of, values, bootstrap, of.nets == 1 ? 0 : bootstrap.size());
    };
    const SobolIndices indices = found(design);
    SobolDesign ofOneNet = design;
    ofOneNet.nets = 1;
    const SobolIndices other = found(ofOneNet);
    for (std::size_t j = 0; j < k; ++j) {
      first[j].add(indices.first[j], other.first[j], function.first[j]);
      total[j].add(indices.total[j], other.total[j], function.total[j]);
    }
  }
  int covered = 0;
  for (std::size_t j = 0; j < k; ++j) {
    const auto title = [&](const char* order) {
      return fmt::format("{} N {} {:g} % {}{}", function.name, rows, 100.0 * failing, order, j + 1);
    };
    printRow(title("S"), first[j], function.first[j], repetitions);
    printRow(title("ST"), total[j], function.total[j], repetitions);
    covered += first[j].covered + total[j].covered;
  }
  fmt::print("{} N {} {:g} % failing: {:.1f} % of all intervals\n", function.name, rows, 100.0 * failing,
             100.0 * covered / (2.0 * static_cast<double>(k) * repetitions));
  return covered;
}

}  // namespace
}  // namespace mirevo::bench

int main(int argc, char** argv) {
  const int repetitions = argc > 1 ? std::atoi(argv[1]) : 200;
  fmt::print("{:<34} {:>8} {:>8} {:>9} {:>9} {:>7} {:>9}\n", "index", "truth", "bias", "rms error", "1/2 width",
             "% inside", "one net");
  for (const double failing : {0.0, 0.1}) {
    for (const std::size_t rows : {std::size_t{128}, std::size_t{512}, std::size_t{2048}}) {
      mirevo::bench::measure(mirevo::ishigami(), rows, failing, repetitions);
      mirevo::bench::measure(mirevo::gFunctionOfEight(), rows, failing, repetitions);
    }
  }
}
