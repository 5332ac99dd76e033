// Numeric-ID templates: a placeholder is a parameter's ID value, written as a tiny number in exponent form.

#include <algorithm>
#include <cmath>
#include <iterator>
#include <limits>
#include <optional>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "common/utf8.h"
#include "parameters/template_file.h"
#include "parameters/template_lines.h"

namespace mirevo {

std::optional<std::int32_t> idKey(double value) {
  const double scaled = value * static_cast<double>(1.0e37F) + static_cast<double>(0.1F);
  if (!(std::abs(scaled) < static_cast<double>(std::numeric_limits<std::int32_t>::max()))) return std::nullopt;
  return static_cast<std::int32_t>(scaled);
}

namespace {

/// A placeholder's name is padded to this length, so that every value has at least 11 characters.
constexpr std::size_t kMinimumNameLength = 9;
constexpr std::size_t kMostIdValuesShown = 10;

/// Position of the exponent letter of an ID value in `line`: the later of the first one in lower and the first one in
/// upper case; exponents of three digits are looked for before those of two.
std::optional<std::size_t> findIdSuffix(std::string_view line, std::size_t& length) {
  for (const auto& [lower, upper] : {std::pair{"e-035", "E-035"}, std::pair{"e-35", "E-35"}}) {
    const auto lowerAt = line.find(lower);
    const auto upperAt = line.find(upper);
    length = std::string_view(lower).size();
    if (lowerAt == std::string_view::npos && upperAt == std::string_view::npos) continue;
    if (lowerAt == std::string_view::npos) return upperAt;
    return upperAt == std::string_view::npos ? lowerAt : std::max(lowerAt, upperAt);
  }
  return std::nullopt;
}

[[noreturn]] void failUndefinedId(std::string_view templateName, std::size_t lineNumber, std::size_t column,
                                  std::string_view token, std::span<const ModelParameter> parameters) {
  std::string detail = fmt::format("{}:{}:{}: ", templateName, lineNumber, column + 1);
  detail += parseReal(token)
                ? "no parameter has this Parameter_IDValue; there are"
                : "this ends like an ID value but is no number; an ID value stands between blanks; there are";
  for (std::size_t i = 0; i < parameters.size() && i < kMostIdValuesShown; ++i) {
    detail += fmt::format("{} {} ({})", i == 0 ? "" : ",", formatReal(parameters[i].idValue),
                          trimTrailing(parameters[i].name));
  }
  if (parameters.size() > kMostIdValuesShown) detail += ", ...";
  fatalError(fmt::format("Error: Undefined parameter ID value {} found in template file", token), detail);
}

/// The first parameter whose ID value the token is.
const ModelParameter* findById(std::string_view token, std::span<const ModelParameter> parameters) {
  const std::optional<double> value = parseReal(token);
  const std::optional<std::int32_t> key = value ? idKey(*value) : std::nullopt;
  if (!key) return nullptr;
  const auto found = std::find_if(parameters.begin(), parameters.end(),
                                  [key](const ModelParameter& parameter) { return idKey(parameter.idValue) == key; });
  return found == parameters.end() ? nullptr : &*found;
}

std::string convertLine(std::string_view templateName, std::size_t lineNumber, std::string_view original,
                        std::span<const ModelParameter> parameters) {
  std::string line(original);
  // The line with the placeholders made so far blanked out, so that a parameter name that looks like an ID value is not
  // converted again and the loop ends.
  std::string searched = line;
  std::size_t length = 0;
  while (const std::optional<std::size_t> suffix = findIdSuffix(searched, length)) {
    // The character at the 0-based position s is kept. The loop ends at column 1 even if a token begins there, which
    // leaves the first character of the token in front of the placeholder. Deliberate: templates rely on it.
    std::size_t s = *suffix;
    while (s > 0 && line[s] != ' ' && line[s] != '\t') --s;
    const std::size_t end = *suffix + length;
    const std::string_view token = trim(std::string_view(line).substr(s, end - s));
    const ModelParameter* parameter = findById(token, parameters);
    if (parameter == nullptr) failUndefinedId(templateName, lineNumber, s, token, parameters);

    std::string placeholder(1, kConvertedDelimiter);
    placeholder += trimTrailing(parameter->name);
    const std::size_t nameLength = characterCount(placeholder) - 1;
    if (nameLength < kMinimumNameLength) placeholder.append(kMinimumNameLength - nameLength, ' ');
    placeholder += kConvertedDelimiter;
    const std::size_t from = s + 1;
    line.replace(from, end - from, placeholder);
    if (line.size() > kMaximumLineLength) failLongLine(templateName, lineNumber, line.size());
    searched.replace(from, end - from, std::string(placeholder.size(), kConvertedDelimiter));
  }
  return line;
}

}  // namespace

std::optional<FoundIdValue> findIdValue(std::string_view text, std::span<const ModelParameter> parameters) {
  std::vector<ModelParameter> withIds;
  std::copy_if(parameters.begin(), parameters.end(), std::back_inserter(withIds),
               [](const ModelParameter& parameter) { return parameter.idValue != 0.0; });
  std::size_t number = 0;
  for (const std::string_view line : splitLines(text)) {
    ++number;
    std::size_t length = 0;
    if (!findIdSuffix(line, length)) continue;
    for (std::size_t from = line.find_first_not_of(" \t"); from != std::string_view::npos;) {
      const std::string_view token = line.substr(from, line.find_first_of(" \t", from) - from);
      const std::string lower = toLowerAscii(token);
      const bool mayBeId = lower.ends_with("e-35") || lower.ends_with("e-035");
      if (mayBeId && findById(token, withIds) != nullptr) return FoundIdValue{number, std::string(token)};
      from = line.find_first_not_of(" \t", from + token.size());
    }
  }
  return std::nullopt;
}

std::string ConvertIdTemplate(std::string_view templateName, std::string_view text,
                              std::span<const ModelParameter> parameters) {
  std::string converted{kConvertedDelimiter, '\n'};
  std::size_t lineNumber = 0;
  for (const std::string_view line : templateLines(templateName, text)) {
    converted += trimBlanks(convertLine(templateName, ++lineNumber, line, parameters));
    converted += '\n';
  }
  return converted;
}

}  // namespace mirevo
