#pragma once

#include <cmath>
#include <cstddef>
#include <functional>
#include <limits>
#include <numbers>
#include <string>
#include <vector>

/// Published test functions with several objectives, and the hypervolumes of their fronts by the formulas.
namespace mirevo::testing {

struct MultiObjectiveFunction {
  std::string name;
  std::vector<double> lower;
  std::vector<double> upper;
  std::size_t objectives = 2;
  double frontVolume = 0.0;  ///< of the true front, up to 1 in every objective
  std::function<std::vector<double>(const std::vector<double>&)> values;
};

inline double meanBehindFirst(const std::vector<double>& x) {
  double sum = 0.0;
  for (std::size_t j = 1; j < x.size(); ++j) sum += x[j];
  return sum / static_cast<double>(x.size() - 1);
}

/// What lies between 1 and the least value that `shape` has had from 0 on, for the discontinuous front of ZDT3.
inline double volumeBelowOne(const std::function<double(double)>& shape) {
  constexpr int kSteps = 1'000'000;
  double least = std::numeric_limits<double>::infinity();
  double sum = 0.0;
  for (int i = 0; i < kSteps; ++i) {
    least = std::min(least, shape((i + 0.5) / kSteps));
    sum += 1.0 - least;
  }
  return sum / kSteps;
}

/// Zitzler, Deb and Thiele (2000), doi:10.1162/106365600568202, with the numbers of parameters of that paper, and DTLZ2
/// of Deb, Thiele, Laumanns and Zitzler (2002), doi:10.1109/CEC.2002.1007032, with three objectives and 12 parameters.
inline std::vector<MultiObjectiveFunction> multiObjectiveFunctions() {
  using std::numbers::pi;
  using Values = std::vector<double>;
  const auto unit = [](std::size_t n, double value) { return Values(n, value); };
  std::vector<MultiObjectiveFunction> all;
  all.push_back({"ZDT1", unit(30, 0.0), unit(30, 1.0), 2, 2.0 / 3.0, [](const Values& x) {
                   const double g = 1.0 + 9.0 * meanBehindFirst(x);
                   return Values{x[0], g * (1.0 - std::sqrt(x[0] / g))};
                 }});
  all.push_back({"ZDT2", unit(30, 0.0), unit(30, 1.0), 2, 1.0 / 3.0, [](const Values& x) {
                   const double g = 1.0 + 9.0 * meanBehindFirst(x);
                   return Values{x[0], g * (1.0 - (x[0] / g) * (x[0] / g))};
                 }});
  const auto shapeOf3 = [](double f) { return 1.0 - std::sqrt(f) - f * std::sin(10.0 * pi * f); };
  all.push_back({"ZDT3", unit(30, 0.0), unit(30, 1.0), 2, volumeBelowOne(shapeOf3), [](const Values& x) {
                   const double g = 1.0 + 9.0 * meanBehindFirst(x);
                   const double share = x[0] / g;
                   return Values{x[0], g * (1.0 - std::sqrt(share) - share * std::sin(10.0 * pi * x[0]))};
                 }});
  MultiObjectiveFunction four{"ZDT4", unit(10, -5.0), unit(10, 5.0), 2, 2.0 / 3.0, [](const Values& x) {
                                double g = 1.0 + 10.0 * static_cast<double>(x.size() - 1);
                                for (std::size_t j = 1; j < x.size(); ++j) {
                                  g += x[j] * x[j] - 10.0 * std::cos(4.0 * pi * x[j]);
                                }
                                return Values{x[0], g * (1.0 - std::sqrt(x[0] / g))};
                              }};
  four.lower[0] = 0.0;
  four.upper[0] = 1.0;
  all.push_back(four);
  // The least f1 is where its derivative vanishes first: tan(6 pi x) = 9 pi.
  const double at = std::atan(9.0 * pi) / (6.0 * pi);
  const double least = 1.0 - std::exp(-4.0 * at) * std::pow(std::sin(6.0 * pi * at), 6.0);
  all.push_back({"ZDT6", unit(10, 0.0), unit(10, 1.0), 2, (1.0 - least * least * least) / 3.0, [](const Values& x) {
                   const double f = 1.0 - std::exp(-4.0 * x[0]) * std::pow(std::sin(6.0 * pi * x[0]), 6.0);
                   const double g = 1.0 + 9.0 * std::pow(meanBehindFirst(x), 0.25);
                   return Values{f, g * (1.0 - (f / g) * (f / g))};
                 }});
  all.push_back({"DTLZ2", unit(12, 0.0), unit(12, 1.0), 3, 1.0 - pi / 6.0, [](const Values& x) {
                   double g = 0.0;
                   for (std::size_t j = 2; j < x.size(); ++j) g += (x[j] - 0.5) * (x[j] - 0.5);
                   const double a = 0.5 * pi * x[0];
                   const double b = 0.5 * pi * x[1];
                   return Values{(1.0 + g) * std::cos(a) * std::cos(b), (1.0 + g) * std::cos(a) * std::sin(b),
                                 (1.0 + g) * std::sin(a)};
                 }});
  return all;
}

}  // namespace mirevo::testing
