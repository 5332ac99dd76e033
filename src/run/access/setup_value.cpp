#include "run/access/setup_value.h"

#include <algorithm>
#include <cassert>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"
#include "platform/kdx/kdx_value.h"

// With the sanitizers GCC 12 wrongly reports alternatives of a variant inside a variant as uninitialised.
#if defined(__GNUC__) && !defined(__clang__)
#pragma GCC diagnostic ignored "-Wmaybe-uninitialized"
#endif

namespace mirevo {
namespace {

using Converted = std::variant<SetupValue, SetupValueError>;

std::string_view wanted(KeywordType type) {
  switch (type) {
    case KeywordType::integer:
    case KeywordType::code:
      return "an integer within 32 bits";
    case KeywordType::real:
    case KeywordType::realList:
      return "a number";
    case KeywordType::item:
      return "a number or a name between quotes";
    case KeywordType::date:
      return "a date such as 2001-01-31 or 2001-01-31 12:30";
    case KeywordType::name:
    case KeywordType::text:
    case KeywordType::freeText:
    case KeywordType::textLines:
    case KeywordType::fileName:
      break;
  }
  return "a text between quotes";
}

std::string found(const KdxValue& value) {
  struct Words {
    std::string operator()(std::int32_t number) const { return std::to_string(number); }
    std::string operator()(double number) const {
      const std::string text = formatReal(number);
      const bool isWhole = text.find_first_not_of("-0123456789") == std::string::npos;
      return isWhole && parseInteger(text) ? text + ".0" : text;  // shows 2.0 as different from 2
    }
    std::string operator()(const std::string& text) const { return "the text " + quotedForMessage(text); }
    std::string operator()(const DateRecord& date) const { return "the date " + formatDate(date); }
  };
  return std::visit(Words{}, value.value);
}

SetupValueError mismatch(KeywordType type, const KdxValue& value) {
  return {value.position, fmt::format("expected {}, found {}", wanted(type), found(value))};
}

std::optional<double> asReal(const KdxValue& value) {
  if (const auto* real = std::get_if<double>(&value.value)) return *real;
  if (const auto* integer = std::get_if<std::int32_t>(&value.value)) return *integer;
  return std::nullopt;
}

Converted convertText(KeywordType type, const KdxValue& value) {
  const auto* text = std::get_if<std::string>(&value.value);
  if (text == nullptr) return mismatch(type, value);
  std::string trimmed(trimTrailing(*text));
  const bool isField = type == KeywordType::name || type == KeywordType::text || type == KeywordType::fileName;
  if (isField && trimmed.size() > kFieldWidth) {
    return SetupValueError{value.position,
                           fmt::format("expected a text of at most {} bytes, found {}", kFieldWidth, trimmed.size())};
  }
  if (type == KeywordType::name) {
    if (trimmed.empty()) return SetupValueError{value.position, "expected a name, found a blank text"};
    if (trimmed.find('\t') != std::string::npos) {
      return SetupValueError{value.position, "expected a name without tabs, which separate the columns of the results"};
    }
  }
  return SetupValue(std::move(trimmed));
}

Converted convertDate(const KdxValue& value) {
  if (const auto* date = std::get_if<DateRecord>(&value.value)) return SetupValue(*date);
  const auto* text = std::get_if<std::string>(&value.value);
  const auto date = text == nullptr ? std::nullopt : parseKdxDate(*text);
  if (!date) return mismatch(KeywordType::date, value);
  return SetupValue(*date);
}

Converted convertList(const KdxKeyword& keyword) {
  std::vector<double> list;
  list.reserve(keyword.values.size());
  for (const KdxValue& value : keyword.values) {
    const auto real = asReal(value);
    if (!real) return mismatch(KeywordType::realList, value);
    list.push_back(*real);
  }
  return SetupValue(std::move(list));
}

bool hasNumbers(std::span<const CodeName> codes) {
  return std::any_of(codes.begin(), codes.end(), [](const CodeName& code) { return code.code.has_value(); });
}

/// Accepts any number if values have numbers; the range of the keyword is checked later.
Converted convertCode(std::span<const CodeName> codes, const KdxValue& value) {
  const auto* integer = std::get_if<std::int32_t>(&value.value);
  if (integer != nullptr && hasNumbers(codes)) return SetupValue(*integer);
  const auto* text = std::get_if<std::string>(&value.value);
  const std::string_view name = text == nullptr ? std::string_view{} : trim(*text);
  for (const CodeName& code : codes) {
    if (!equalIgnoringCase(code.name, name)) continue;
    if (code.code) return SetupValue(*code.code);
    return SetupValue(std::string(code.name));
  }
  return SetupValueError{value.position, fmt::format("expected {}, found {}{}", wantedCode(codes), found(value),
                                                     nearestCode(codes, name))};
}

Converted convertOne(const KeywordRow& row, const KdxValue& value) {
  const KeywordType type = row.type;
  switch (type) {
    case KeywordType::code:
      return convertCode(row.facts.codes, value);
    case KeywordType::integer:
      if (const auto* integer = std::get_if<std::int32_t>(&value.value)) return SetupValue(*integer);
      return mismatch(type, value);
    case KeywordType::item:
      if (const auto* integer = std::get_if<std::int32_t>(&value.value)) return SetupValue(*integer);
      break;
    case KeywordType::real:
    case KeywordType::realList:
      if (const auto real = asReal(value)) return SetupValue(*real);
      return mismatch(type, value);
    case KeywordType::date:
      return convertDate(value);
    case KeywordType::name:
    case KeywordType::text:
    case KeywordType::freeText:
    case KeywordType::textLines:
    case KeywordType::fileName:
      break;
  }
  return convertText(type, value);
}

std::string inQuotes(std::string_view text) {
  std::string quoted = "'";
  for (const char c : text) quoted += c == '\'' ? "''" : std::string(1, c);
  return quoted + "'";
}

}  // namespace

std::string wantedCode(std::span<const CodeName> codes) {
  std::string names;
  for (const CodeName& code : codes) names += fmt::format("{}'{}'", names.empty() ? "" : ", ", code.name);
  if (!hasNumbers(codes)) return "one of the names " + names;
  return fmt::format("{} or one of the names {}", wanted(KeywordType::code), names);
}

std::string orOneOfTheNames(std::span<const CodeName> codes) {
  if (std::ranges::all_of(codes, [](const CodeName& code) { return code.code.has_value(); })) return {};
  std::string names;
  for (const CodeName& code : codes) names += fmt::format("{}'{}'", names.empty() ? "" : ", ", code.name);
  return " or one of the names " + names;
}

std::string nearestCode(std::span<const CodeName> codes, std::string_view written) {
  std::vector<std::string> names;
  for (const CodeName& code : codes) names.emplace_back(code.name);
  const bool isOperator = std::find(names.begin(), names.end(), "<=") != names.end();
  if (isOperator && (written == "==" || written == "="))
    return "; what must be equal needs two constraints, '<=' and '>='";
  if (isOperator && (written == "<>" || written == "><" || written == "!="))
    return "; what must differ needs the equation abs(left - right) and '>' 0";
  const auto nearest = nearestName(written, names);
  return nearest ? fmt::format(", did you mean '{}'?", *nearest) : "";
}

Converted convertSetupValue(const KeywordRow& row, const KdxKeyword& keyword) {
  if (row.type == KeywordType::realList) return convertList(keyword);
  if (keyword.values.size() != 1) {
    const bool maybeDecimal = keyword.values.size() == 2 && row.type == KeywordType::real;
    return SetupValueError{keyword.values.size() > 1 ? keyword.values[1].position : keyword.position,
                           fmt::format("expected one value, found {}{}", keyword.values.size(),
                                       maybeDecimal ? ": numbers have a decimal point, a comma separates values" : "")};
  }
  return convertOne(row, keyword.values.front());
}

SetupValue defaultSetupValue(const KeywordRow& row) {
  KdxCursor cursor(row.facts.defaultValue);
  const auto value = readKdxValue(cursor, '=');
  assert(std::holds_alternative<KdxValue>(value));
  const auto converted = convertOne(row, std::get<KdxValue>(value));
  assert(std::holds_alternative<SetupValue>(converted));
  return std::get<SetupValue>(converted);
}

std::string formatSetupValue(const SetupValue& value) {
  struct Text {
    std::string operator()(std::int32_t number) const { return std::to_string(number); }
    std::string operator()(double number) const { return formatReal(number); }
    std::string operator()(const std::string& text) const { return inQuotes(text); }
    std::string operator()(const DateRecord& date) const { return formatDate(date); }
    std::string operator()(const std::vector<double>& list) const {
      std::string text;
      for (const double number : list) text += (text.empty() ? "" : ", ") + formatReal(number);
      return text;
    }
  };
  return std::visit(Text{}, value);
}

}  // namespace mirevo
