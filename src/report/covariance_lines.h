#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

namespace mirevo {

/// The parameter covariance of a sensitivity analysis, as it is reported: on the model scale, one entry a parameter
/// that has a variance.
struct CovarianceReport {
  std::vector<std::string> names;
  std::vector<double> estimate;
  std::vector<double> standardDeviation;
  std::vector<double> lower95;
  std::vector<double> upper95;
  std::vector<std::vector<double>> correlation;
  std::vector<std::string> leftOut;  ///< parameters without a variance
};

/// Finds it in the closing lines of a sensitivity analysis's result file; nothing where they hold none. `parameters`
/// are the names of the variable ones.
std::optional<CovarianceReport> findCovariance(std::span<const std::string> closingLines,
                                               std::span<const std::string> parameters);

}  // namespace mirevo
