#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace mirevo {

/// Linear equations a·x = b in n unknowns, orthonormalised one after the other (modified Gram-Schmidt, twice): an
/// equation that those before it determine is left out.
class RowSpace final {
 public:
  explicit RowSpace(std::size_t unknownCount) : unknownCount_(unknownCount) {}

  /// False if it is left out.
  bool add(std::span<const double> row, double rightSide);
  /// Equations that are not left out.
  std::size_t size() const { return rows_.size(); }
  /// The shortest x that satisfies all.
  std::vector<double> shortestSolution() const;
  /// Orthonormal vectors that are orthogonal to all rows, n - size() of them.
  std::vector<std::vector<double>> nullSpace() const;
  /// y for which the sum of y times row, as they were added, comes nearest to `vector`; one each of size().
  std::vector<double> coefficientsOf(std::span<const double> vector) const;

 private:
  std::size_t unknownCount_;
  std::vector<std::vector<double>> rows_;     ///< orthonormal
  std::vector<double> rightSides_;            ///< of them
  std::vector<std::vector<double>> factors_;  ///< of each row added, by the orthonormal ones up to its own
};

}  // namespace mirevo
