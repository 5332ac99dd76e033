#include "algorithms/surrogate/proposal_selector.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/lapack_functions.h"
#include "algorithms/surrogate/gaussian_process.h"
#include "algorithms/surrogate/pattern_search.h"
#include "algorithms/surrogate/quadratic_surrogate.h"
#include "parameters/search_space.h"

namespace mirevo {
namespace {

/// As a fraction of the width of a neighbourhood: points that are closer in every coordinate count as the same, since a
/// second run would tell nothing.
constexpr double kSamePlace = 1.0e-3;

/// For a Gaussian process: the time for a fit grows with the third power of the size of the neighbourhood.
constexpr std::size_t kMostNeighbours = 100;

/// Replaces the prediction where a run is likely to fail: better only than kMadeAgain, for a run that would repeat one.
constexpr double kLikelyToFail = std::numeric_limits<double>::max();
constexpr double kMadeAgain = std::numeric_limits<double>::infinity();

constexpr CodeName kModelNames[] = {{0, "quadratic polynomial"}, {1, "Gaussian process"}};
constexpr std::string_view kNeighbourhoodKeyword = "Neighbourhood_Size";
constexpr std::string_view kGenerationsKeyword = "No_Initial_Generations";
constexpr std::string_view kCheckRefusal = "Error: Invalid check interval for surrogate modelling optimisation";
constexpr std::string_view kNeighbourhoodRefusal =
    "Error: Invalid neighbourhood size for surrogate modelling optimisation";

double squaredDistance(const std::vector<double>& a, const std::vector<double>& b) {
  double sum = 0.0;
  for (std::size_t j = 0; j < a.size(); ++j) sum += (a[j] - b[j]) * (a[j] - b[j]);
  return sum;
}

/// That a neighbourhood that is given suffices for a polynomial.
std::optional<SettingRefusal> validateNeighbourhood(const SurrogateSettings& settings, std::size_t n) {
  const std::int32_t size = settings.neighbourhoodSize;
  const std::size_t coefficients = quadraticCoefficientCount(n);
  if (size == 0 || settings.modelType != SurrogateModelType::quadraticPolynomial ||
      static_cast<std::size_t>(size) >= coefficients) {
    return std::nullopt;
  }
  return SettingRefusal{
      std::string(kNeighbourhoodRefusal), kNeighbourhoodKeyword,
      fmt::format("expected at least the {} coefficients of a quadratic polynomial in {} parameters, or 0, found {}",
                  coefficients, n, size)};
}

}  // namespace

const SettingSection<SurrogateSection>& surrogateSection() {
  using Section = SurrogateSection;
  static const SettingSection<Section> section{
      {"OPTIMISATION_ALGORITHM/SURROGATE_MODEL_PARAMETERS",
       "when `Use_Surrogate_Model` is 1",
       "The surrogate model with which a search may save model runs. May be empty.",
       {setting<Section>(
            [](auto& s) -> auto& { return s.surrogate.samplingRate; },
            {.name = "Sampling_rate",
             .defaultValue = "25",
             .range = between(1, 100),
             .refusal = "Error: Invalid sampling rate for surrogate modelling optimisation",
             .unit = "per cent",
             .meaning = "Share of the proposals that the model evaluates: those that the surrogate predicts best.",
             .checkOrder = 2}),
        checked<Section>(
            setting<Section>(
                [](auto& s) -> auto& { return s.surrogate.neighbourhoodSize; },
                {.name = kNeighbourhoodKeyword,
                 .defaultValue = "0",
                 .range = from(0),
                 .refusal = kNeighbourhoodRefusal,
                 .unit = "evaluated sets",
                 .meaning =
                     "Nearest evaluated sets to which the surrogate is fitted; model type 0 needs (n+1)(n+2)/2 of "
                     "them for n variable parameters. 0: one and a half times as many for model type 0, three times "
                     "as many, but at most 100, for model type 1.",
                 .checkOrder = 1}),
            [](const Section& s) { return validateNeighbourhood(s.surrogate, s.variableCount); }),
        setting<Section>(
            [](auto& s) -> auto& { return s.surrogate.modelType; },
            {.name = "Model_Type",
             .defaultValue = "1",
             .range = between(0, 1),
             .codes = kModelNames,
             .refusal = "Error: Invalid model type for surrogate modelling optimisation",
             .meaning =
                 "Kind of surrogate: a full quadratic polynomial, or a Gaussian process, which takes fewer model "
                 "runs and milliseconds of computation for each."}),
        setting<Section>(
            [](auto& s) -> auto& { return s.surrogate.initialGenerations; },
            {.name = kGenerationsKeyword,
             .defaultValue = "1",
             .range = from(1),
             .refusal = "Error: Invalid no of initial generations for surrogate modelling optimisation",
             .unit = "loops",
             .meaning = "Number of initial loops without the surrogate; together with the initial sample they must "
                        "provide at least `Neighbourhood_Size` evaluated sets, if that is given.",
             .checkOrder = 3}),
        checked<Section>(setting<Section>([](auto& s) -> auto& { return s.surrogate.checkInterval; },
                                          {.name = kCheckIntervalKeyword,
                                           .defaultValue = "0",
                                           .range = from(0),
                                           .refusal = kCheckRefusal,
                                           .unit = "loops",
                                           .meaning = "After the initial loops every so many-th loop is made without "
                                                      "the surrogate. 0: none; otherwise at least 2.",
                                           .checkOrder = 4}),
                         [](const Section& s) -> std::optional<SettingRefusal> {
                           if (s.surrogate.checkInterval != 1) return std::nullopt;
                           return SettingRefusal{std::string(kCheckRefusal), kCheckIntervalKeyword,
                                                 "expected 0, or at least 2: with 1 the surrogate is never used"};
                         })}}};
  return section;
}

std::optional<SettingRefusal> validateSurrogateControl(const SurrogateSettings& settings, double available) {
  const std::int32_t size = settings.neighbourhoodSize;
  if (available >= size) return std::nullopt;
  return SettingRefusal{
      "Error: Population size and/or initial No. of generations too small for surrogate modelling optimisation",
      kGenerationsKeyword,
      fmt::format("expected at least Neighbourhood_Size = {} evaluated sets before the surrogate is fitted, found {}",
                  size, available)};
}

std::string_view surrogateModelName(const SurrogateSettings& settings) {
  return kModelNames[settings.modelType == SurrogateModelType::gaussianProcess ? 1 : 0].name;
}

std::size_t neighbourhoodSize(const SurrogateSettings& settings, std::size_t n) {
  if (settings.neighbourhoodSize > 0) return static_cast<std::size_t>(settings.neighbourhoodSize);
  const std::size_t coefficients = quadraticCoefficientCount(n);
  return settings.modelType == SurrogateModelType::gaussianProcess ? std::min(3 * coefficients, kMostNeighbours)
                                                                   : 3 * coefficients / 2;
}

std::unique_ptr<SurrogateModel> makeSurrogateModel(SurrogateModelType type) {
  if (type == SurrogateModelType::gaussianProcess) return std::make_unique<GaussianProcess>();
  return std::make_unique<QuadraticSurrogate>();
}

std::size_t leastSetCount(const SurrogateSettings& settings, std::size_t n) {
  // Fewer points than determine a plane tell nothing about the shape of the objective.
  return settings.modelType == SurrogateModelType::quadraticPolynomial ? quadraticCoefficientCount(n) : n + 2;
}

std::size_t proposalsPerRun(const SurrogateSettings& settings) {
  const int rate = std::clamp(settings.samplingRate, 1, 100);
  return static_cast<std::size_t>((100 + rate - 1) / rate);
}

ProposalSelector::ProposalSelector(const SurrogateSettings& settings, SearchBounds bounds, Feasibility feasibility)
    : settings_(settings),
      bounds_(std::move(bounds)),
      feasibility_(std::move(feasibility)),
      model_(makeSurrogateModel(settings.modelType)) {
  lapack();  // what the models need is missed now, if ever, and not after the initial sample
}

std::vector<double> ProposalSelector::scaled(const ParameterSet& set) const {
  std::vector<double> point(set.size());
  for (std::size_t j = 0; j < set.size(); ++j) {
    const double width = bounds_.upper[j] - bounds_.lower[j];
    double value = set[j];
    if (!bounds_.isInteger.empty() && bounds_.isInteger[j]) {
      bool failed = false;
      value = 0.5 + TransformParameterValue(value, bounds_.lower[j], TransformationType::integer,
                                            TransformDirection::backward, failed);
    }
    point[j] = width > 0.0 ? (value - bounds_.lower[j]) / width : 0.0;
  }
  return point;
}

ParameterSet ProposalSelector::unscaled(const std::vector<double>& point) const {
  ParameterSet set(point.size());
  for (std::size_t j = 0; j < set.size(); ++j) {
    const double value = bounds_.lower[j] + point[j] * (bounds_.upper[j] - bounds_.lower[j]);
    set[j] = std::clamp(value, bounds_.lower[j], bounds_.upper[j]);
  }
  return set;
}

bool ProposalSelector::isKnown(const std::vector<double>& point) const {
  const auto isAmong = [&](const auto& points) {
    return std::find(points.begin(), points.end(), point) != points.end();
  };
  return isAmong(points_) || isAmong(failed_);
}

bool ProposalSelector::isLikelyToFail(const std::vector<double>& point) const {
  const auto leastDistance = [&point](const auto& others) {
    double least = std::numeric_limits<double>::infinity();
    for (const auto& other : others) least = std::min(least, squaredDistance(other, point));
    return least;
  };
  return !failed_.empty() && leastDistance(failed_) < leastDistance(points_);
}

void ProposalSelector::note(const ParameterSet& set, const EvaluationResult& result) {
  std::vector<double> point = scaled(set);
  if (isKnown(point)) return;
  if (!isUsable(result)) {
    failed_.push_back(std::move(point));
    return;
  }
  points_.push_back(std::move(point));
  values_.push_back(result.aggregate);
}

bool mayAskModel(const SurrogateSettings& settings, int loop) {
  const int past = loop - settings.initialGenerations;
  const bool isCheck = settings.checkInterval > 0 && past % settings.checkInterval == settings.checkInterval - 1;
  return past >= 0 && !isCheck;
}

bool ProposalSelector::isActive(int loop) const {
  return mayAskModel(settings_, loop) && points_.size() >= leastSetCount(settings_, bounds_.size());
}

std::vector<std::size_t> ProposalSelector::nearest(const std::vector<double>& point) const {
  std::vector<std::size_t> places(points_.size());
  std::iota(places.begin(), places.end(), std::size_t{0});
  const std::size_t wanted = std::max(neighbourhoodSize(settings_, bounds_.size()), std::size_t{2});
  if (places.size() <= wanted) return places;
  std::vector<double> distances;
  distances.reserve(points_.size());
  for (const auto& other : points_) distances.push_back(squaredDistance(other, point));
  const auto byDistance = [&](std::size_t a, std::size_t b) {
    return distances[a] != distances[b] ? distances[a] < distances[b] : a < b;
  };
  std::nth_element(places.begin(), places.begin() + static_cast<std::ptrdiff_t>(wanted), places.end(), byDistance);
  places.resize(wanted);
  std::sort(places.begin(), places.end());
  return places;
}

bool ProposalSelector::fitTo(const std::vector<std::size_t>& places) {
  if (!fitted_.empty() && places == fitted_) return true;
  fitted_.clear();
  std::vector<std::vector<double>> points;
  std::vector<double> values;
  for (const std::size_t place : places) {
    points.push_back(points_[place]);
    values.push_back(values_[place]);
  }
  if (!model_->fit(points, values)) return false;
  fitted_ = places;
  return true;
}

std::vector<double> ProposalSelector::predict(std::span<const ParameterSet> proposals) {
  std::vector<double> predictions;
  for (const ParameterSet& proposal : proposals) {
    const std::vector<double> point = scaled(proposal);
    if (isKnown(point)) {
      predictions.push_back(kMadeAgain);
    } else if (isLikelyToFail(point)) {
      predictions.push_back(kLikelyToFail);
    } else if (fitTo(nearest(point))) {
      predictions.push_back(model_->predict(point));
    } else {
      return {};
    }
  }
  return predictions;
}

std::optional<ProposalSelector::MinimumInBox> ProposalSelector::minimumAround(const std::vector<double>& centre) {
  const std::vector<std::size_t> neighbours = nearest(centre);
  if (!fitTo(neighbours)) return std::nullopt;
  Box box{centre, centre};
  for (const std::size_t place : neighbours) {
    for (std::size_t j = 0; j < centre.size(); ++j) {
      box.lower[j] = std::min(box.lower[j], points_[place][j]);
      box.upper[j] = std::max(box.upper[j], points_[place][j]);
    }
  }
  // An integer parameter moves by whole steps, however narrow the box.
  std::vector<double> leastMoves(centre.size(), 0.0);
  for (std::size_t j = 0; j < bounds_.isInteger.size(); ++j) {
    if (bounds_.isInteger[j]) leastMoves[j] = 1.0 / (bounds_.upper[j] - bounds_.lower[j]);
  }
  const bool hasIntegers =
      std::find(bounds_.isInteger.begin(), bounds_.isInteger.end(), true) != bounds_.isInteger.end();
  const auto asRun = [&](const std::vector<double>& point) { return hasIntegers ? scaled(unscaled(point)) : point; };
  const auto canBeRun = [&](const std::vector<double>& point) {
    return !feasibility_.isTested() || feasibility_.holds(unscaled(point));
  };
  const auto predicted = [&](const std::vector<double>& trial) {
    const std::vector<double> point = asRun(trial);
    return isLikelyToFail(point) || !canBeRun(point) ? kLikelyToFail : model_->predict(point);
  };
  std::vector<double> minimum = asRun(patternSearch(predicted, centre, box, leastMoves));
  if (!canBeRun(minimum)) return std::nullopt;
  return MinimumInBox{std::move(minimum), box};
}

std::vector<PredictedMinimum> ProposalSelector::minima(std::span<const ParameterSet> centres) {
  std::vector<PredictedMinimum> found;
  std::vector<std::vector<double>> foundPoints;
  for (std::size_t centre = 0; centre < centres.size(); ++centre) {
    const std::optional<MinimumInBox> around = minimumAround(scaled(centres[centre]));
    if (!around) continue;
    const std::vector<double>& minimum = around->point;
    const Box& box = around->box;
    const auto isSamePlace = [&](const std::vector<double>& point) {
      for (std::size_t j = 0; j < minimum.size(); ++j) {
        if (std::abs(minimum[j] - point[j]) > kSamePlace * (box.upper[j] - box.lower[j])) return false;
      }
      return true;
    };
    const auto isNear = [&](const auto& points) { return std::any_of(points.begin(), points.end(), isSamePlace); };
    if (isNear(points_) || isNear(failed_) || isNear(foundPoints)) continue;
    found.push_back({unscaled(minimum), centre});
    foundPoints.push_back(minimum);
  }
  return found;
}

std::vector<std::size_t> ProposalSelector::select(std::span<const ParameterSet> proposals, std::size_t count) {
  std::vector<std::size_t> places(proposals.size());
  std::iota(places.begin(), places.end(), std::size_t{0});
  if (count >= places.size()) return places;
  const std::vector<double> predictions = predict(proposals);
  if (!predictions.empty()) {
    std::stable_sort(places.begin(), places.end(),
                     [&](std::size_t a, std::size_t b) { return isBetter(predictions[a], predictions[b]); });
  }
  places.resize(count);
  std::sort(places.begin(), places.end());
  return places;
}

}  // namespace mirevo
