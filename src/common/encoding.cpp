#include "common/encoding.h"

#include <algorithm>
#include <array>
#include <cstdint>

#include <fmt/format.h>

#include "common/utf8.h"

namespace mirevo {
namespace {

constexpr char32_t kReplacement = 0xFFFD;

/// Bytes 0x80 to 0x9F of Windows code page 1252 (Unicode Consortium, CP1252.TXT); 0 where it has none.
constexpr std::array<std::uint16_t, 32> kWindowsCharacters{
    0x20AC, 0,      0x201A, 0x0192, 0x201E, 0x2026, 0x2020, 0x2021, 0x02C6, 0x2030, 0x0160,
    0x2039, 0x0152, 0,      0x017D, 0,      0,      0x2018, 0x2019, 0x201C, 0x201D, 0x2022,
    0x2013, 0x2014, 0x02DC, 0x2122, 0x0161, 0x203A, 0x0153, 0,      0x017E, 0x0178};

std::string fromLatin1(std::string_view text) {
  std::string decoded;
  decoded.reserve(text.size() + text.size() / 8);
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    const char32_t windows = byte >= 0x80 && byte < 0xA0 ? kWindowsCharacters[byte - 0x80U] : 0;
    appendUtf8(decoded, windows != 0 ? windows : byte);
  }
  return decoded;
}

std::string fromUtf16(std::string_view text) {
  const bool isLittleEndian = text[0] == '\xFF' || text[1] == '\0';
  const auto unitAt = [&](std::size_t i) {
    const auto first = static_cast<unsigned char>(text[i]);
    const auto second = static_cast<unsigned char>(text[i + 1]);
    return static_cast<char32_t>(isLittleEndian ? second << 8 | first : first << 8 | second);
  };
  std::string decoded;
  decoded.reserve(text.size() / 2);
  for (std::size_t i = 0; i + 1 < text.size(); i += 2) {
    char32_t code = unitAt(i);
    const bool isFirstOfPair = code >= 0xD800 && code < 0xDC00 && i + 3 < text.size();
    const char32_t next = isFirstOfPair ? unitAt(i + 2) : 0;
    if (next >= 0xDC00 && next < 0xE000) {
      code = 0x10000 + ((code - 0xD800) << 10) + (next - 0xDC00);
      i += 2;
    } else if (code >= 0xD800 && code < 0xE000) {
      code = kReplacement;
    }
    appendUtf8(decoded, code);
  }
  return decoded;
}

}  // namespace

bool isUtf16(std::string_view text) {
  if (text.starts_with("\xFF\xFE") || text.starts_with("\xFE\xFF")) return true;
  return text.size() >= 2 && (text[0] == '\0') != (text[1] == '\0');
}

std::string faultOfEncoding(std::string_view content) {
  if (isUtf16(content)) return "the file is UTF-16 text; save it as UTF-8, for example with iconv -f UTF-16 -t UTF-8";
  const std::size_t at = content.find('\0');
  if (at == std::string_view::npos) return {};
  const auto line = std::count(content.begin(), content.begin() + static_cast<std::ptrdiff_t>(at), '\n') + 1;
  return fmt::format(
      "line {} holds a zero byte (NUL), which no text has: save the file as UTF-8 text, for example with tr -d "
      "'\\000', if nothing else is wrong with it",
      line);
}

DecodedText decodeText(std::string_view text) {
  if (isUtf16(text)) return {fromUtf16(text), "UTF-16"};
  if (isValidUtf8(text)) return {std::string(text), "UTF-8"};
  return {fromLatin1(text), "Latin-1"};
}

}  // namespace mirevo
