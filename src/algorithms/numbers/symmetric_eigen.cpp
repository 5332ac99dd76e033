#include "algorithms/numbers/symmetric_eigen.h"

#include <cmath>
#include <limits>

namespace mirevo {
namespace {

constexpr int kMostSweeps = 50;  // some ten are enough for any matrix that can be decomposed

/// Cosine and sine of the rotation that makes entry (p, q) zero.
struct Rotation {
  double c = 1.0;
  double s = 0.0;
  double t = 0.0;  ///< s / c
};

Rotation rotationFor(double app, double aqq, double apq) {
  const double theta = (aqq - app) / (2.0 * apq);
  const double t = (theta >= 0.0 ? 1.0 : -1.0) / (std::abs(theta) + std::sqrt(theta * theta + 1.0));
  const double c = 1.0 / std::sqrt(t * t + 1.0);
  return {c, t * c, t};
}

void rotateRows(double* p, double* q, std::size_t n, const Rotation& r) {
  for (std::size_t k = 0; k < n; ++k) {
    const double a = p[k];
    const double b = q[k];
    p[k] = r.c * a - r.s * b;
    q[k] = r.s * a + r.c * b;
  }
}

/// Rotates rows and columns p and q, which makes entry (p, q) zero.
void rotateBoth(std::vector<double>& a, std::size_t n, std::size_t p, std::size_t q, const Rotation& r) {
  const double app = a[p * n + p];
  const double aqq = a[q * n + q];
  const double apq = a[p * n + q];
  rotateRows(&a[p * n], &a[q * n], n, r);
  for (std::size_t k = 0; k < n; ++k) {
    a[k * n + p] = a[p * n + k];
    a[k * n + q] = a[q * n + k];
  }
  a[p * n + p] = app - r.t * apq;
  a[q * n + q] = aqq + r.t * apq;
  a[p * n + q] = a[q * n + p] = 0.0;
}

}  // namespace

SymmetricEigen decomposeSymmetric(std::span<const double> matrix, std::size_t n) {
  std::vector<double> a(matrix.begin(), matrix.end());
  SymmetricEigen eigen{std::vector<double>(n), std::vector<double>(n * n, 0.0)};
  for (std::size_t k = 0; k < n; ++k) eigen.vectors[k * n + k] = 1.0;
  bool isRotated = true;
  for (int sweep = 0; sweep < kMostSweeps && isRotated; ++sweep) {
    isRotated = false;
    for (std::size_t p = 0; p + 1 < n; ++p) {
      for (std::size_t q = p + 1; q < n; ++q) {
        const double apq = std::abs(a[p * n + q]);
        const double scale = std::sqrt(std::abs(a[p * n + p] * a[q * n + q]));
        if (!(apq > std::numeric_limits<double>::epsilon() * scale)) continue;
        const Rotation rotation = rotationFor(a[p * n + p], a[q * n + q], a[p * n + q]);
        rotateBoth(a, n, p, q, rotation);
        rotateRows(&eigen.vectors[p * n], &eigen.vectors[q * n], n, rotation);
        isRotated = true;
      }
    }
  }
  for (std::size_t k = 0; k < n; ++k) eigen.values[k] = a[k * n + k];
  return eigen;
}

}  // namespace mirevo
