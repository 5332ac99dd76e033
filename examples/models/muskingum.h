// Muskingum routing of daily discharge along a river.
//
// The storage of a reach with inflow I and outflow O is S = K (X I + (1 - X) O) (McCarthy, G. T. (1938): The unit
// hydrograph and flood routing. Conference of the North Atlantic Division, U.S. Army Corps of Engineers, New London).
// Over a step dt that gives (Chow, V. T., Maidment, D. R., Mays, L. W. (1988): Applied Hydrology, McGraw-Hill, section
// 8.4)
//
//   O(j+1) = C1 I(j+1) + C2 I(j) + C3 O(j),   D  = 2 K (1 - X) + dt
//   C1 = (dt - 2 K X) / D,   C2 = (dt + 2 K X) / D,   C3 = (2 K (1 - X) - dt) / D
//
// No coefficient, and therefore no outflow, is negative if 2 K X <= dt <= 2 K (1 - X). A day rarely satisfies this.
#pragma once

#include <vector>

namespace models {

/// A river divided into equal consecutive reaches, and a day into equal steps: the smallest number of steps, and then
/// of reaches, with which no coefficient is negative.
class MuskingumRiver {
 public:
  /// `k` is the travel time of the whole river, in days, > 0; `x` the weight of the inflow, 0 <= x < 0.5.
  MuskingumRiver(double k, double x);

  /// Takes the mean inflow of a day and returns its mean outflow, m3/s. The inflow is constant during the day; before
  /// the first day the river is in a steady state with that day's inflow.
  double advance(double inflow);

  int steps() const { return steps_; }      ///< per day
  int reaches() const { return reaches_; }  ///< into which the river is divided
  double c1() const { return c1_; }
  double c2() const { return c2_; }
  double c3() const { return c3_; }

 private:
  int steps_ = 1;
  int reaches_ = 1;
  double c1_ = 0.0;
  double c2_ = 0.0;
  double c3_ = 0.0;
  std::vector<double> flows_;  ///< m3/s at the last step, reaches + 1 entries: the inflow, then the outflow of every
                               ///< reach
};

}  // namespace models
