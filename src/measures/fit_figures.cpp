#include "measures/fit_figures.h"

#include <cmath>
#include <vector>

#include "measures/criteria.h"

namespace mirevo {

FitFigures fitFigures(std::span<const float> simulated, std::span<const float> observed) {
  std::vector<double> ofSimulated;
  std::vector<double> ofObserved;
  for (std::size_t i = 0; i < simulated.size() && i < observed.size(); ++i) {
    if (!std::isfinite(simulated[i]) || !std::isfinite(observed[i])) continue;
    ofSimulated.push_back(simulated[i]);
    ofObserved.push_back(observed[i]);
  }
  const ValuePairs pairs{ofSimulated, ofObserved};
  const KlingGupta components = klingGupta(pairs);
  FitFigures figures;
  figures.count = ofObserved.size();
  figures.nse = nashSutcliffe(pairs);
  figures.kge = components.efficiency2009;
  figures.correlation = components.correlation;
  figures.variability = components.variability;
  figures.meanRatio = components.meanRatio;
  figures.percentBias = percentBias(pairs);
  figures.rmse = rootMeanSquareError(pairs);
  figures.rSquared = figures.correlation * figures.correlation;
  return figures;
}

}  // namespace mirevo
