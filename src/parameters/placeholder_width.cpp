#include "parameters/placeholder_width.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <vector>

#include <fmt/core.h>

#include "common/text.h"
#include "parameters/search_space.h"
#include "parameters/value_format.h"

namespace mirevo {
namespace {

constexpr int kSignificantDigits = 4;
/// In a range that includes 0, values smaller than this fraction of the larger bound are negligible.
constexpr double kNegligible = 1.0e-3;

bool keepsDigits(double value, ValueField field) {
  const std::optional<double> written = valueAsWritten(value, field);
  if (!written) return false;
  if (value == 0.0 || *written == value) return true;
  const double unit = std::pow(10.0, std::floor(std::log10(std::abs(value))) - (kSignificantDigits - 1));
  return std::abs(*written - value) < unit;
}

/// Values with many digits, one or two per decade, of every magnitude in [lower, upper] and of both signs.
void addMagnitudes(double lower, double upper, std::vector<double>& samples) {
  const double largest = std::max(std::abs(lower), std::abs(upper));
  const bool holdsZero = lower <= 0.0 && upper >= 0.0;
  const double smallest = holdsZero ? largest * kNegligible : std::min(std::abs(lower), std::abs(upper));
  if (!(smallest > 0.0) || !std::isfinite(largest)) return;
  const int lastDecade = static_cast<int>(std::floor(std::log10(largest)));
  for (int decade = static_cast<int>(std::floor(std::log10(smallest))); decade <= lastDecade; ++decade) {
    for (const double mantissa : {1.234567890123, 9.876543210987}) {
      const double magnitude = mantissa * std::pow(10.0, decade);
      if (magnitude < smallest) continue;
      for (const double value : {magnitude, -magnitude}) {
        if (value > lower && value < upper) samples.push_back(value);
      }
    }
  }
}

std::vector<double> samplesOf(const ModelParameter& parameter) {
  switch (parameter.parameterType) {
    case ParameterType::fixed:
      return {parameter.initialValue};
    case ParameterType::dependent:
      return {-1.234567890123e-20};  // its range is unknown: room for any number
    case ParameterType::variable:
      break;
  }
  std::vector<double> samples{parameter.initialValue, parameter.lowerBound, parameter.upperBound};
  addMagnitudes(parameter.lowerBound, parameter.upperBound, samples);
  bool failed = false;
  if (parameter.transformationType == TransformationType::integer) {
    for (double& value : samples) {
      value = TransformParameterValue(value, parameter.lowerBound, parameter.transformationType,
                                      TransformDirection::forward, failed);
    }
  }
  return samples;
}

}  // namespace

std::string describePrecisionLoss(const ModelParameter& parameter, ValueField field) {
  const int width = field.width;
  const std::vector<double> samples = samplesOf(parameter);
  const auto keepsAll = [&samples, form = field.form](int candidate) {
    return std::all_of(samples.begin(), samples.end(), [candidate, form](double v) {
      return keepsDigits(v, {candidate, form});
    });
  };
  const auto lost = std::find_if(samples.begin(), samples.end(), [field](double v) { return !keepsDigits(v, field); });
  if (lost == samples.end()) return {};
  std::string text =
      fmt::format(" is {} characters wide and keeps fewer than four significant digits: {} is written as \"{}\"", width,
                  formatReal(*lost), FormatValueForPlaceholder(*lost, field));
  int enough = width + 1;
  while (enough <= kMaximumValueWidth && !keepsAll(enough)) ++enough;
  if (enough > kMaximumValueWidth) return text + "; no width is enough";
  return text + fmt::format("; make it {} wide, delimiters included, by blanks behind the name", enough);
}

}  // namespace mirevo
