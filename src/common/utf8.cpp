#include "common/utf8.h"

#include <array>

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

}  // namespace mirevo
