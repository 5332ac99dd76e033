#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "algorithms/bayes/chain_random.h"
#include "common/settings/code_name.h"

namespace mirevo {

/// How the errors of a simulated series are distributed. Without codes: names only, in the order of the enumerators.
enum class LikelihoodForm : std::int32_t {
  objective,
  normal,
  heteroscedastic,
  autoregressive,
  boxCox,
  student,
  generalised
};
inline constexpr CodeName kLikelihoodNames[] = {
    {std::nullopt, "objective"}, {std::nullopt, "normal"},  {std::nullopt, "heteroscedastic"}, {std::nullopt, "AR(1)"},
    {std::nullopt, "Box-Cox"},   {std::nullopt, "Student"}, {std::nullopt, "generalised"}};

/// The parameters of an error model, one for each ErrorTermRow.
enum ErrorTerm : std::size_t {
  kDeviation,    ///< sigma_0, in the unit of the (transformed) series
  kShare,        ///< sigma_1, of the simulated value
  kCorrelation,  ///< phi, of one observation and the next
  kLambda,       ///< Box-Cox
  kFreedom,      ///< nu
  kSkewness,     ///< xi
  kKurtosis,     ///< beta
  kBias,         ///< mu_h
  kErrorTermCount
};

struct ErrorTermRow {
  std::string_view keyword;  ///< in a setup
  std::string_view symbol;   ///< in tables, "sigma"
  double neutral = 0.0;      ///< its value where the likelihood does not have it
  double lower = 0.0;        ///< default bounds; those of the deviation come from the observations
  double upper = 0.0;
  double least = 0.0;  ///< what bounds may be
  double most = 0.0;
  /// The prior is uniform between the bounds: for the logarithm where this is true and the lower bound is above 0.
  bool isLogarithmic = false;
};
const std::array<ErrorTermRow, kErrorTermCount>& errorTermRows();

/// The default bounds of the deviation, times the standard deviation of the observations.
inline constexpr double kLeastDeviation = 1e-3;
inline constexpr double kMostDeviation = 10.0;

/// Whether a form of the likelihood has the term without being asked for it.
bool hasTerm(LikelihoodForm form, ErrorTerm term);

/// Whether a form of the likelihood depends on the term, if the setup asks for it.
bool readsTerm(LikelihoodForm form, ErrorTerm term);

using ErrorValues = std::array<double, kErrorTermCount>;
ErrorValues neutralErrors();

/// Why a series has no likelihood; none where it has one.
enum class LikelihoodLack {
  none,
  missing,        ///< an observation that counts has no simulated value
  untransformed,  ///< a simulated value has no finite transformation
  notFinite,      ///< errors, or their deviations, are beyond the range of numbers
};

/// The standardised innovations a_t: normal, Student's t (scale 1, whose standard deviation is larger), or the skew
/// exponential power distribution SEP(0, 1, xi, beta) of Schoups and Vrugt (2010, doi:10.1029/2009WR008933).
class ErrorShape final {
 public:
  ErrorShape(LikelihoodForm form, const ErrorValues& values);

  double logDensity(double a) const;
  double draw(ChainRandom& random) const;

 private:
  enum class Kind { normal, student, skewExponentialPower };
  Kind kind_ = Kind::normal;
  double logConstant_ = 0.0;
  double freedom_ = 0.0;
  double skewness_ = 1.0;
  double kurtosis_ = 0.0;
  double mean_ = 0.0;      ///< mu_xi
  double spread_ = 1.0;    ///< sigma_xi
  double factor_ = 0.5;    ///< c_beta
  double exponent_ = 2.0;  ///< 2 / (1 + beta)
};

/// The errors of one series. With T the Box-Cox transformation of a value plus the shift, f the simulated and y the
/// observed values, and f' = f exp(mu_h f):
///   e_t = T(y_t) - T(f'_t),   e_t = phi e_(t-1) + (sigma_0 + sigma_1 |f'_t|) a_t.
/// phi is of the usual distance of observations; over another one it is raised to the power of the ratio and the
/// innovation widened or narrowed accordingly, and the first e_t has the standard deviation of the stationary process:
/// for normal errors of constant deviation this is exact. The deviation of an observation of weight w is divided by w,
/// at a time without an observation by the median of the weights.
class SeriesErrors final {
 public:
  /// `days` ascending; `observed` is NaN at times without an observation; `weights` is empty or has one per time.
  SeriesErrors(LikelihoodForm form, double shift, std::span<const double> days, std::span<const double> observed,
               std::span<const double> weights = {});

  /// The weight of times without an observation, the median of those of the observations; 1 without weights.
  double usualWeight() const { return usualWeight_; }

  /// The observations at which `simulated`, one value per time, has one count; the others do not, whatever a run has.
  void countWhere(std::span<const double> simulated);
  std::size_t count() const { return counted_.size(); }
  /// How many observations `simulated` has values for.
  std::size_t countIn(std::span<const double> simulated) const;

  /// The natural logarithm of the density of the observations; -infinity where a simulated value is missing or has no
  /// transformed value.
  double logLikelihood(std::span<const double> simulated, const ErrorValues& values) const;

  /// Why logLikelihood() is -infinity: the first of these reasons that one of the values gives.
  LikelihoodLack lackIn(std::span<const double> simulated, const ErrorValues& values) const;

  /// Turns simulated values into draws of what would be observed, time after time.
  class Path {
   public:
    Path(const SeriesErrors& errors, const ErrorValues& values);
    /// NaN for a value below the negative shift, which has no Box-Cox transformation, and of a missing one.
    double next(std::size_t time, double simulated, ChainRandom& random);
    /// False for a value that would be observed as it is, or not at all: the Box-Cox transformation of the negative
    /// shift is -infinity unless lambda is above 0, and there is none of a value below.
    bool hasErrors(double simulated) const;

   private:
    const SeriesErrors* errors_;
    ErrorValues values_;
    ErrorShape shape_;
    double before_ = std::numeric_limits<double>::quiet_NaN();  ///< e_(t-1)
    std::size_t timeBefore_ = 0;
  };

  /// The first observation that is not above the negative shift, which has no Box-Cox transformation; empty if none.
  std::optional<double> untransformable() const;
  /// The standard deviation of the transformed observations; 0 for fewer than two.
  double deviation(double lambda) const;

 private:
  struct Step {
    double correlation = 0.0;  ///< with e_(t-1)
    double widening = 1.0;     ///< of the innovation
  };
  Step stepOver(double days, double correlation) const;
  double transformed(double value, double lambda) const;
  static double biased(double simulated, const ErrorValues& values);
  double restored(double value, double lambda) const;

  LikelihoodForm form_;
  double shift_;
  std::vector<double> days_;
  std::vector<double> observed_;
  std::vector<double> weights_;
  std::vector<std::size_t> counted_;  ///< times
  double usualDistance_ = 1.0;        ///< days
  double usualWeight_ = 1.0;
};

}  // namespace mirevo
