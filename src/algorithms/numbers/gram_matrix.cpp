#include "algorithms/numbers/gram_matrix.h"

#include <algorithm>
#include <cstddef>

namespace mirevo {
namespace {

/// So many columns are taken at once: the sums of two such tiles fit into the registers.
constexpr std::size_t kTile = 4;

/// Columns side by side, row by row; what is missing of them is 0.
std::vector<double> tileOf(std::span<const std::span<const double>> columns) {
  std::vector<double> tile(columns.front().size() * kTile);
  for (std::size_t c = 0; c < columns.size(); ++c) {
    for (std::size_t i = 0; i < columns[c].size(); ++i) tile[i * kTile + c] = columns[c][i];
  }
  return tile;
}

struct TileProducts {
  double sums[kTile][kTile] = {};

  TileProducts(const std::vector<double>& left, const std::vector<double>& right) {
    double sum[kTile][kTile] = {};  // of its own, so that it can be in registers
    const double* b = right.data();
    for (const double *a = left.data(), *const end = a + left.size(); a != end; a += kTile, b += kTile) {
      for (std::size_t row = 0; row < kTile; ++row) {
        for (std::size_t column = 0; column < kTile; ++column) sum[row][column] += a[row] * b[column];
      }
    }
    std::copy(&sum[0][0], &sum[0][0] + kTile * kTile, &sums[0][0]);
  }
};

}  // namespace

std::vector<double> gramMatrix(std::span<const std::span<const double>> columns) {
  const std::size_t p = columns.size();
  std::vector<double> gram(p * p);
  std::vector<std::vector<double>> tiles;
  for (std::size_t first = 0; first < p; first += kTile) {
    tiles.push_back(tileOf(columns.subspan(first, std::min(kTile, p - first))));
  }
  for (std::size_t i = 0; i < tiles.size(); ++i) {
    for (std::size_t j = 0; j <= i; ++j) {
      const TileProducts products(tiles[i], tiles[j]);
      for (std::size_t row = i * kTile; row < std::min(p, (i + 1) * kTile); ++row) {
        for (std::size_t column = j * kTile; column < std::min(p, (j + 1) * kTile); ++column) {
          gram[row * p + column] = gram[column * p + row] = products.sums[row % kTile][column % kTile];
        }
      }
    }
  }
  return gram;
}

}  // namespace mirevo
