#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace mirevo {

inline constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

/// A character of UTF-8 text (RFC 3629: no overlong form, no surrogate, nothing past U+10FFFF).
struct Utf8Character {
  char32_t code = 0;
  std::size_t bytes = 1;
  bool isValid = false;
};

/// The first character of `text`, which must not be empty; one invalid byte if it does not begin with a valid
/// character.
Utf8Character firstCharacter(std::string_view text);

bool isValidUtf8(std::string_view text);

/// How many characters the text has; each invalid byte counts as one.
std::size_t characterCount(std::string_view text);

/// A text for a message: whole, or of a long one the first 200 characters and how many there are.
std::string quoted(std::string_view text);

/// The text with U+FFFD in place of each invalid byte.
std::string withValidUtf8(std::string_view text);

/// Appends a character, which must be a valid one.
void appendUtf8(std::string& text, char32_t code);

/// Whether this byte continues a character and does not begin one.
constexpr bool isInsideCharacter(char byte) {
  return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U;
}

}  // namespace mirevo
