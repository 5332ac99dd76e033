#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace mirevo {

/// Takes `front` off the front of `text`; false, and nothing taken, when it does not begin so.
bool takeText(std::string_view& text, std::string_view front);

/// Takes `least` to `most` decimal digits off the front of `text` and returns them; empty, and nothing taken, where
/// fewer stand there.
std::string_view takeDigits(std::string_view& text, std::size_t least = 1, std::size_t most = std::string_view::npos);

/// The same as a number; nothing, and nothing taken, where it does not fit 64 bits either.
std::optional<std::int64_t> takeNumber(std::string_view& text, std::size_t least = 1,
                                       std::size_t most = std::string_view::npos);

}  // namespace mirevo
