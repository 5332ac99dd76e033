#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// What a refusal of UTF-16 text says.
inline constexpr std::string_view kUtf16Refusal = "the file is UTF-16 text; save it as UTF-8";

/// Whether text begins as UTF-16 does: with its byte order mark, or with a zero byte among its first two.
bool isUtf16(std::string_view text);

/// Text in UTF-8, and what it was read as: "UTF-8", "UTF-16" or "Latin-1".
struct DecodedText {
  std::string text;
  std::string_view encoding;
};

/// Text that is not valid UTF-8 is read as UTF-16 if it begins so, otherwise as Latin-1 with the characters that
/// Windows code page 1252 has in place of control characters.
DecodedText decodeText(std::string_view text);

}  // namespace mirevo
