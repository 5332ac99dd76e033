#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace mirevo {

/// Takes `front` off the front of `text`; false, with `text` unchanged, when it does not begin with `front`.
bool takeText(std::string_view& text, std::string_view front);

/// Whether the text is one or more decimal digits and nothing else.
bool isDigits(std::string_view text);

/// Takes `least` to `most` decimal digits off the front of `text` and returns them; empty, with `text` unchanged, if
/// there are fewer.
std::string_view takeDigits(std::string_view& text, std::size_t least = 1, std::size_t most = std::string_view::npos);

/// The same as a number; also empty, with `text` unchanged, if the number does not fit into 64 bits.
std::optional<std::int64_t> takeNumber(std::string_view& text, std::size_t least = 1,
                                       std::size_t most = std::string_view::npos);

}  // namespace mirevo
