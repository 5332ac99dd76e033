#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "common/data_table.h"
#include "parameters/search_space.h"

namespace mirevo {

/// A model linearised at its parameter values: n observations, p parameters.
struct LinearisedModel {
  std::vector<double> residuals;              ///< r, simulated minus observed, n; rows with a NaN are left out
  std::vector<double> weights;                ///< the diagonal of W, n; all 1 when empty
  std::vector<std::vector<double>> jacobian;  ///< J by columns: p columns of n derivatives on the search scale
  std::vector<std::size_t> series = {};       ///< the series of each row, n; all the same when empty
  /// The unit in which each simulated value is printed, n, and the widths of the differences that gave the columns, p:
  /// from both follows how much of a column is rounding. None when empty.
  std::vector<double> units = {};
  std::vector<double> widths = {};
  /// Which derivatives of each column are one-sided for want of a value, p of n; none when empty.
  std::vector<std::vector<bool>> oneSided = {};
  /// Why a column is not known, p; an empty text for one that is. None when empty.
  std::vector<std::string> problems = {};
};

/// A parameter without a variance, and why.
struct LeftOutParameter {
  std::size_t index = 0;  ///< 0-based
  std::string reason;
  bool isKnownBefore = false;  ///< it is that of a column that is not known, of which there is a warning already
};

/// The covariance matrix s^2 (J'WJ)^-1 of the parameters that have one, with s^2 = r'Wr / (n - k); search scale.
struct ParameterCovariance {
  std::vector<std::size_t> kept;  ///< k parameters, ascending; the matrices and vectors below have their order
  std::vector<LeftOutParameter> leftOut;
  std::size_t observationCount = 0;   ///< n, rows with a NaN not counted
  std::size_t withoutDerivative = 0;  ///< observations for which a perturbed run has no value
  std::size_t degreesOfFreedom = 0;   ///< n - k
  double errorVariance = 0.0;         ///< s^2; NaN, with all that follows, when there are no degrees of freedom
  std::vector<std::vector<double>> covariance;
  std::vector<std::vector<double>> correlation;
  std::vector<double> standardDeviations;
  double tQuantile = 0.0;  ///< 97.5 % quantile of Student's t
  double lagOne = 0.0;     ///< correlation of each weighted residual with the next of its series; NaN if there is none
};

/// By Cholesky factorisation of the scaled matrix (DPOTRF, DPOTRI). A parameter whose column is zero, has no finite
/// entry, is mostly rounding of the simulated values, or is, to within this rounding, a linear combination of the
/// columns before it is left out, with the reason. A row that lacks a derivative by another parameter is left out.
ParameterCovariance parameterCovariance(const LinearisedModel& model);

/// One parameter on the model scale. The limits are computed on the search scale and transformed back; the standard
/// deviation follows from the derivative of the transformation (delta method).
struct ParameterLimits {
  double value = 0.0;
  double standardDeviation = 0.0;
  double lower = 0.0;  ///< 95 % limits
  double upper = 0.0;
};

/// One entry per kept parameter; `set` is the parameter set at which the model was linearised, on the search scale.
std::vector<ParameterLimits> parameterLimits(const ParameterCovariance& covariance, const SearchSpace& space,
                                             std::span<const double> set);

/// The analysis as tables for programs: covariance matrix (search scale), correlation matrix, and limits of the
/// parameters (model scale) with the reasons why some are left out. No tables unless there are more observations than
/// parameters.
std::vector<DataTable> covarianceTables(const ParameterCovariance& covariance, const SearchSpace& space,
                                        std::span<const double> set);

/// The observation that a row of a linearised model belongs to.
struct ObservationLabel {
  std::string measure;
  std::string time;
};

/// The linearised model as a table for programs, one row per observation that counts: its weight in W, its residual and
/// its derivatives on the search scale. `observations` has one entry per row of the model. Takes its Jacobian.
DataTable jacobianTable(LinearisedModel model, const SearchSpace& space,
                        std::span<const ObservationLabel> observations);

/// The covariance analysis as lines of text for the log, with a warning for each |r| > 0.95. Of more parameters than
/// kMostShownParameters it has the largest correlations alone and names the files of the matrices, whose names begin
/// with `filePrefix`.
std::vector<std::string> formatCovariance(const ParameterCovariance& covariance, const SearchSpace& space,
                                          std::span<const double> set, std::string_view filePrefix = {});

}  // namespace mirevo
