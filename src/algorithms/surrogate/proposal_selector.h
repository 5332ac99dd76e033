#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/surrogate/surrogate_model.h"
#include "common/parameter_set.h"
#include "common/settings/keyword_row.h"

namespace mirevo {

/// Where a surrogate model predicts least around one of the points that it was asked about.
struct PredictedMinimum {
  ParameterSet set;
  std::size_t centre = 0;  ///< place of that point among those asked about
};

enum class SurrogateModelType : std::int32_t { quadraticPolynomial = 0, gaussianProcess = 1 };

struct SurrogateSettings {
  std::int32_t samplingRate = 25;      ///< per cent of the proposals that the model evaluates
  std::int32_t neighbourhoodSize = 0;  ///< 0: chosen by model type and number of parameters
  SurrogateModelType modelType = SurrogateModelType::gaussianProcess;
  std::int32_t initialGenerations = 1;  ///< loops evaluated by the model alone
};
/// The section SURROGATE_MODEL_PARAMETERS, and the number of parameters that the model is fitted in.
struct SurrogateSection {
  SurrogateSettings& surrogate;
  std::size_t variableCount = 0;
};
const SettingSection<SurrogateSection>& surrogateSection();

/// That so many parameter sets as a neighbourhood that is given needs are evaluated before the model is used:
/// `available` are those of the initial sample and the initial generations.
std::optional<SettingRefusal> validateSurrogateControl(const SurrogateSettings& settings, double available);

/// "quadratic polynomial" or "Gaussian process".
std::string_view surrogateModelName(const SurrogateSettings& settings);
/// To how many evaluated sets of n parameters the model is fitted at most: as set or, where that is 0, chosen.
std::size_t neighbourhoodSize(const SurrogateSettings& settings, std::size_t n);
/// How many evaluated sets it takes before the model is used.
std::size_t leastSetCount(const SurrogateSettings& settings, std::size_t n);
/// How many proposals are made for each one to be run: 100 / samplingRate, rounded up.
std::size_t proposalsPerRun(const SurrogateSettings& settings);

/// Chooses with a surrogate model which proposals of a search are worth a model run. It keeps every evaluated point; a
/// proposal is predicted by a model fitted to the neighbourhoodSize() evaluated points nearest to it, distances taken
/// relative to the bounds. An integer parameter lies in the middle of the step that the model takes it for, so that no
/// proposal is told from one that makes the same run. Predictions rank proposals and do nothing else.
class ProposalSelector final {
 public:
  ProposalSelector(const SurrogateSettings& settings, SearchBounds bounds);

  /// Remembers an evaluated point. No model is fitted to a failed one, whose stand-in value would distort every fit
  /// around it, but it is not run again either. A repeated one is left out: it would crowd others out of the
  /// neighbourhood.
  void note(const ParameterSet& set, const EvaluationResult& result);

  /// Whether proposals are ranked in this loop (counted from 0), rather than all run.
  bool isActive(int loop) const;
  std::size_t proposalsPerRun() const { return mirevo::proposalsPerRun(settings_); }

  /// The `count` proposals with the best predictions, in ascending order of their places; where no model can be fitted,
  /// the first `count`. One of which the nearest evaluated point has failed comes after all others, and last of all
  /// one that has been evaluated itself.
  std::vector<std::size_t> select(std::span<const ParameterSet> proposals, std::size_t count);

  /// For each of `centres` where the model fitted around it predicts least within the box of the points that it is
  /// fitted to, as in a step of a trust region. Left out is a centre around which no model can be fitted, and a
  /// minimum where a point as good as there has been evaluated or is returned for an earlier centre.
  std::vector<PredictedMinimum> minima(std::span<const ParameterSet> centres);

 private:
  /// Relative to the bounds, as the model takes it.
  std::vector<double> scaled(const ParameterSet& set) const;
  ParameterSet unscaled(const std::vector<double>& point) const;
  /// Whether that very point, relative to the bounds, has been evaluated.
  bool isKnown(const std::vector<double>& point) const;
  /// Whether the nearest evaluated point has failed.
  bool isLikelyToFail(const std::vector<double>& point) const;
  struct MinimumInBox {
    std::vector<double> point;
    Box box;  ///< of the points to which the model is fitted
  };
  /// Relative to the bounds, as `centre`; nothing where no model can be fitted.
  std::optional<MinimumInBox> minimumAround(const std::vector<double>& centre);
  /// Fits the model to the points at `places` unless it is; false when it cannot be fitted.
  bool fitTo(const std::vector<std::size_t>& places);
  /// Predictions, one a proposal; empty when no model can be fitted.
  std::vector<double> predict(std::span<const ParameterSet> proposals);
  /// Places in the archive of the points nearest to `point`, in ascending order.
  std::vector<std::size_t> nearest(const std::vector<double>& point) const;

  SurrogateSettings settings_;
  SearchBounds bounds_;
  std::unique_ptr<SurrogateModel> model_;
  std::vector<std::vector<double>> points_;  ///< evaluated points relative to the bounds, in order of evaluation
  std::vector<double> values_;               ///< their objective values
  std::vector<std::vector<double>> failed_;  ///< points whose evaluation failed, in the same way
  std::vector<std::size_t> fitted_;          ///< places of the points that the model is fitted to
};

}  // namespace mirevo
