#include "report/json_writer.h"

#include <cmath>
#include <iterator>

#include <fmt/core.h>

namespace mirevo {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";  // U+FFFD

/// Bytes of the UTF-8 sequence at the start of `text`; 0 where there is none (RFC 3629: no overlong form, no surrogate,
/// nothing past U+10FFFF).
std::size_t sequenceLength(std::string_view text) {
  const auto byte = [text](std::size_t i) { return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U; };
  const unsigned first = byte(0);
  const auto continues = [&](std::size_t from, std::size_t to) {
    for (std::size_t i = from; i < to; ++i) {
      if ((byte(i) & 0xC0U) != 0x80U) return false;
    }
    return true;
  };
  if (first < 0x80) return 1;
  if (first >= 0xC2 && first <= 0xDF) return continues(1, 2) ? 2 : 0;
  if (first >= 0xE0 && first <= 0xEF) {
    const bool isOverlong = first == 0xE0 && byte(1) < 0xA0;
    const bool isSurrogate = first == 0xED && byte(1) > 0x9F;
    return !isOverlong && !isSurrogate && continues(1, 3) ? 3 : 0;
  }
  if (first >= 0xF0 && first <= 0xF4) {
    const bool isOverlong = first == 0xF0 && byte(1) < 0x90;
    const bool isPastEnd = first == 0xF4 && byte(1) > 0x8F;
    return !isOverlong && !isPastEnd && continues(1, 4) ? 4 : 0;
  }
  return 0;
}

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
    const std::size_t length = sequenceLength(value);
    const std::string_view character = value.substr(0, length == 0 ? 1 : length);
    value.remove_prefix(character.size());
    const char c = character.front();
    if (length == 0) {
      text_ += kReplacement;
    } else if (character == "\xE2\x80\xA8" || character == "\xE2\x80\xA9") {  // U+2028, U+2029
      appendEscape(text_, character == "\xE2\x80\xA8" ? 0x2028 : 0x2029);
    } else if (length == 1 && (static_cast<unsigned char>(c) < ' ' || c == '<' || c == '>' || c == '&' || c == 0x7F)) {
      appendEscape(text_, static_cast<unsigned char>(c));
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
