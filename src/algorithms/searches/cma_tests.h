#pragma once

#include <cstddef>
#include <deque>
#include <span>
#include <string_view>
#include <vector>

#include "algorithms/searches/cma_distribution.h"
#include "algorithms/searches/cma_margin.h"

namespace mirevo {

/// The tests that end a run of CMA-ES, after which a restart follows: Hansen (2009), doi:10.1145/1570256.1570333, table
/// 1, and Hansen (2016), arXiv:1604.00772, section B.3. They take the place of the test of the population's range that
/// the other searches have.
class CmaTests final {
 public:
  explicit CmaTests(const CmaDistribution& distribution);

  /// Makes the tests after a generation, with the values of its successful points in ascending order.
  void update(const CmaDistribution& distribution, const CmaMargin& margin, std::span<const double> values);

  /// Why the run ends, in words that follow "as"; empty while it goes on.
  std::string_view reason() const { return reason_; }

  /// The number of generations over which a run must not improve before this counts: 10 + ⌈30 n/λ⌉.
  static std::size_t shortHistory(std::size_t n, std::size_t lambda);

 private:
  void testValues(std::span<const double> values);
  void testStagnation();
  void testSteps(const CmaDistribution& distribution, const CmaMargin& margin);
  static bool changesNothing(const CmaDistribution& distribution, const CmaMargin& margin, int generation);

  std::size_t history_;  ///< shortHistory()
  double startSigma_;
  int mostGenerations_;
  int generation_ = 0;
  std::vector<double> bests_;  ///< of every generation
  std::vector<double> medians_;
  std::string_view reason_;
};

}  // namespace mirevo
