#include "models/muskingum.h"

#include <algorithm>
#include <cmath>

namespace models {

MuskingumRiver::MuskingumRiver(double k, double x) {
  // With n steps a day and m reaches the limits of dt = 1/n with K/m are 2 X n K <= m <= 2 (1 - X) n K. That interval
  // grows with n, so it contains an integer eventually.
  for (;; ++steps_) {
    reaches_ = std::max(1, static_cast<int>(std::ceil(2.0 * x * steps_ * k)));
    if (reaches_ <= 2.0 * (1.0 - x) * steps_ * k) break;
  }
  const double kReach = k / reaches_;
  const double dt = 1.0 / steps_;
  const double denominator = 2.0 * kReach * (1.0 - x) + dt;
  c1_ = (dt - 2.0 * kReach * x) / denominator;
  c2_ = (dt + 2.0 * kReach * x) / denominator;
  c3_ = (2.0 * kReach * (1.0 - x) - dt) / denominator;
}

double MuskingumRiver::advance(double inflow) {
  if (flows_.empty()) flows_.assign(static_cast<std::size_t>(reaches_) + 1, inflow);
  double sum = 0.0;
  for (int step = 0; step < steps_; ++step) {
    double before = flows_[0];  // the inflow of this reach in the last step
    flows_[0] = inflow;
    for (std::size_t reach = 1; reach < flows_.size(); ++reach) {
      const double outflow = c1_ * flows_[reach - 1] + c2_ * before + c3_ * flows_[reach];
      before = flows_[reach];
      flows_[reach] = outflow;
    }
    sum += flows_.back();
  }
  return sum / steps_;
}

}  // namespace models
