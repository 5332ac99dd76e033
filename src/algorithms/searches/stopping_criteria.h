#pragma once

#include <cstdint>
#include <deque>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// When a search stops.
struct StoppingCriteria {
  std::int32_t maxEvaluations = 1000;
  std::int32_t loopsConvergence = 10;  ///< loops over which the best objective value is compared
  double minChange = 0.001;            ///< relative change of the best objective value below which the search has
                                       ///< converged
  double minPopulationRange = 1.0e-5;  ///< normalisedPopulationRange() below which a population has converged
};

/// The keyword of `maxEvaluations`.
inline constexpr std::string_view kBudgetKeyword = "Max_No_Evaluations";
/// Those of `loopsConvergence` and `minChange`.
inline constexpr std::string_view kLoopsKeyword = "No_Loops_Convergence";
inline constexpr std::string_view kChangeKeyword = "Min_Change";
/// The keyword of `minPopulationRange`.
inline constexpr std::string_view kRangeKeyword = "Min_Population_Range";
/// Why a search stops that has used its budget up.
inline constexpr std::string_view kBudgetUsedMessage =
    "Optimisation terminated: Maximum number of model evaluations reached";
/// The section STOPPING_CRITERIA.
const SettingSection<StoppingCriteria>& stoppingSection();

/// The three tests that end a population search, all made after every loop. If several are met, the last gives the
/// message.
class StoppingTests final {
 public:
  /// What the change of the best value is divided by: the mean of the two values, which makes that of negative ones
  /// negative, so that they count as converged, or the mean of their sizes.
  enum class Divisor { values, sizes };
  explicit StoppingTests(const StoppingCriteria& criteria, Divisor divisor = Divisor::values);

  /// Makes the tests after a loop. `bestValue` is the population's best objective value; `populationRange` comes from
  /// normalisedPopulationRange().
  void update(double bestValue, int evaluationCount, double populationRange);

  bool isMet() const { return !message_.empty(); }
  /// Why the search stops; empty while it goes on.
  std::string_view message() const { return message_; }
  /// Of the tests of the change and of the range those that are met, one line each with the value and its limit.
  std::vector<std::string> reasons() const;
  /// 2·|H − f| / (f + H), with Divisor::sizes 2·|H − f| / (|f| + |H|), where f is the best value and H the best value
  /// `loopsConvergence` − 1 loops earlier. Until there is such a loop it is twice `minChange`, so that the search
  /// cannot count as converged.
  double relativeChange() const { return relativeChange_; }

 private:
  bool isChangeSmall() const { return criteria_.minChange > relativeChange_; }
  bool isRangeSmall() const { return criteria_.minPopulationRange > populationRange_; }

  StoppingCriteria criteria_;
  Divisor divisor_;
  std::deque<double> history_;  ///< best value of each of the last `loopsConvergence` loops, newest first
  double relativeChange_;
  double populationRange_ = std::numeric_limits<double>::infinity();
  std::string_view message_;
};

}  // namespace mirevo
