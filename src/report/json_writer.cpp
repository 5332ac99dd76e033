#include "report/json_writer.h"

#include <cmath>
#include <iterator>

#include <fmt/core.h>

#include "common/utf8.h"

namespace mirevo {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";  // U+FFFD

void appendEscape(std::string& text, unsigned code) {
  fmt::format_to(std::back_inserter(text), "\\u{:04x}", code);
}

}  // namespace

JsonWriter& JsonWriter::key(std::string_view name) {
  text(name);
  text_ += ':';
  needsComma_ = false;
  return *this;
}

JsonWriter& JsonWriter::text(std::string_view value) {
  separate();
  text_ += '"';
  while (!value.empty()) {
    const Utf8Character first = firstCharacter(value);
    const std::string_view character = value.substr(0, first.bytes);
    value.remove_prefix(character.size());
    const char c = character.front();
    if (!first.isValid) {
      text_ += kReplacement;
    } else if (first.code < ' ' || c == '<' || c == '>' || c == '&' || c == 0x7F || first.code == 0x2028 ||
               first.code == 0x2029) {  // line and paragraph separator
      appendEscape(text_, first.code);
    } else {
      if (c == '"' || c == '\\') text_ += '\\';
      text_ += character;
    }
  }
  text_ += '"';
  return *this;
}

JsonWriter& JsonWriter::number(double value, Digits digits) {
  if (!std::isfinite(value)) return null();
  separate();
  fmt::format_to(std::back_inserter(text_), "{:.{}g}", value, static_cast<int>(digits));
  return *this;
}

JsonWriter& JsonWriter::integer(std::int64_t value) {
  separate();
  fmt::format_to(std::back_inserter(text_), "{}", value);
  return *this;
}

JsonWriter& JsonWriter::boolean(bool value) {
  separate();
  text_ += value ? "true" : "false";
  return *this;
}

JsonWriter& JsonWriter::null() {
  separate();
  text_ += "null";
  return *this;
}

JsonWriter& JsonWriter::member(std::string_view name, std::span<const std::string> values) {
  key(name).beginArray();
  for (const std::string& value : values) text(value);
  return endArray();
}

JsonWriter& JsonWriter::optionalMember(std::string_view name, std::string_view value) {
  key(name);
  return value.empty() ? null() : text(value);
}

JsonWriter& JsonWriter::open(char bracket) {
  separate();
  text_ += bracket;
  needsComma_ = false;
  return *this;
}

JsonWriter& JsonWriter::close(char bracket) {
  text_ += bracket;
  needsComma_ = true;
  return *this;
}

/// Comma between two values; every value leaves `needsComma_` set.
void JsonWriter::separate() {
  if (needsComma_) text_ += ',';
  needsComma_ = true;
}

}  // namespace mirevo
