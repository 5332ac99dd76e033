#include "common/utf8.h"

#include <array>

#include <fmt/core.h>

namespace mirevo {

Utf8Character firstCharacter(std::string_view text) {
  const auto lead = static_cast<unsigned char>(text.front());
  if (lead < 0x80) return {lead, 1, true};
  const std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
  if (lead < 0xC2 || lead > 0xF4 || text.size() < length) return {};
  char32_t code = lead & (0xFFU >> (length + 1));
  for (const char byte : text.substr(1, length - 1)) {
    if (!isInsideCharacter(byte)) return {};
    code = (code << 6) | (static_cast<unsigned char>(byte) & 0x3FU);
  }
  constexpr std::array<char32_t, 5> kSmallest{0, 0, 0x80, 0x800, 0x10000};
  const bool isSurrogate = code >= 0xD800 && code <= 0xDFFF;
  if (code < kSmallest[length] || code > 0x10FFFF || isSurrogate) return {};
  return {code, length, true};
}

bool isValidUtf8(std::string_view text) {
  while (!text.empty()) {
    const Utf8Character first = firstCharacter(text);
    if (!first.isValid) return false;
    text.remove_prefix(first.bytes);
  }
  return true;
}

std::size_t characterCount(std::string_view text) {
  std::size_t count = 0;
  for (; !text.empty(); ++count) text.remove_prefix(firstCharacter(text).bytes);
  return count;
}

std::string quoted(std::string_view text) {
  constexpr std::size_t kMostQuoted = 200;
  const std::size_t count = text.size() > kMostQuoted ? characterCount(text) : 0;
  if (count <= kMostQuoted) return std::string(text);
  std::string_view rest = text;
  for (std::size_t i = 0; i < kMostQuoted; ++i) rest.remove_prefix(firstCharacter(rest).bytes);
  return fmt::format("{}... ({} characters)", text.substr(0, text.size() - rest.size()), count);
}

std::string withValidUtf8(std::string_view text) {
  std::string valid;
  valid.reserve(text.size());
  while (!text.empty()) {
    const Utf8Character first = firstCharacter(text);
    valid += first.isValid ? text.substr(0, first.bytes) : std::string_view("\xEF\xBF\xBD");
    text.remove_prefix(first.bytes);
  }
  return valid;
}

void appendUtf8(std::string& text, char32_t code) {
  const auto inside = [&text, code](int shift) { text += static_cast<char>(0x80U | (code >> shift & 0x3FU)); };
  if (code < 0x80) {
    text += static_cast<char>(code);
  } else if (code < 0x800) {
    text += static_cast<char>(0xC0U | code >> 6);
    inside(0);
  } else if (code < 0x10000) {
    text += static_cast<char>(0xE0U | code >> 12);
    inside(6);
    inside(0);
  } else {
    text += static_cast<char>(0xF0U | code >> 18);
    inside(12);
    inside(6);
    inside(0);
  }
}

}  // namespace mirevo
