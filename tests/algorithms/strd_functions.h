#pragma once

#include <cmath>
#include <map>
#include <numbers>
#include <span>
#include <string>

/// The models of the nonlinear regression problems of the Statistical Reference Datasets of the National Institute of
/// Standards and Technology (StRD, https://www.itl.nist.gov/div898/strd/). Used by the tests and the benchmark of GLM.
namespace mirevo::testing {

/// The response for parameters b and predictors x.
using StrdModel = double (*)(std::span<const double> b, std::span<const double> x);

/// By the name of the data set. Nelson's response is the logarithm of the given one.
inline const std::map<std::string, StrdModel>& strdModels() {
  using In = std::span<const double>;
  static const StrdModel kMisra1a = [](In b, In x) { return b[0] * (1.0 - std::exp(-b[1] * x[0])); };
  static const StrdModel kChwirut = [](In b, In x) { return std::exp(-b[0] * x[0]) / (b[1] + b[2] * x[0]); };
  static const StrdModel kLanczos = [](In b, In x) {
    return b[0] * std::exp(-b[1] * x[0]) + b[2] * std::exp(-b[3] * x[0]) + b[4] * std::exp(-b[5] * x[0]);
  };
  static const StrdModel kGauss = [](In b, In x) {
    const double first = (x[0] - b[3]) / b[4];
    const double second = (x[0] - b[6]) / b[7];
    return b[0] * std::exp(-b[1] * x[0]) + b[2] * std::exp(-first * first) + b[5] * std::exp(-second * second);
  };
  static const StrdModel kCubic = [](In b, In x) {
    const double t = x[0];
    return (b[0] + t * (b[1] + t * (b[2] + t * b[3]))) / (1.0 + t * (b[4] + t * (b[5] + t * b[6])));
  };
  static const std::map<std::string, StrdModel> kModels = {
      {"Misra1a", kMisra1a},
      {"BoxBOD", kMisra1a},
      {"Chwirut1", kChwirut},
      {"Chwirut2", kChwirut},
      {"Lanczos1", kLanczos},
      {"Lanczos2", kLanczos},
      {"Lanczos3", kLanczos},
      {"Gauss1", kGauss},
      {"Gauss2", kGauss},
      {"Gauss3", kGauss},
      {"Hahn1", kCubic},
      {"Thurber", kCubic},
      {"Bennett5", [](In b, In x) { return b[0] * std::pow(b[1] + x[0], -1.0 / b[2]); }},
      {"DanWood", [](In b, In x) { return b[0] * std::pow(x[0], b[1]); }},
      {"Eckerle4",
       [](In b, In x) {
         const double z = (x[0] - b[2]) / b[1];
         return b[0] / b[1] * std::exp(-0.5 * z * z);
       }},
      {"ENSO",
       [](In b, In x) {
         const double t = 2.0 * std::numbers::pi * x[0];
         return b[0] + b[1] * std::cos(t / 12.0) + b[2] * std::sin(t / 12.0) + b[4] * std::cos(t / b[3]) +
                b[5] * std::sin(t / b[3]) + b[7] * std::cos(t / b[6]) + b[8] * std::sin(t / b[6]);
       }},
      {"Kirby2",
       [](In b, In x) {
         const double t = x[0];
         return (b[0] + t * (b[1] + t * b[2])) / (1.0 + t * (b[3] + t * b[4]));
       }},
      {"MGH09", [](In b, In x) { return b[0] * x[0] * (x[0] + b[1]) / (x[0] * (x[0] + b[2]) + b[3]); }},
      {"MGH10", [](In b, In x) { return b[0] * std::exp(b[1] / (x[0] + b[2])); }},
      {"MGH17", [](In b, In x) { return b[0] + b[1] * std::exp(-x[0] * b[3]) + b[2] * std::exp(-x[0] * b[4]); }},
      {"Misra1b", [](In b, In x) { return b[0] * (1.0 - std::pow(1.0 + b[1] * x[0] / 2.0, -2.0)); }},
      {"Misra1c", [](In b, In x) { return b[0] * (1.0 - std::pow(1.0 + 2.0 * b[1] * x[0], -0.5)); }},
      {"Misra1d", [](In b, In x) { return b[0] * b[1] * x[0] / (1.0 + b[1] * x[0]); }},
      {"Nelson", [](In b, In x) { return b[0] - b[1] * x[0] * std::exp(-b[2] * x[1]); }},
      {"Rat42", [](In b, In x) { return b[0] / (1.0 + std::exp(b[1] - b[2] * x[0])); }},
      {"Rat43", [](In b, In x) { return b[0] / std::pow(1.0 + std::exp(b[1] - b[2] * x[0]), 1.0 / b[3]); }},
      {"Roszman1", [](In b, In x) { return b[0] - b[1] * x[0] - std::atan(b[2] / (x[0] - b[3])) / std::numbers::pi; }}};
  return kModels;
}

}  // namespace mirevo::testing
