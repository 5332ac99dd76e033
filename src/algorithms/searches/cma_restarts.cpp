#include "algorithms/searches/cma_restarts.h"

#include <algorithm>
#include <cmath>

namespace mirevo {

std::optional<CmaRun> CmaRestarts::next(const CmaRun& ended, int evaluations, UniformGenerator& random) {
  if (ended.isSmall) {
    usedBySmall_ += evaluations;
  } else {
    if (!isFirst_) usedByLarge_ += evaluations;
    evaluationsOfLarge_ = evaluations;
    isFirst_ = false;
  }
  if (usedBySmall_ < usedByLarge_) {
    const auto basic = static_cast<double>(first_.population);
    const double exponent = std::pow(random.next(), 2.0);
    const double grown = 0.5 * static_cast<double>(large_.population) / basic;
    return CmaRun{static_cast<std::size_t>(basic * std::pow(grown, exponent)),
                  first_.sigma * std::pow(10.0, -2.0 * random.next()), std::max(1, evaluationsOfLarge_ / 2), true};
  }
  if (doublingsLeft_ == 0) return std::nullopt;
  --doublingsLeft_;
  large_.population *= 2;
  return large_;
}

}  // namespace mirevo
