#include "algorithms/analyses/written_step.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <numeric>
#include <optional>
#include <string>
#include <vector>

#include <fmt/core.h>

#include "common/text.h"
#include "parameters/value_format.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kWorthAWarning = 0.01;
constexpr double kExact = 1.0e-9;  // a field that holds 15 digits: what it cuts is no more than a rounding error

/// The set below, the base set and the set above; of a one-sided difference, the base set is one of the other two.
enum Side : std::size_t { below, base, above };
using OfSides = std::array<double, 3>;

/// A field whose values change with the variable parameter.
struct ChangingField {
  std::string name;  ///< that of a dependent parameter; empty: the field of the variable parameter itself
  ValueField field = 0;
  OfSides modelValues{};
  OfSides wanted{};   ///< search scale for the variable parameter itself, model scale for a dependent one
  OfSides written{};  ///< the same as the model reads it; NaN where the field holds no number

  double writtenChange(Side from, Side to) const { return written[to] - written[from]; }

  /// Which part of the wanted change the model gets.
  double keptPart(Side from, Side to) const {
    const double change = wanted[to] - wanted[from];
    if (change == 0.0) return 1.0;
    const double kept = writtenChange(from, to) / change;
    return std::isnan(kept) ? 0.0 : kept;
  }

  std::string text() const {
    const auto writtenText = [&](Side side) {
      return std::string(trim(FormatValueForPlaceholder(modelValues[side], field)));
    };
    const std::string where =
        name.empty() ? fmt::format("its field of {} characters", field.width)
                     : fmt::format("the field of {} characters of the dependent parameter {}", field.width, name);
    return fmt::format("in {} {} is written as \"{}\" and {} as \"{}\"", where, formatReal(modelValues[below]),
                       writtenText(below), formatReal(modelValues[above]), writtenText(above));
  }
};

/// The search-scale value of what the model reads for a value of parameter j; NaN if the field holds no number.
double searchValueAsWritten(const SearchSpace& space, std::size_t j, double value, ValueField field) {
  const double modelValue = toModelScale(space, j, value);
  const std::optional<double> written = valueAsWritten(modelValue, field);
  if (!written || *written == modelValue) return written ? value : kNaN;
  if (space.transformation[j] != TransformationType::logarithmic) return *written;
  return *written > 0.0 ? std::log(*written) : kNaN;
}

/// Whether what a dependent parameter changes by is no more than the rounding of its equation.
bool isUnchanged(const OfSides& values) {
  constexpr double kRounding = 4.0 * std::numeric_limits<double>::epsilon();
  constexpr double kOfBothSides = 1.0e-6;  // of an equation with its extreme at the base set
  const double change = std::abs(values[above] - values[below]);
  const double ofBothSides = std::abs(values[above] - values[base]) + std::abs(values[base] - values[below]);
  return change <= kRounding * std::abs(values[base]) || change <= kOfBothSides * ofBothSides;
}

std::vector<ChangingField> changingFields(const ParameterFields& fields, const SearchSpace& space, std::size_t j,
                                          const std::array<const ParameterSet*, 3>& sets) {
  std::vector<ChangingField> changing;
  if (const ValueField placeholder = fields.fieldOf(j); placeholder.width > 0) {
    ChangingField field;
    field.field = placeholder;
    for (const Side side : {below, base, above}) {
      field.wanted[side] = (*sets[side])[j];
      field.modelValues[side] = toModelScale(space, j, field.wanted[side]);
      field.written[side] = searchValueAsWritten(space, j, field.wanted[side], placeholder);
    }
    changing.push_back(std::move(field));
  }
  if (fields.dependents.empty()) return changing;
  std::array<std::vector<double>, 3> values;
  for (const Side side : {below, base, above}) {
    values[side] = fields.dependentValues(*sets[side]);
    if (values[side].size() != fields.dependents.size()) return changing;  // a set that fails
  }
  for (std::size_t i = 0; i < fields.dependents.size(); ++i) {
    ChangingField field{fields.dependents[i].name, fields.dependents[i].field};
    for (const Side side : {below, base, above}) {
      field.modelValues[side] = field.wanted[side] = values[side][i];
      field.written[side] = valueAsWritten(values[side][i], field.field).value_or(kNaN);
    }
    if (!isUnchanged(field.wanted)) changing.push_back(std::move(field));
  }
  return changing;
}

/// The part of the step that all fields keep; empty if they keep different parts.
std::optional<double> commonPart(std::span<const ChangingField> fields, Side from, Side to) {
  std::vector<double> parts;
  for (const ChangingField& field : fields) parts.push_back(field.keptPart(from, to));
  const auto [least, most] = std::minmax_element(parts.begin(), parts.end());
  if (std::abs(*least - 1.0) <= kExact && std::abs(*most - 1.0) <= kExact) return 1.0;
  if (*most - *least > kWorthAWarning * std::max(std::abs(*least), std::abs(*most))) return std::nullopt;
  return std::accumulate(parts.begin(), parts.end(), 0.0) / static_cast<double>(parts.size());
}

/// The width between two sets as the model gets it, or as it is if the fields keep different parts of it.
double widthAsWritten(std::span<const ChangingField> fields, Side from, Side to, double width) {
  if (fields.size() == 1 && fields[0].name.empty()) return fields[0].writtenChange(from, to);
  return width * commonPart(fields, from, to).value_or(1.0);
}

/// The texts of the fields that keep less or more than the step, the first few.
std::string textOf(std::span<const ChangingField> fields) {
  constexpr std::size_t kMostTexts = 3;
  std::string text;
  std::size_t count = 0;
  for (const ChangingField& field : fields) {
    if (std::abs(field.keptPart(below, above) - 1.0) <= kWorthAWarning || ++count > kMostTexts) continue;
    text += (text.empty() ? "" : ", ") + field.text();
  }
  return count > kMostTexts ? text + fmt::format(" and so on for {} more", count - kMostTexts) : text;
}

}  // namespace

void takeWidthAsWritten(const ParameterFields& fields, const SearchSpace& space, std::size_t j,
                        std::span<const ParameterSet> sets, ParameterDifference& difference) {
  const std::vector<ChangingField> changing =
      changingFields(fields, space, j, {&sets[difference.minus], &sets.front(), &sets[difference.plus]});
  if (changing.empty()) return;
  const std::optional<double> part = commonPart(changing, below, above);
  if (part == 1.0) return;
  const std::string texts = textOf(changing);
  if (part == 0.0) {
    difference.width = 0.0;
    difference.problem = texts;
    return;
  }
  difference.width = widthAsWritten(changing, below, above, difference.width);
  if (difference.isCentral()) {
    difference.widthBelow = widthAsWritten(changing, below, base, difference.widthBelow);
    difference.widthAbove = widthAsWritten(changing, base, above, difference.widthAbove);
  }
  if (texts.empty()) return;
  difference.warnings.push_back(
      texts + (part ? "; the difference is that of the values as written"
                    : "; the fields that change with the parameter keep different parts of its step, so the difference "
                      "is that of the values before they are written, and the derivatives may be wrong"));
}

}  // namespace mirevo
