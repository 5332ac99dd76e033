#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "algorithms/numbers/special_functions.h"
#include "algorithms/test_functions.h"

/// Ill-conditioned and rotated test functions, after the formulas of Hansen, Finck, Ros and Auger (2009),
/// Real-Parameter Black-Box Optimization Benchmarking 2009: Noiseless Functions Definitions, INRIA RR-6829. Rotations
/// and optima are drawn from the seed by this program's own generator, so that the instances are not those of the
/// publication. The value of every optimum is 0.
namespace mirevo::testing {

using Matrix = std::vector<std::vector<double>>;

inline std::vector<double> times(const Matrix& matrix, const std::vector<double>& x) {
  std::vector<double> y(matrix.size(), 0.0);
  for (std::size_t i = 0; i < matrix.size(); ++i) {
    for (std::size_t j = 0; j < x.size(); ++j) y[i] += matrix[i][j] * x[j];
  }
  return y;
}

/// Normal deviates made orthonormal row by row: uniformly distributed among all rotations and reflections.
inline Matrix randomRotation(std::size_t n, UniformGenerator& random) {
  Matrix rows(n, std::vector<double>(n));
  for (std::size_t i = 0; i < n; ++i) {
    int fault = 0;
    for (double& value : rows[i]) value = normalQuantile(random.next(), fault);
    for (int pass = 0; pass < 2; ++pass) {
      for (std::size_t k = 0; k < i; ++k) {
        double product = 0.0;
        for (std::size_t j = 0; j < n; ++j) product += rows[i][j] * rows[k][j];
        for (std::size_t j = 0; j < n; ++j) rows[i][j] -= product * rows[k][j];
      }
    }
    double squares = 0.0;
    for (const double value : rows[i]) squares += value * value;
    for (double& value : rows[i]) value /= std::sqrt(squares);
  }
  return rows;
}

/// T_osz: small irregularities.
inline double oscillated(double x) {
  if (x == 0.0) return 0.0;
  const double c1 = x > 0.0 ? 10.0 : 5.5;
  const double c2 = x > 0.0 ? 7.9 : 3.1;
  const double log = std::log(std::abs(x));
  return (x > 0.0 ? 1.0 : -1.0) * std::exp(log + 0.049 * (std::sin(c1 * log) + std::sin(c2 * log)));
}

/// (i − 1)/(n − 1), counted from 1.
inline double shareOf(std::size_t i, std::size_t n) {
  return n > 1 ? static_cast<double>(i) / static_cast<double>(n - 1) : 0.0;
}

/// f_pen: the squares of how far coordinates are outside ±5.
inline double outside(const std::vector<double>& x) {
  double sum = 0.0;
  for (const double value : x) sum += std::pow(std::max(0.0, std::abs(value) - 5.0), 2.0);
  return sum;
}

/// Where the optimum lies and how the coordinates are turned around it.
struct Turned {
  std::vector<double> optimum;
  Matrix rotation;

  /// R·(x − x_opt).
  std::vector<double> operator()(const std::vector<double>& x) const {
    std::vector<double> moved(x.size());
    for (std::size_t j = 0; j < x.size(); ++j) moved[j] = x[j] - optimum[j];
    return times(rotation, moved);
  }
};

/// With the optimum anywhere within ±4.
inline Turned turnedBy(std::size_t n, UniformGenerator& random) {
  std::vector<double> optimum(n);
  for (double& value : optimum) value = 8.0 * random.next() - 4.0;
  return {std::move(optimum), randomRotation(n, random)};
}

inline TestFunction around(std::string name, const std::vector<double>& optimum,
                           std::function<double(const std::vector<double>&)> value) {
  const std::size_t n = optimum.size();
  return {std::move(name), std::vector<double>(n, -5.0), std::vector<double>(n, 5.0), optimum, 0.0, std::move(value)};
}

/// A quadratic function of condition 10^6 whose axes are turned, without the irregularities of the others.
inline TestFunction rotatedEllipsoid(std::size_t n, int seed) {
  UniformGenerator random(200000 + seed);
  const Turned turned = turnedBy(n, random);
  return around("Rotated ellipsoid", turned.optimum, [turned, n](const auto& x) {
    double sum = 0.0;
    const std::vector<double> z = turned(x);
    for (std::size_t i = 0; i < n; ++i) sum += std::pow(10.0, 6.0 * shareOf(i, n)) * z[i] * z[i];
    return sum;
  });
}

/// f10.
inline TestFunction ellipsoid(std::size_t n, int seed) {
  UniformGenerator random(210000 + seed);
  const Turned turned = turnedBy(n, random);
  return around("Ellipsoid", turned.optimum, [turned, n](const auto& x) {
    double sum = 0.0;
    const std::vector<double> z = turned(x);
    for (std::size_t i = 0; i < n; ++i) sum += std::pow(10.0, 6.0 * shareOf(i, n)) * std::pow(oscillated(z[i]), 2.0);
    return sum;
  });
}

/// f11.
inline TestFunction discus(std::size_t n, int seed) {
  UniformGenerator random(220000 + seed);
  const Turned turned = turnedBy(n, random);
  return around("Discus", turned.optimum, [turned](const auto& x) {
    double sum = 0.0;
    double weight = 1.0e6;
    for (const double value : turned(x)) sum += std::exchange(weight, 1.0) * std::pow(oscillated(value), 2.0);
    return sum;
  });
}

/// f12.
inline TestFunction bentCigar(std::size_t n, int seed) {
  UniformGenerator random(230000 + seed);
  const Turned turned = turnedBy(n, random);
  return around("Bent cigar", turned.optimum, [turned, n](const auto& x) {
    std::vector<double> bent = turned(x);
    for (std::size_t i = 0; i < n; ++i) {
      if (bent[i] > 0.0) bent[i] = std::pow(bent[i], 1.0 + 0.5 * shareOf(i, n) * std::sqrt(bent[i]));
    }
    double sum = 0.0;
    double weight = 1.0;
    for (const double value : times(turned.rotation, bent)) sum += std::exchange(weight, 1.0e6) * value * value;
    return sum;
  });
}

/// f20. The signs of the optimum are drawn.
inline TestFunction schwefel(std::size_t n, int seed) {
  UniformGenerator random(240000 + seed);
  constexpr double kPlace = 4.2096874633;  // of the optimum, times two
  std::vector<double> signs(n);
  std::vector<double> optimum(n);
  for (std::size_t j = 0; j < n; ++j) {
    signs[j] = random.next() < 0.5 ? -1.0 : 1.0;
    optimum[j] = 0.5 * signs[j] * kPlace;
  }
  return around("Schwefel", optimum, [signs, n](const auto& x) {
    std::vector<double> z(n);
    double sum = 0.0;
    double before = kPlace;
    for (std::size_t i = 0; i < n; ++i) {
      const double doubled = 2.0 * signs[i] * x[i];
      const double linked = doubled + 0.25 * (before - kPlace);
      before = doubled;
      z[i] = std::pow(10.0, 0.5 * shareOf(i, n)) * (linked - kPlace) + kPlace;
      sum += 100.0 * z[i] * std::sin(std::sqrt(std::abs(100.0 * z[i])));
    }
    return -sum / (100.0 * static_cast<double>(n)) + 4.189828872724339 + 100.0 * outside(z);
  });
}

/// f21: the best of 101 peaks, each with axes of its own length.
inline TestFunction gallagher(std::size_t n, int seed) {
  constexpr std::size_t kPeaks = 101;
  UniformGenerator random(250000 + seed);
  const Matrix rotation = randomRotation(n, random);
  const auto shuffle = [&random](auto& values) {
    for (std::size_t i = values.size(); i > 1; --i) {
      std::swap(values[i - 1], values[static_cast<std::size_t>(random.next() * static_cast<double>(i))]);
    }
  };
  std::vector<double> conditions(kPeaks - 1);
  for (std::size_t i = 0; i < conditions.size(); ++i) conditions[i] = std::pow(1000.0, 2.0 * shareOf(i, kPeaks - 1));
  shuffle(conditions);
  conditions.insert(conditions.begin(), 1000.0);
  struct Peak {
    std::vector<double> turnedPlace;  ///< R·y
    std::vector<double> curvature;
    double height = 0.0;
  };
  std::vector<Peak> peaks(kPeaks);
  std::vector<double> optimum;
  for (std::size_t k = 0; k < kPeaks; ++k) {
    std::vector<double> place(n);
    for (double& value : place) value = (k == 0 ? 4.0 : 4.9) * (2.0 * random.next() - 1.0);
    if (k == 0) optimum = place;
    peaks[k].turnedPlace = times(rotation, place);
    for (std::size_t i = 0; i < n; ++i) {
      peaks[k].curvature.push_back(std::pow(conditions[k], 0.5 * shareOf(i, n)) / std::pow(conditions[k], 0.25));
    }
    shuffle(peaks[k].curvature);
    peaks[k].height = k == 0 ? 10.0 : 1.1 + 8.0 * static_cast<double>(k - 1) / 99.0;
  }
  return around("Gallagher", optimum, [rotation, peaks, n](const auto& x) {
    const std::vector<double> turned = times(rotation, x);
    double highest = 0.0;
    for (const Peak& peak : peaks) {
      double sum = 0.0;
      for (std::size_t i = 0; i < n; ++i) sum += peak.curvature[i] * std::pow(turned[i] - peak.turnedPlace[i], 2.0);
      highest = std::max(highest, peak.height * std::exp(-0.5 * sum / static_cast<double>(n)));
    }
    return std::pow(oscillated(10.0 - highest), 2.0) + outside(x);
  });
}

}  // namespace mirevo::testing
