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
#include "parameters/feasibility.h"

namespace mirevo {

/// The point where a surrogate model predicts the lowest value around one of the given points.
struct PredictedMinimum {
  ParameterSet set;
  std::size_t centre = 0;  ///< index of that point among the given ones
};

enum class SurrogateModelType : std::int32_t { quadraticPolynomial = 0, gaussianProcess = 1 };

struct SurrogateSettings {
  std::int32_t samplingRate = 25;      ///< per cent of the proposals that the model evaluates
  std::int32_t neighbourhoodSize = 0;  ///< 0: determined by model type and number of parameters
  SurrogateModelType modelType = SurrogateModelType::gaussianProcess;
  std::int32_t initialGenerations = 1;  ///< loops evaluated by the model alone
  std::int32_t checkInterval = 0;       ///< after them every so many-th loop is, too; 0: none
};
/// The section SURROGATE_MODEL_PARAMETERS, and the number of parameters of the model.
struct SurrogateSection {
  SurrogateSettings& surrogate;
  std::size_t variableCount = 0;
};
const SettingSection<SurrogateSection>& surrogateSection();
inline constexpr std::string_view kCheckIntervalKeyword = "Check_Interval";

/// Refuses a given neighbourhood that is larger than the number of parameter sets evaluated before the model is used:
/// `available`, those of the initial sample and the initial generations.
std::optional<SettingRefusal> validateSurrogateControl(const SurrogateSettings& settings, double available);

/// "quadratic polynomial" or "Gaussian process".
std::string_view surrogateModelName(const SurrogateSettings& settings);
/// The largest number of evaluated sets of n parameters to which the model is fitted: as set or, where that is 0, the
/// default for the model type.
std::size_t neighbourhoodSize(const SurrogateSettings& settings, std::size_t n);
std::unique_ptr<SurrogateModel> makeSurrogateModel(SurrogateModelType type);
/// Whether a model that has enough evaluated sets is asked in this loop, the first being 0.
bool mayAskModel(const SurrogateSettings& settings, int loop);
/// The number of evaluated sets needed before the model is used.
std::size_t leastSetCount(const SurrogateSettings& settings, std::size_t n);
/// How many proposals are made for each one that is run: 100 / samplingRate, rounded up.
std::size_t proposalsPerRun(const SurrogateSettings& settings);

/// Chooses with a surrogate model which proposals of a search are worth a model run. It keeps every evaluated point; a
/// proposal is predicted by a model fitted to the neighbourhoodSize() evaluated points nearest to it, distances taken
/// relative to the bounds. An integer parameter counts as the middle of the step that the model takes it for, so that
/// proposals that make the same model run are equal. Predictions rank proposals and do nothing else.
class ProposalSelector final {
 public:
  /// Points that cannot be run are no minima; proposals are not asked about.
  ProposalSelector(const SurrogateSettings& settings, SearchBounds bounds, Feasibility feasibility = {});

  const SurrogateSettings& settings() const { return settings_; }
  /// The set relative to the bounds, with integer parameters as the model takes them.
  std::vector<double> scaled(const ParameterSet& set) const;

  /// Remembers an evaluated point. A failed point is left out of fits, which its substitute value would distort, but is
  /// not run again. A repeated point is dropped: it would crowd others out of the neighbourhood.
  void note(const ParameterSet& set, const EvaluationResult& result);

  /// Whether proposals are ranked in this loop (counted from 0), rather than all run.
  bool isActive(int loop) const;
  std::size_t proposalsPerRun() const { return mirevo::proposalsPerRun(settings_); }

  /// The indices of the `count` proposals with the best predictions, in ascending order; where no model can be fitted,
  /// the first `count`. Proposals whose nearest evaluated point has failed rank behind all others, and those that have
  /// been evaluated themselves rank last.
  std::vector<std::size_t> select(std::span<const ParameterSet> proposals, std::size_t count);

  /// For each of `centres` the point where the model fitted around it predicts the lowest value within the box of the
  /// points that it is fitted to, as in a trust-region step, and of those that can be run. Left out are centres around
  /// which no model can be fitted, and minima that have been evaluated already or are returned for an earlier centre
  /// (to within a thousandth of the box).
  std::vector<PredictedMinimum> minima(std::span<const ParameterSet> centres);

 private:
  ParameterSet unscaled(const std::vector<double>& point) const;
  /// Whether that very point, relative to the bounds, has been evaluated.
  bool isKnown(const std::vector<double>& point) const;
  /// Whether the nearest evaluated point has failed.
  bool isLikelyToFail(const std::vector<double>& point) const;
  struct MinimumInBox {
    std::vector<double> point;
    Box box;  ///< of the points to which the model is fitted
  };
  /// Relative to the bounds, like `centre`; empty where no model can be fitted or the centre cannot be run.
  std::optional<MinimumInBox> minimumAround(const std::vector<double>& centre);
  /// Fits the model to the points with the indices `places` unless it is fitted to them already; false when it cannot
  /// be.
  bool fitTo(const std::vector<std::size_t>& places);
  /// Predictions, one per proposal; empty when no model can be fitted.
  std::vector<double> predict(std::span<const ParameterSet> proposals);
  /// Indices in `points_` of the points nearest to `point`, in ascending order.
  std::vector<std::size_t> nearest(const std::vector<double>& point) const;

  SurrogateSettings settings_;
  SearchBounds bounds_;
  Feasibility feasibility_;
  std::unique_ptr<SurrogateModel> model_;
  std::vector<std::vector<double>> points_;  ///< evaluated points relative to the bounds, in order of evaluation
  std::vector<double> values_;               ///< their objective values
  std::vector<std::vector<double>> failed_;  ///< points whose evaluation failed, relative to the bounds
  std::vector<std::size_t> fitted_;          ///< indices of the points that the model is fitted to
};

}  // namespace mirevo
