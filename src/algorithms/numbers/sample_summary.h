#pragma once

#include <array>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/data_table.h"
#include "common/run_files.h"

namespace mirevo {

/// The probabilities of the quantiles that summaries give.
inline constexpr std::array kSummaryProbabilities{0.05, 0.25, 0.50, 0.75, 0.95};

/// Statistics of a sample of one quantity. Those for which the sample is too small are NaN.
struct SampleSummary {
  std::size_t count = 0;  ///< finite values; the others are left out
  double mean = 0.0;
  double standardDeviation = 0.0;                                ///< divisor n - 1
  std::array<double, kSummaryProbabilities.size()> quantiles{};  ///< at kSummaryProbabilities
};

/// How a quantile between two order statistics is found.
enum class QuantileKind {
  interpolated,
  ofValues,  ///< the lower of them: one of the values
};

SampleSummary summariseSample(std::span<const double> values, QuantileKind kind = QuantileKind::interpolated);

/// The quantile of ascending values at a probability in [0, 1], linear between the order statistics around
/// (n - 1) p: type 7 of Hyndman and Fan (1996), doi:10.1080/00031305.1996.10473566. NaN without a value.
double sortedQuantile(std::span<const double> ascending, double probability,
                      QuantileKind kind = QuantileKind::interpolated);

/// The sample correlation of two samples of equal length; NaN if one of them is constant or they have fewer than 2
/// values.
double sampleCorrelation(std::span<const double> a, std::span<const double> b);

/// The correlations of the columns of a sample, each computed when it is asked for: sampleCorrelation() of the two.
class SampleCorrelations final {
 public:
  /// `rows`: n rows of p values each.
  explicit SampleCorrelations(std::span<const std::vector<double>> rows);
  /// The same of columns that are centred and scaled to length 1 already, NaN where they are constant.
  static SampleCorrelations ofScaled(std::span<const std::vector<double>> columns);

  std::size_t size() const { return roots_.size(); }
  double of(std::size_t i, std::size_t j) const;

 private:
  SampleCorrelations() = default;

  std::size_t count_ = 0;        ///< n
  std::vector<double> centred_;  ///< one column after another, without their means
  std::vector<double> roots_;    ///< square roots of the sums of their squares
};

/// The correlation of two parameters, 0-based.
struct PairCorrelation {
  std::size_t first = 0;
  std::size_t second = 0;
  double value = 0.0;
};
/// The `count` correlations of different columns with the largest absolute values, the largest first; of equals that of
/// the first columns. NaN is left out.
std::vector<PairCorrelation> largestCorrelations(const SampleCorrelations& correlations, std::size_t count);

/// The correlation matrix of the columns of `rows` (n rows of p values each), p x p, with 1 on the diagonal.
std::vector<std::vector<double>> correlationMatrix(std::span<const std::vector<double>> rows);

/// A square matrix of parameters, one row and one column each, as a table for programs; an empty one has no rows.
DataTable matrixTable(const RunFile& file, std::string headLine, std::span<const std::string> names,
                      std::span<const std::vector<double>> matrix);

/// A table as lines of text: names to the left, then one right-aligned column per heading, with six significant digits.
/// `rows[i]` follows `names[i]`.
std::vector<std::string> formatTable(const std::string& corner, std::span<const std::string> headings,
                                     std::span<const std::string> names, std::span<const std::vector<double>> rows);

/// Log, result file and report show a matrix of up to this many parameters; a larger one is written once, to a table of
/// its own.
inline constexpr std::size_t kMostShownParameters = 10;

inline constexpr std::size_t kLargestShown = 10;

/// The two parameters of an entry of a matrix, 0-based, row below column.
using MatrixEntry = std::pair<std::size_t, std::size_t>;
/// The 10 entries above the diagonal with the largest absolute values, the largest first; NaN is left out.
std::vector<MatrixEntry> largestEntries(std::span<const std::vector<double>> matrix);
/// The same with their values.
std::vector<PairCorrelation> largestPairs(std::span<const std::vector<double>> matrix);

/// Of more parameters than a matrix is kept of, the largest correlations: as a table for programs, one pair per row.
DataTable pairTable(const RunFile& file, std::string_view headLine, std::span<const std::string> names,
                    std::span<const PairCorrelation> largest);
inline constexpr std::size_t kMostLargeCorrelations = 10'000;
/// ... and the first of them as lines of text, with the name of the `file` that has all.
std::vector<std::string> formatLargest(const std::string& title, std::span<const std::string> names,
                                       std::span<const PairCorrelation> largest, std::string_view file);

/// A correlation matrix as lines of text: the table of up to kMostShownParameters; of more the largestEntries() alone
/// and the name of the `file` that has all.
std::vector<std::string> formatCorrelation(const std::string& title, std::span<const std::string> names,
                                           std::span<const std::vector<double>> matrix, std::string_view file);

}  // namespace mirevo
