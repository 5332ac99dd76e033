#include "algorithms/analyses/covariance.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>

#include <boost/math/distributions/students_t.hpp>
#include <fmt/core.h>

#include "algorithms/numbers/gram_matrix.h"
#include "algorithms/numbers/lapack.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {

namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kWarnAboveCorrelation = 0.95;

/// Smallest squared length of a column of length 1 that must remain after projecting out the columns before it.
/// Differences of a model's output have no more than 6 to 8 digits, so that anything smaller is noise.
constexpr double kSmallestPivot = 1.0e-12;
/// What remains of a dependent column is the rounding of all columns that it is made of, whose squares scatter by less
/// than this factor.
constexpr double kNoiseFactor = 4.0;
/// Largest share of a column's squared length that may come from single units of the simulated values.
constexpr double kMostLost = 0.5;

/// W^(1/2) J and W^(1/2) r, without the rows that have no residual.
struct WeightedModel {
  std::vector<std::vector<double>> columns;
  std::vector<double> residuals;
  std::vector<double> noise;  ///< expected squared length of what is rounding in a column
  std::vector<double> lost;   ///< share of a column's squared length that is nothing but rounding
  std::size_t withoutDerivative = 0;
  double lagOne = kNaN;
};

/// The expected square of what is rounding in a weighted derivative, `unit` being the weighted unit over the width. The
/// difference of two values, each rounded to its unit, has the variance unit^2 / 6, and none where both are written
/// alike; interpolation can make it a part of a unit.
double roundingSquare(double derivative, double unit) {
  const double part = std::min(std::abs(derivative), std::abs(unit));
  return part * part / 6.0;
}

/// The share of a column's squared length that comes from differences of a single unit beside rows without any. Where
/// the effect of a step is a part p of a unit, a part p of the rows differs by a whole one, and the share is 1 - p.
/// Neighbouring rows that differ alike are an effect, however few they are.
double lostShare(std::span<const double> column, std::span<const double> units) {
  constexpr double kSingle = 1.5;  // units: between one and two
  double lost = 0.0;
  double all = 0.0;
  for (std::size_t i = 0; i < units.size(); ++i) {
    const double square = column[i] * column[i];
    all += square;
    if (!(square > 0.0) || std::abs(column[i]) > kSingle * units[i]) continue;
    double neighbours = 0.0;
    double alike = 0.0;
    for (const std::size_t k : {i - 1, i + 1}) {  // of row 0 the former is no row either
      if (k >= units.size()) continue;
      neighbours += 1.0;
      // Interpolation spreads a difference of one time step over the two observations beside it.
      if (column[i] * column[k] > 0.0) alike += std::min(1.0, std::abs(column[k]) / units[k]);
    }
    if (neighbours > 0.0) lost += square * (1.0 - alike / neighbours);
  }
  return all > 0.0 ? lost / all : 0.0;
}

WeightedModel weighRows(const LinearisedModel& model) {
  assert(model.weights.empty() || model.weights.size() == model.residuals.size());
  WeightedModel weighted;
  weighted.columns.resize(model.jacobian.size());
  weighted.noise.resize(model.jacobian.size(), 0.0);
  std::vector<std::size_t> known;
  for (std::size_t j = 0; j < model.jacobian.size(); ++j) {
    const std::vector<double>& column = model.jacobian[j];
    if (std::any_of(column.begin(), column.end(), [](double value) { return std::isfinite(value); }))
      known.push_back(j);
  }
  double products = 0.0;
  double squares = 0.0;
  std::vector<std::size_t> used;  // rows
  for (std::size_t i = 0; i < model.residuals.size(); ++i) {
    if (!std::isfinite(model.residuals[i])) continue;
    if (!std::all_of(known.begin(), known.end(), [&](std::size_t j) { return std::isfinite(model.jacobian[j][i]); })) {
      ++weighted.withoutDerivative;
      continue;
    }
    const double root = model.weights.empty() ? 1.0 : std::sqrt(model.weights[i]);
    const bool follows =
        !used.empty() && used.back() + 1 == i && (model.series.empty() || model.series[used.back()] == model.series[i]);
    const double residual = root * model.residuals[i];
    if (follows) products += weighted.residuals.back() * residual;
    squares += residual * residual;
    used.push_back(i);
    weighted.residuals.push_back(residual);
  }
  std::vector<double> units;  // of the entries of a column
  for (std::size_t j = 0; j < model.jacobian.size(); ++j) {
    units.clear();
    weighted.columns[j].reserve(used.size());
    for (const std::size_t i : used) {
      const double root = model.weights.empty() ? 1.0 : std::sqrt(model.weights[i]);
      weighted.columns[j].push_back(root * model.jacobian[j][i]);
      if (model.units.empty()) continue;
      units.push_back(std::abs(root * model.units[i] / model.widths[j]));
      weighted.noise[j] += roundingSquare(weighted.columns[j].back(), units.back());
    }
    weighted.lost.push_back(lostShare(weighted.columns[j], units));
  }
  if (squares > 0.0) weighted.lagOne = products / squares;
  return weighted;
}

double dot(std::span<const double> a, std::span<const double> b) {
  double sum = 0.0;
  for (std::size_t i = 0; i < a.size(); ++i) sum += a[i] * b[i];
  return sum;
}

/// Scales a column to length 1 and returns its former length. Divides by the largest entry first, so that squares
/// neither overflow nor underflow. Leaves a zero column unchanged.
double normalise(std::vector<double>& column) {
  double largest = 0.0;
  for (const double value : column) largest = std::max(largest, std::abs(value));
  if (largest == 0.0) return 0.0;
  for (double& value : column) value /= largest;
  const double length = std::sqrt(dot(column, column));
  for (double& value : column) value /= length;
  return largest * length;
}

/// J'WJ of the kept columns, which are normalised: k x k, with 1 on the diagonal.
std::vector<double> gramOf(const std::vector<std::vector<double>>& columns, std::span<const std::size_t> kept) {
  std::vector<std::span<const double>> used;
  for (const std::size_t j : kept) used.emplace_back(columns[j]);
  return gramMatrix(used);
}

/// Without one of its k rows and columns.
std::vector<double> without(std::size_t left, const std::vector<double>& gram, std::size_t k) {
  std::vector<double> rest;
  rest.reserve((k - 1) * (k - 1));
  for (std::size_t i = 0; i < k; ++i) {
    for (std::size_t j = 0; i != left && j < k; ++j) {
      if (j != left) rest.push_back(gram[i * k + j]);
    }
  }
  return rest;
}

/// The coefficients of column i on the columns before it, by the triangular factor R of the Gram matrix: R b = R(., i).
std::vector<double> coefficients(std::span<const double> factor, std::size_t k, std::size_t i) {
  // DPOTRF fills the upper triangle, in Fortran's column order.
  std::vector<double> b(factor.begin() + static_cast<std::ptrdiff_t>(i * k),
                        factor.begin() + static_cast<std::ptrdiff_t>(i * k + i));
  for (std::size_t row = i; row-- > 0;) {
    b[row] /= factor[row * k + row];
    for (std::size_t above = 0; above < row; ++above) b[above] -= factor[row * k + above] * b[row];
  }
  return b;
}

/// Factorises the Gram matrix in place. Returns the 0-based index of the first column that depends on those before it,
/// or k when there is none. `noise` is the share of rounding in the squared length of each column; what is left of a
/// column holds its own and, by its coefficients, that of the others.
std::size_t factorise(std::vector<double>& gram, std::size_t k, std::span<const double> noise) {
  const int n = static_cast<int>(k);
  int info = 0;
  lapack().dpotrf("U", &n, gram.data(), &n, &info);
  const std::size_t sound = info > 0 ? static_cast<std::size_t>(info - 1) : k;
  for (std::size_t i = 0; i < sound; ++i) {
    const double pivot = gram[i * k + i];
    double rounding = i == 0 ? 0.0 : noise[i];  // the first cannot depend on others
    if (i > 0 && pivot * pivot > kSmallestPivot) {
      const std::vector<double> b = coefficients(gram, k, i);
      for (std::size_t j = 0; j < i; ++j) rounding += b[j] * b[j] * noise[j];
    }
    if (!(pivot * pivot > std::max(kSmallestPivot, kNoiseFactor * rounding))) return i;
  }
  return sound;
}

/// Leaves out the parameters that cannot have a variance and returns the inverse of the Gram matrix of the others.
std::vector<double> invertWhatCanBe(const WeightedModel& weighted, std::span<const double> lengths,
                                    std::span<const std::string> problems, ParameterCovariance& result) {
  for (std::size_t j = 0; j < lengths.size(); ++j) {
    if (j < problems.size() && !problems[j].empty()) {
      result.leftOut.push_back({j, problems[j], true});
    } else if (!std::isfinite(lengths[j])) {
      result.leftOut.push_back({j, "its derivatives are not known"});
    } else if (lengths[j] == 0.0) {
      result.leftOut.push_back({j,
                                "no simulated value changes with its step; if it has an effect, a larger step or more "
                                "digits in the model's output show it"});
    } else if (weighted.lost[j] > kMostLost) {
      result.leftOut.push_back({j, "the effect of its step is lost in the rounding of the model's output"});
    } else {
      result.kept.push_back(j);
    }
  }
  std::vector<double> gram;
  for (std::vector<double> whole = gramOf(weighted.columns, result.kept);;) {
    const std::size_t k = result.kept.size();
    gram = whole;
    std::vector<double> noise;
    for (const std::size_t j : result.kept) noise.push_back(weighted.noise[j] / (lengths[j] * lengths[j]));
    const std::size_t dependent = k == 0 ? 0 : factorise(gram, k, noise);
    if (dependent == k) break;
    result.leftOut.push_back(
        {result.kept[dependent], "its effect cannot be told from that of the parameters before it"});
    result.kept.erase(result.kept.begin() + static_cast<std::ptrdiff_t>(dependent));
    whole = without(dependent, whole, k);
  }
  if (!gram.empty()) {
    const int n = static_cast<int>(result.kept.size());
    int info = 0;
    lapack().dpotri("U", &n, gram.data(), &n, &info);
    assert(info == 0);
  }
  std::sort(result.leftOut.begin(), result.leftOut.end(),
            [](const LeftOutParameter& a, const LeftOutParameter& b) { return a.index < b.index; });
  return gram;
}

/// The factor is that of a mean of residuals that follow one another as in a first-order autoregression. No line for
/// residuals that are all 0.
std::vector<std::string> lagOneLines(double lagOne) {
  constexpr double kHardlyAny = 0.1;
  if (!std::isfinite(lagOne)) return {};
  if (!(lagOne > kHardlyAny) || lagOne >= 1.0)
    return {fmt::format("Lag-1 correlation of the residuals: {:.3f}", lagOne)};
  return {
      fmt::format("Lag-1 correlation of the residuals: {:.3f}, which makes the standard deviations about {:.1f} times "
                  "too small, and the limits as much too narrow",
                  lagOne, std::sqrt((1.0 + lagOne) / (1.0 - lagOne)))};
}

}  // namespace

ParameterCovariance parameterCovariance(const LinearisedModel& model) {
  WeightedModel weighted = weighRows(model);
  ParameterCovariance result;
  result.observationCount = weighted.residuals.size();
  result.withoutDerivative = weighted.withoutDerivative;
  result.lagOne = weighted.lagOne;
  std::vector<double> lengths;
  for (std::vector<double>& column : weighted.columns) {
    const bool isKnown = std::all_of(column.begin(), column.end(), [](double value) { return std::isfinite(value); });
    lengths.push_back(isKnown ? normalise(column) : kNaN);
  }
  const std::vector<double> inverse = invertWhatCanBe(weighted, lengths, model.problems, result);

  const std::size_t k = result.kept.size();
  const std::size_t n = result.observationCount;
  result.degreesOfFreedom = n > k ? n - k : 0;
  const bool hasVariance = result.degreesOfFreedom > 0;
  const auto degrees = static_cast<double>(result.degreesOfFreedom);
  result.errorVariance = hasVariance ? dot(weighted.residuals, weighted.residuals) / degrees : kNaN;
  result.tQuantile = hasVariance ? boost::math::quantile(boost::math::students_t(degrees), 0.975) : kNaN;

  result.covariance.assign(k, std::vector<double>(k));
  result.correlation.assign(k, std::vector<double>(k, 1.0));
  for (std::size_t i = 0; i < k; ++i) {
    for (std::size_t j = 0; j <= i; ++j) {
      // DPOTRI fills the upper triangle, in Fortran's column order.
      const double entry = inverse[i * k + j];
      const double scale = lengths[result.kept[i]] * lengths[result.kept[j]];
      result.covariance[i][j] = result.covariance[j][i] = result.errorVariance * entry / scale;
      if (i != j) {
        const double r = entry / std::sqrt(inverse[i * k + i]) / std::sqrt(inverse[j * k + j]);
        result.correlation[i][j] = result.correlation[j][i] = std::clamp(r, -1.0, 1.0);
      }
    }
    const double length = lengths[result.kept[i]];
    result.standardDeviations.push_back(std::sqrt(result.errorVariance * inverse[i * k + i]) / length);
  }
  return result;
}

std::vector<ParameterLimits> parameterLimits(const ParameterCovariance& covariance, const SearchSpace& space,
                                             std::span<const double> set) {
  std::vector<ParameterLimits> limits;
  for (std::size_t i = 0; i < covariance.kept.size(); ++i) {
    const std::size_t j = covariance.kept[i];
    const double deviation = covariance.standardDeviations[i];
    const double reach = covariance.tQuantile * deviation;
    // The limits of an integer parameter are not rounded to integers: they are those of a continuous quantity.
    if (space.transformation[j] == TransformationType::logarithmic) {
      const double value = toModelScale(space, j, set[j]);
      limits.push_back({value, value * deviation, std::exp(set[j] - reach), std::exp(set[j] + reach)});
    } else {
      limits.push_back({set[j], deviation, set[j] - reach, set[j] + reach});
    }
  }
  return limits;
}

std::vector<DataTable> covarianceTables(const ParameterCovariance& covariance, const SearchSpace& space,
                                        std::span<const double> set) {
  if (covariance.degreesOfFreedom == 0) return {};
  std::vector<std::string> names;
  for (const std::size_t j : covariance.kept) names.push_back(space.names[j]);
  std::vector<DataTable> tables;
  tables.push_back(
      matrixTable(run_files::kCovariance, "Covariance of the parameters, search scale", names, covariance.covariance));
  tables.push_back(
      matrixTable(run_files::kCorrelation, "Correlation of the parameters", names, covariance.correlation));
  DataTable& limits = tables.emplace_back();
  limits.file = run_files::kParameterLimits;
  limits.headLines = lagOneLines(covariance.lagOne);
  limits.headLines.insert(limits.headLines.begin(),
                          "Estimate, standard deviation and 95 % limits of each parameter, model scale");
  limits.columns = {"Parameter", "Estimate", "StandardDeviation", "Lower95", "Upper95", "LeftOut"};
  const std::vector<ParameterLimits> found = parameterLimits(covariance, space, set);
  for (std::size_t i = 0; i < names.size(); ++i) {
    limits.rows.push_back(
        {names[i], found[i].value, found[i].standardDeviation, found[i].lower, found[i].upper, std::string()});
  }
  for (const LeftOutParameter& parameter : covariance.leftOut) {
    limits.rows.push_back({space.names[parameter.index], kNaN, kNaN, kNaN, kNaN, parameter.reason});
  }
  return tables;
}

DataTable jacobianTable(LinearisedModel model, const SearchSpace& space,
                        std::span<const ObservationLabel> observations) {
  DataTable table;
  table.file = run_files::kJacobian;
  table.headLines = {
      "Derivatives of the simulated values by the parameters, search scale; the residual is the simulated "
      "less the observed value, the weight that of its square"};
  table.columns = {"Measure", "Time", "Weight", "Residual"};
  table.columns.insert(table.columns.end(), space.names.begin(), space.names.end());
  for (std::size_t i = 0; i < model.residuals.size(); ++i) {
    if (!std::isfinite(model.residuals[i])) continue;
    table.rows.push_back({observations[i].measure, observations[i].time, model.weights.empty() ? 1.0 : model.weights[i],
                          model.residuals[i]});
  }
  for (std::vector<double>& column : model.jacobian) {
    std::size_t row = 0;
    for (std::size_t i = 0; i < model.residuals.size(); ++i) {
      if (std::isfinite(model.residuals[i])) column[row++] = column[i];
    }
    column.resize(row);
  }
  table.realColumns = std::move(model.jacobian);
  return table;
}

std::vector<std::string> formatCovariance(const ParameterCovariance& covariance, const SearchSpace& space,
                                          std::span<const double> set, std::string_view filePrefix) {
  std::vector<std::string> lines;
  lines.push_back(fmt::format("Parameter covariance: {}, {}, {}", countText(covariance.observationCount, "observation"),
                              countText(covariance.kept.size(), "parameter"),
                              countText(covariance.degreesOfFreedom, "degree of freedom", "degrees of freedom")));
  for (const LeftOutParameter& parameter : covariance.leftOut) {
    lines.push_back(fmt::format("{}Parameter {} is left out of the covariance matrix: {}",
                                parameter.isKnownBefore ? "" : "Warning: ", space.names[parameter.index],
                                parameter.reason));
  }
  if (covariance.kept.empty()) return lines;
  if (covariance.degreesOfFreedom == 0) {
    lines.emplace_back("Warning: No covariance matrix: there must be more observations than parameters");
    return lines;
  }
  if (covariance.withoutDerivative > 0) {
    lines.push_back(fmt::format("Warning: {} left out of the covariance matrix: a perturbed run has no value there",
                                countText(covariance.withoutDerivative, "observation is", "observations are")));
  }
  lines.push_back(fmt::format("Standard error of a residual: {:.6g}", std::sqrt(covariance.errorVariance)));
  for (std::string& line : lagOneLines(covariance.lagOne)) lines.push_back(std::move(line));

  std::vector<std::string> names;
  for (const std::size_t j : covariance.kept) names.push_back(space.names[j]);
  const auto append = [&](const std::string& title, std::span<const std::string> headings,
                          std::span<const std::vector<double>> rows) {
    lines.emplace_back();
    for (std::string& line : formatTable(title, headings, names, rows)) lines.push_back(std::move(line));
  };
  std::vector<std::vector<double>> rows;
  for (const ParameterLimits& limits : parameterLimits(covariance, space, set)) {
    rows.push_back({limits.value, limits.standardDeviation, limits.lower, limits.upper});
  }
  const std::string headings[] = {"Value", "Std. deviation", "95 % lower", "95 % upper"};
  append("Parameter (model scale)", headings, rows);
  const auto fileName = [&](const RunFile& file) { return fileNameOf(runFilePath(filePrefix, file)); };
  if (names.size() <= kMostShownParameters) {
    append("Covariance (search scale)", names, covariance.covariance);
  } else {
    lines.emplace_back();
    lines.push_back(fmt::format("   The covariance of the {} parameters (search scale) is in {}", names.size(),
                                fileName(run_files::kCovariance)));
  }
  lines.emplace_back();
  for (std::string& line :
       formatCorrelation("Correlation", names, covariance.correlation, fileName(run_files::kCorrelation))) {
    lines.push_back(std::move(line));
  }
  for (std::size_t i = 0; i < names.size(); ++i) {
    for (std::size_t j = 0; j < i; ++j) {
      if (!(std::abs(covariance.correlation[i][j]) > kWarnAboveCorrelation)) continue;
      lines.push_back(
          fmt::format("Warning: Parameters {} and {} are correlated by {:.4f}: the observations hardly tell "
                      "them apart",
                      names[j], names[i], covariance.correlation[i][j]));
    }
  }
  return lines;
}

}  // namespace mirevo
