// Muskingum routing of daily discharge along a river.
//
// A reach stores S = K (X I + (1 - X) O) of its inflow I and its outflow O (McCarthy, G. T. (1938): The unit hydrograph
// and flood routing. Conference of the North Atlantic Division, U.S. Army Corps of Engineers, New London). Over a step
// dt that gives (Chow, V. T., Maidment, D. R., Mays, L. W. (1988): Applied Hydrology, McGraw-Hill, section 8.4)
//
//   O(j+1) = C1 I(j+1) + C2 I(j) + C3 O(j),   D  = 2 K (1 - X) + dt
//   C1 = (dt - 2 K X) / D,   C2 = (dt + 2 K X) / D,   C3 = (2 K (1 - X) - dt) / D
//
// No coefficient is negative, and no outflow therefore, where 2 K X <= dt <= 2 K (1 - X). A day is seldom such a step.
#pragma once

#include <vector>

namespace models {

/// One river in equal reaches one after another, a day in equal steps: as few steps as keep every coefficient from
/// being negative, and then as few reaches.
class MuskingumRiver {
 public:
  /// `k` is the travel time of the whole river, in days, > 0; `x` the weight of the inflow, 0 <= x < 0.5.
  MuskingumRiver(double k, double x);

  /// Takes a day's mean inflow and gives its mean outflow, m3/s. The inflow is the same through the day; before the
  /// first day the river is steady at its inflow.
  double advance(double inflow);

  int steps() const { return steps_; }      ///< in a day
  int reaches() const { return reaches_; }  ///< that the river is cut into
  double c1() const { return c1_; }
  double c2() const { return c2_; }
  double c3() const { return c3_; }

 private:
  int steps_ = 1;
  int reaches_ = 1;
  double c1_ = 0.0;
  double c2_ = 0.0;
  double c3_ = 0.0;
  std::vector<double> flows_;  ///< m3/s at the last step, shape reaches + 1: the inflow, then every reach's outflow
};

}  // namespace models
