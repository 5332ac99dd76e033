#pragma once

#include <string>
#include <string_view>

namespace mirevo {

/// Whether text begins as UTF-16 does: with its byte order mark, or with a zero byte among its first two.
bool isUtf16(std::string_view text);

/// What a refusal says of the content of a file that is UTF-16 or holds a zero byte, and how to convert it; empty for
/// any other.
std::string faultOfEncoding(std::string_view content);

/// Text in UTF-8, and what it was read as: "UTF-8", "UTF-16" or "Latin-1".
struct DecodedText {
  std::string text;
  std::string_view encoding;
};

/// Text that is not valid UTF-8 is read as UTF-16 if it begins so, otherwise as Latin-1 with the characters that
/// Windows code page 1252 has in place of control characters.
DecodedText decodeText(std::string_view text);

}  // namespace mirevo
